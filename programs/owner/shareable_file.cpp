#include "owner/shareable_file.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <memory>
#include <optional>

#include "common/stream.h"
#include "common/unique_fd.h"
#include "owner/owner_ids.h"

namespace owner {

namespace {

constexpr uid_t kRootUid = 0;
constexpr auto kSameUid = static_cast<uid_t>(-1);

// The owner may stop the child, whose ids are the owner's, and a file system may not answer.
constexpr std::chrono::seconds kLongestLook(5);

std::string DescriptorPath(int fd) {
  return "/proc/self/fd/" + std::to_string(fd);
}

// What the kernel calls the open file: resolved, whatever has become of the path meanwhile.
std::optional<std::string> PathOf(int fd) {
  std::array<char, PATH_MAX> path{};
  const ssize_t length = readlink(DescriptorPath(fd).c_str(), path.data(), path.size());
  if (length <= 0 || static_cast<size_t>(length) == path.size() || path[0] != '/') {
    return std::nullopt;
  }
  return std::string(path.data(), static_cast<size_t>(length));
}

// Another program may hold a lease on the file, as file servers do for their clients, and is told
// now to give it back: waited for, but not for as long as it likes.
common::UniqueFd OpenForReading(const std::string& path) {
  constexpr int kTries = 20;
  constexpr timespec kPause{0, 100L * 1000 * 1000};
  for (int tries = 0; tries < kTries; ++tries) {
    common::UniqueFd file(open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC));
    if (file.get() >= 0 || errno != EWOULDBLOCK) {
      return file;
    }
    nanosleep(&kPause, nullptr);
  }
  return {};
}

// Whether whoever follows `path` from here comes to that very file. By way of /proc an owner
// reaches files of a mount namespace of their own, whose paths lead to somebody else's files in
// this one, and files that are deleted, whose paths lead nowhere yet.
bool LeadsTo(const std::string& path, const struct stat& file) {
  const common::UniqueFd found(open(path.c_str(), O_PATH | O_NOFOLLOW | O_CLOEXEC));
  struct stat st {};
  return found.get() >= 0 && fstat(found.get(), &st) == 0 && st.st_dev == file.st_dev &&
         st.st_ino == file.st_ino;
}

// Opened as a mere place first: opening a device or a pipe for reading may do something.
std::optional<std::string> ReadableFile(const std::string& path) {
  const common::UniqueFd place(open(path.c_str(), O_PATH | O_CLOEXEC));
  struct stat st {};
  if (place.get() < 0 || fstat(place.get(), &st) != 0 || !S_ISREG(st.st_mode)) {
    return std::nullopt;
  }
  const common::UniqueFd file = OpenForReading(DescriptorPath(place.get()));
  if (file.get() < 0) {
    return std::nullopt;
  }
  std::optional<std::string> resolved = PathOf(file.get());
  return resolved && LeadsTo(*resolved, st) ? resolved : std::nullopt;
}

bool IsBelow(const std::string& path, const std::string& folder) {
  struct FreeText {
    void operator()(char* text) const { std::free(text); }
  };
  const std::unique_ptr<char, FreeText> resolved(realpath(folder.c_str(), nullptr));
  if (!resolved) {
    return false;
  }
  const std::string start = std::string(resolved.get()) + "/";
  return path.compare(0, start.size(), start) == 0;
}

FileAnswer Look(const std::string& path, const std::vector<std::string>& folders,
                std::string* resolved) {
  const std::optional<std::string> file = ReadableFile(path);
  if (!file) {
    return FileAnswer::kNotReadable;
  }
  if (std::none_of(folders.begin(), folders.end(),
                   [&file](const std::string& folder) { return IsBelow(*file, folder); })) {
    return FileAnswer::kOutside;
  }
  *resolved = *file;
  return FileAnswer::kMay;
}

// The child's whole life: one byte of answer, then the path.
[[noreturn]] void LookAs(const OwnerIds& ids, const std::string& path,
                         const std::vector<std::string>& folders, int answer_fd) {
  FileAnswer answer = FileAnswer::kCannotTell;
  std::string resolved;
  if (Become(ids)) {
    answer = Look(path, folders, &resolved);
  }
  const char code = static_cast<char>(answer);
  _exit(common::WriteAll(answer_fd, std::string(1, code) + resolved) ? 0 : 1);
}

using Clock = std::chrono::steady_clock;

// Whether there is something to read, or the end, before the deadline.
bool WaitFor(int fd, Clock::time_point deadline) {
  for (;;) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
    pollfd wanted{fd, POLLIN, 0};
    const int ready = poll(&wanted, 1, static_cast<int>(std::max<std::int64_t>(left.count(), 0)));
    if (ready >= 0 || errno != EINTR) {
      return ready > 0;
    }
  }
}

