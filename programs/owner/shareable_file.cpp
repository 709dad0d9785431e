#include "owner/shareable_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <optional>

#include "common/stream.h"
#include "common/unique_fd.h"
#include "owner/owner_ids.h"

namespace owner {

namespace {

std::string DescriptorPath(int fd) {
  return "/proc/self/fd/" + std::to_string(fd);
}

// What the kernel calls the open file: resolved, and of this very file, whatever has become of the
// path meanwhile.
std::optional<std::string> PathOf(int fd) {
  std::array<char, PATH_MAX> path{};
  const ssize_t length = readlink(DescriptorPath(fd).c_str(), path.data(), path.size());
  if (length <= 0 || static_cast<size_t>(length) == path.size() || path[0] != '/') {
    return std::nullopt;
  }
  return std::string(path.data(), static_cast<size_t>(length));
}

// Opened as a mere place first: opening a device or a pipe for reading may do something.
std::optional<std::string> ReadableFile(const std::string& path) {
  const common::UniqueFd place(open(path.c_str(), O_PATH | O_CLOEXEC));
  struct stat st {};
  if (place.get() < 0 || fstat(place.get(), &st) != 0 || !S_ISREG(st.st_mode)) {
    return std::nullopt;
  }
  const common::UniqueFd file(open(DescriptorPath(place.get()).c_str(), O_RDONLY | O_CLOEXEC));
  return file.get() < 0 ? std::nullopt : PathOf(file.get());
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

std::string ReadToEnd(int fd) {
  std::string text;
  std::array<char, PATH_MAX> piece{};
  for (;;) {
    const ssize_t count = read(fd, piece.data(), piece.size());
    if (count > 0) {
      text.append(piece.data(), static_cast<size_t>(count));
    } else if (count == 0 || errno != EINTR) {
      return text;
    }
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
  const std::string text = ReadToEnd(read_end.get());
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
