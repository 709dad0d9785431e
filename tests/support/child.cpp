#include "support/child.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <exception>

#ifdef __SANITIZE_ADDRESS__
// The leak check traces the process that it is in, which the kernel refuses while the ids differ.
extern "C" __attribute__((visibility("default"))) int __lsan_is_turned_off() {
  const tuvo_test::Ids ids = tuvo_test::CurrentIds();
  const bool same =
      ids.ruid == ids.euid && ids.euid == ids.suid && ids.rgid == ids.egid && ids.egid == ids.sgid;
  return same ? 0 : 1;
}
#endif

namespace tuvo_test {

namespace {

pid_t last_child = 0;

}  // namespace

Ids CurrentIds() {
  Ids ids{};
  getresuid(&ids.ruid, &ids.euid, &ids.suid);
  getresgid(&ids.rgid, &ids.egid, &ids.sgid);
  return ids;
}

bool operator==(const Ids& a, const Ids& b) {
  return a.ruid == b.ruid && a.euid == b.euid && a.suid == b.suid && a.rgid == b.rgid &&
         a.egid == b.egid && a.sgid == b.sgid;
}

std::string ToText(const Ids& ids) {
  return "uid " + std::to_string(ids.ruid) + "/" + std::to_string(ids.euid) + "/" +
         std::to_string(ids.suid) + " gid " + std::to_string(ids.rgid) + "/" +
         std::to_string(ids.egid) + "/" + std::to_string(ids.sgid);
}

int RunInChild(const std::function<int()>& body) {
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid == 0) {
    int code = 254;
    try {
      code = body();
    } catch (const std::exception& error) {
      std::fprintf(stderr, "child: %s\n", error.what());
    }
    if (code == 0 && testing::Test::HasFailure()) {
      code = 253;
    }
    std::fflush(nullptr);
    // exit, not _exit: process-wide objects are to be destroyed as in a real program.
    std::exit(code);
  }
  last_child = pid;
  int status = 0;
  while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 256 + WTERMSIG(status);
}

int RunInChildAs(const Ids& ids, const std::function<int()>& body) {
  return RunInChild([&] {
    if (setgroups(0, nullptr) != 0 || setresgid(ids.rgid, ids.egid, ids.sgid) != 0 ||
        setresuid(ids.ruid, ids.euid, ids.suid) != 0) {
      std::perror("taking ids");
      return 252;
    }
    return body();
  });
}

pid_t LastChild() {
  return last_child;
}

}  // namespace tuvo_test