// False when the end did not come in time.
bool ReadToEnd(int fd, std::string* text) {
  const Clock::time_point deadline = Clock::now() + kLongestLook;
  std::array<char, PATH_MAX> piece{};
  while (WaitFor(fd, deadline)) {
    const ssize_t count = read(fd, piece.data(), piece.size());
    if (count > 0) {
      text->append(piece.data(), static_cast<size_t>(count));
    } else if (count == 0 || errno != EINTR) {
      return count == 0;
    }
  }
  errno = ETIMEDOUT;
  return false;
}

// The child has the owner's ids by now, so that it may be for root alone to end it.
void Kill(pid_t child) {
  if (kill(child, SIGKILL) == 0 || errno != EPERM) {
    return;
  }
  const uid_t former = geteuid();
  if (setresuid(kSameUid, kRootUid, kSameUid) != 0) {
    return;
  }
  (void)kill(child, SIGKILL);
  if (setresuid(kSameUid, former, kSameUid) != 0 || geteuid() != former) {
    syslog(LOG_AUTH | LOG_CRIT, "shareable_file:%d cannot return to uid %u", __LINE__, former);
    std::abort();
  }
}

// One that was killed in a system call that nothing interrupts, on a file system that has gone, is
// not waited for: it ends when that does.
void Reap(pid_t child) {
  constexpr int kTries = 100;
  constexpr timespec kPause{0, 10L * 1000 * 1000};
  for (int tries = 0; tries < kTries && waitpid(child, nullptr, WNOHANG) == 0; ++tries) {
    nanosleep(&kPause, nullptr);
  }
}

bool EndedWell(pid_t child) {
  int status = 0;
  while (waitpid(child, &status, 0) < 0) {
    if (errno != EINTR) {
      return false;
    }
  }
  return WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

FileAnswer CannotTell(int line) {
  syslog(LOG_ERR, "shareable_file:%d cannot look at a file as its owner: %s", line,
         std::strerror(errno));
  return FileAnswer::kCannotTell;
}

}  // namespace

FileAnswer CheckShareable(const std::string& path, const Account& owner,
                          const std::vector<std::string>& folders, std::string* resolved) {
  if (path.empty() || path.front() != '/' || path.find('\0') != std::string::npos) {
    return FileAnswer::kNotReadable;
  }
  const std::optional<OwnerIds> ids = IdsOf(owner);
  if (!ids) {
    return CannotTell(__LINE__);
  }
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) {
    return CannotTell(__LINE__);
  }
  const common::UniqueFd read_end(ends[0]);
  common::UniqueFd write_end(ends[1]);
  const pid_t child = fork();
  if (child == 0) {
    LookAs(*ids, path, folders, write_end.get());
  }
  if (child < 0) {
    return CannotTell(__LINE__);
  }
  write_end = common::UniqueFd();
  std::string text;
  if (!ReadToEnd(read_end.get(), &text)) {
    const int error = errno;
    Kill(child);
    Reap(child);
    errno = error;
    return CannotTell(__LINE__);
  }
  if (!EndedWell(child) || text.empty()) {
    return CannotTell(__LINE__);
  }
  const auto answer = static_cast<FileAnswer>(text.front());
  if (answer == FileAnswer::kMay) {
    *resolved = text.substr(1);
  }
  return answer;
}

}  // namespace owner
