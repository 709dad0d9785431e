#include "crash/file_calls.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <sys/stat.h>

#include <utility>

namespace tuvo_test {
namespace {

void (*current_watcher)(const FileAction& action) = nullptr;

void Tell(const FileAction& action) {
  if (current_watcher != nullptr) {
    auto* const watcher = std::exchange(current_watcher, nullptr);
    watcher(action);
    current_watcher = watcher;
  }
}

void Tell(FileCall call, int fd) {
  Tell({call, fd, nullptr, nullptr, 0, 0});
}

void Tell(FileCall call, const char* path) {
  Tell({call, -1, path, nullptr, 0, 0});
}

bool IsLock(int command) {
  return command == F_SETLK || command == F_SETLKW || command == F_SETLK64 || command == F_SETLKW64;
}

template <typename Function>
Function* Real(const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

void WatchFiles(void (*watcher)(const FileAction& action)) {
  current_watcher = watcher;
}

}  // namespace tuvo_test

// The functions that stand in for the C library's. They have names of their own here, since the
// headers give some of the library's names to others of its functions.
#define STAND_IN(type, name, ...)                   \
  extern "C" __attribute__((visibility("default"))) \
  type StandIn_##name(__VA_ARGS__) __asm__(#name);  \
  type StandIn_##name(__VA_ARGS__)

#define GO_ON(name, ...)                                                      \
  static auto* const real = tuvo_test::Real<decltype(StandIn_##name)>(#name); \
  return real(__VA_ARGS__)

using tuvo_test::FileCall;
using tuvo_test::IsLock;
using tuvo_test::Tell;

// Whether there is a third argument or not, passing one on does no harm.
STAND_IN(int, open, const char* path, int flags, mode_t mode) {
  if ((flags & O_CREAT) != 0) {
    Tell(FileCall::kCreate, path);
  }
  GO_ON(open, path, flags, mode);
}

STAND_IN(int, open64, const char* path, int flags, mode_t mode) {
  if ((flags & O_CREAT) != 0) {
    Tell(FileCall::kCreate, path);
  }
  GO_ON(open64, path, flags, mode);
}

STAND_IN(ssize_t, write, int fd, const void* bytes, std::size_t size) {
  Tell({FileCall::kAppend, fd, nullptr, bytes, size, -1});
  GO_ON(write, fd, bytes, size);
}

STAND_IN(ssize_t, pwrite64, int fd, const void* bytes, std::size_t size, off64_t offset) {
  Tell({FileCall::kWrite, fd, nullptr, bytes, size, offset});
  GO_ON(pwrite64, fd, bytes, size, offset);
}

STAND_IN(int, ftruncate64, int fd, off64_t size) {
  Tell({FileCall::kTruncate, fd, nullptr, nullptr, 0, size});
  GO_ON(ftruncate64, fd, size);
}

STAND_IN(int, fsync, int fd) {
  Tell(FileCall::kSync, fd);
  GO_ON(fsync, fd);
}

STAND_IN(int, fdatasync, int fd) {
  Tell(FileCall::kSync, fd);
  GO_ON(fdatasync, fd);
}

STAND_IN(int, fcntl64, int fd, int command, void* argument) {
  if (IsLock(command)) {
    Tell(FileCall::kLock, fd);
  }
  GO_ON(fcntl64, fd, command, argument);
}

STAND_IN(int, unlink, const char* path) {
  Tell(FileCall::kNames, path);
  GO_ON(unlink, path);
}

STAND_IN(int, rename, const char* from, const char* to) {
  Tell(FileCall::kNames, from);
  GO_ON(rename, from, to);
}

STAND_IN(int, renameat2, int from_folder, const char* from, int to_folder, const char* to,
         unsigned int flags) {
  Tell(FileCall::kNames, from);
  GO_ON(renameat2, from_folder, from, to_folder, to, flags);
}

STAND_IN(int, link, const char* from, const char* to) {
  Tell(FileCall::kNames, nullptr);
  GO_ON(link, from, to);
}

STAND_IN(int, rmdir, const char* path) {
  Tell(FileCall::kNames, path);
  GO_ON(rmdir, path);
}

STAND_IN(char*, mkdtemp, char* path) {
  Tell(FileCall::kNames, nullptr);
  GO_ON(mkdtemp, path);
}

STAND_IN(int, mkostemp64, char* path, int flags) {
  Tell(FileCall::kNames, nullptr);
  GO_ON(mkostemp64, path, flags);
}

STAND_IN(int, mkostemp, char* path, int flags) {
  Tell(FileCall::kNames, nullptr);
  GO_ON(mkostemp, path, flags);
}

STAND_IN(int, chmod, const char* path, mode_t mode) {
  Tell(FileCall::kMode, path);
  GO_ON(chmod, path, mode);
}

STAND_IN(int, fchmod, int fd, mode_t mode) {
  Tell(FileCall::kMode, fd);
  GO_ON(fchmod, fd, mode);
}

STAND_IN(int, fchown, int fd, uid_t user, gid_t group) {
  Tell(FileCall::kMode, fd);
  GO_ON(fchown, fd, user, group);
}
