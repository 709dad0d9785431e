#include "concurrency/crew.h"

#include <grp.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <exception>

namespace tuvo_test {

namespace {

constexpr int kThrew = 254;
constexpr int kNoIds = 252;

bool Take(const Ids& ids) {
  return setgroups(0, nullptr) == 0 && setresgid(ids.rgid, ids.egid, ids.sgid) == 0 &&
         setresuid(ids.ruid, ids.euid, ids.suid) == 0;
}

int Run(const Ids& ids, const std::function<int()>& body) {
  if (!Take(ids)) {
    std::perror("taking ids");
    return kNoIds;
  }
  try {
    return body();
  } catch (const std::exception& error) {
    std::fprintf(stderr, "process %d: %s\n", getpid(), error.what());
    return kThrew;
  }
}

}  // namespace

long FromEnvironment(const char* name, long usual) {
  const char* text = std::getenv(name);
  return text == nullptr ? usual : std::atol(text);
}

Gate::Gate() : ends_{} {
  if (pipe(ends_.data()) != 0) {
    throw std::runtime_error("pipe");
  }
}

Gate::~Gate() {
  Open();
  close(ends_[0]);
}

void Gate::Pass() {
  close(ends_[1]);
  char byte = 0;
  while (read(ends_[0], &byte, 1) < 0 && errno == EINTR) {
  }
  ends_[1] = -1;
}

void Gate::Open() {
  if (ends_[1] >= 0) {
    close(ends_[1]);
    ends_[1] = -1;
  }
}

pid_t Start(const Ids& ids, const std::function<int()>& body) {
  std::fflush(nullptr);
  const pid_t pid = fork();
  if (pid < 0) {
    throw std::runtime_error("fork");
  }
  if (pid == 0) {
    const int status = Run(ids, body);
    std::fflush(nullptr);
    std::exit(status);
  }
  return pid;
}

int Wait(pid_t pid) {
  int status = 0;
  while (waitpid(pid, &status, 0) < 0 && errno == EINTR) {
  }
  return WIFEXITED(status) ? WEXITSTATUS(status) : 256 + WTERMSIG(status);
}

int WaitForAll(const std::vector<pid_t>& pids) {
  int failed = 0;
  for (const pid_t pid : pids) {
    failed += Wait(pid) == 0 ? 0 : 1;
  }
  return failed;
}

const Ids& IdsOf(int process) {
  switch (process % 4) {
    case 1:
      return kSystem;
    case 3:
      return kSavedRoot;
    default:
      return kRoot;
  }
}

}  // namespace tuvo_test
