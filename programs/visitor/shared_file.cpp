#include "visitor/shared_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cinttypes>
#include <climits>
#include <cstdio>
#include <filesystem>

namespace visitor {

namespace {

constexpr uid_t kSystemUid = 1;

// Not blocked by a named pipe that nobody writes to, and no terminal is taken, before fstat has
// told what it is.
constexpr int kOpenFlags = O_RDONLY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

bool IsSystemsOwn(const struct stat& st) {
  return st.st_uid == kSystemUid && (st.st_mode & S_IROTH) == 0;
}

// Whether the kernel knows the open file by this very path. Another one means that a folder on the
// way has become a symbolic link since the link was made: whoever may write to a shared folder
// could so have any file served that this program can read.
bool IsStillAt(int fd, const std::string& path) {
  std::array<char, PATH_MAX> place{};
  const std::string name = "/proc/self/fd/" + std::to_string(fd);
  const ssize_t length = readlink(name.c_str(), place.data(), place.size());
  return length > 0 && static_cast<size_t>(length) < place.size() &&
         std::string_view(place.data(), static_cast<size_t>(length)) ==
             std::filesystem::path(path).lexically_normal().native();
}

std::uint64_t Nanoseconds(const struct timespec& time) {
  constexpr std::uint64_t kPerSecond = 1000000000;
  return static_cast<std::uint64_t>(time.tv_sec) * kPerSecond +
         static_cast<std::uint64_t>(time.tv_nsec);
}

// Size and both times: a change of the contents always moves the second one, also when the first
// was set back. No inode number, which is nobody's business.
std::string EtagOf(const struct stat& st) {
  std::array<char, 80> text{};
  (void)std::snprintf(text.data(), text.size(), "\"%" PRIx64 "-%" PRIx64 "-%" PRIx64 "\"",
                      static_cast<std::uint64_t>(st.st_size), Nanoseconds(st.st_mtim),
                      Nanoseconds(st.st_ctim));
  return text.data();
}

OpenResult Refused() {
  const bool gone = errno == ENOENT || errno == ENOTDIR || errno == ELOOP || errno == ENXIO;
  return gone ? OpenResult::kGone : OpenResult::kNotReadable;
}

OpenResult Failed(int error, OpenResult result) {
  errno = error;
  return result;
}

}  // namespace

OpenResult OpenShared(const std::string& path, SharedFile* file) {
  if (path.empty() || path.front() != '/' || path.find('\0') != std::string::npos) {
    return Failed(EINVAL, OpenResult::kNotReadable);
  }
  common::UniqueFd fd(open(path.c_str(), kOpenFlags));
  struct stat st {};
  if (fd.get() < 0 || fstat(fd.get(), &st) != 0) {
    return Refused();
  }
  if (!S_ISREG(st.st_mode)) {
    return Failed(EINVAL, OpenResult::kGone);
  }
  if (!IsStillAt(fd.get(), path)) {
    return Failed(ELOOP, OpenResult::kGone);
  }
  if (IsSystemsOwn(st)) {
    return Failed(EACCES, OpenResult::kNotReadable);
  }
  file->fd = std::move(fd);
  file->name = path.substr(path.rfind('/') + 1);
  file->size = st.st_size;
  file->validators = {EtagOf(st), st.st_mtim.tv_sec};
  return OpenResult::kOpened;
}

}  // namespace visitor
