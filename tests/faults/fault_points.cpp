#include "faults/fault_points.h"

#include <dlfcn.h>
#include <fcntl.h>
#include <sqlite3.h>
#include <sys/types.h>

#include <cerrno>
#include <cstdarg>
#include <cstddef>
#include <cstdio>
#include <cstdlib>
#include <utility>

#include "support/failing_new.h"

namespace tuvo_test {
namespace {

unsigned int kinds_counted = kNoFault;
long number_to_fail = 0;
long counted = 0;
FaultKind failed = kNoFault;
long blocks_alive = 0;

// Whether this call is to fail.
bool Fails(FaultKind kind) {
  if ((kinds_counted & kind) == 0 || ++counted != number_to_fail) {
    return false;
  }
  failed = kind;
  return true;
}

template <typename Function>
Function* Real(const char* name) {
  const NotCounted not_counted;
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

std::vector<std::string>& Logged() {
  static auto* lines = new std::vector<std::string>;
  return *lines;
}

void Note(const char* format, va_list arguments) {
  const NotCounted not_counted;
  const long alive = blocks_alive;
  char line[4096];
  std::vsnprintf(line, sizeof line, format, arguments);
  Logged().emplace_back(line);
  blocks_alive = alive;
}

// Whether a call of fcntl takes a lock. Giving one back is no point of failure: the file systems
// that a database may lie on do not refuse it.
bool TakesLock(int command, const void* argument) {
  return (command == F_SETLK || command == F_SETLKW || command == F_SETLK64 ||
          command == F_SETLKW64) &&
         static_cast<const flock64*>(argument)->l_type != F_UNLCK;
}

}  // namespace

NotCounted::NotCounted() : kinds_(std::exchange(kinds_counted, kNoFault)) {}

NotCounted::~NotCounted() {
  kinds_counted = kinds_;
}

void FailAt(unsigned int kinds, long number) {
  TakeLogged();
  counted = 0;
  failed = kNoFault;
  number_to_fail = number;
  kinds_counted = kinds;
}

FaultKind StopFailing() {
  kinds_counted = kNoFault;
  return failed;
}

long FaultPointsCounted() {
  return counted;
}

const char* NameOf(FaultKind kind) {
  switch (kind) {
    case kOpen:
      return "open";
    case kRead:
      return "read";
    case kWrite:
      return "write";
    case kSync:
      return "sync";
    case kLock:
      return "lock";
    case kMap:
      return "map";
    case kMemory:
      return "memory";
    case kIdentity:
      return "identity";
    default:
      return "nothing";
  }
}

std::vector<std::string> TakeLogged() {
  return std::exchange(Logged(), {});
}

long BlocksAlive() {
  return blocks_alive;
}

}  // namespace tuvo_test

// The functions that stand in for the C library's. They have names of their own here, since the
// headers give some of the library's names to others of its functions.
#define STAND_IN(type, name, ...)                   \
  extern "C" __attribute__((visibility("default"))) \
  type StandIn_##name(__VA_ARGS__) __asm__(#name);  \
  type StandIn_##name(__VA_ARGS__)

// Answers with `failure` when it is this call's turn to fail, else with what the real one answers.
#define FAIL_OR(kind, error, failure, name, ...)                              \
  static auto* const real = tuvo_test::Real<decltype(StandIn_##name)>(#name); \
  if (tuvo_test::Fails(tuvo_test::kind)) {                                    \
    errno = error;                                                            \
    return failure;                                                           \
  }                                                                           \
  return real(__VA_ARGS__)

// Whether there is a third argument or not, passing one on does no harm.
STAND_IN(int, open, const char* path, int flags, mode_t mode) {
  FAIL_OR(kOpen, EMFILE, -1, open, path, flags, mode);
}

STAND_IN(int, open64, const char* path, int flags, mode_t mode) {
  FAIL_OR(kOpen, EMFILE, -1, open64, path, flags, mode);
}

STAND_IN(FILE*, fopen, const char* path, const char* mode) {
  FAIL_OR(kOpen, EMFILE, nullptr, fopen, path, mode);
}

STAND_IN(FILE*, fopen64, const char* path, const char* mode) {
  FAIL_OR(kOpen, EMFILE, nullptr, fopen64, path, mode);
}

STAND_IN(ssize_t, read, int fd, void* bytes, std::size_t size) {
  FAIL_OR(kRead, EIO, -1, read, fd, bytes, size);
}

STAND_IN(ssize_t, pread64, int fd, void* bytes, std::size_t size, off64_t offset) {
  FAIL_OR(kRead, EIO, -1, pread64, fd, bytes, size, offset);
}

STAND_IN(ssize_t, write, int fd, const void* bytes, std::size_t size) {
  FAIL_OR(kWrite, ENOSPC, -1, write, fd, bytes, size);
}

STAND_IN(ssize_t, pwrite64, int fd, const void* bytes, std::size_t size, off64_t offset) {
  FAIL_OR(kWrite, ENOSPC, -1, pwrite64, fd, bytes, size, offset);
}

STAND_IN(int, ftruncate64, int fd, off64_t size) {
  FAIL_OR(kWrite, ENOSPC, -1, ftruncate64, fd, size);
}

STAND_IN(int, fsync, int fd) {
  FAIL_OR(kSync, EIO, -1, fsync, fd);
}

STAND_IN(int, fdatasync, int fd) {
  FAIL_OR(kSync, EIO, -1, fdatasync, fd);
}

STAND_IN(int, fcntl64, int fd, int command, void* argument) {
  if (!tuvo_test::TakesLock(command, argument)) {
    static auto* const other = tuvo_test::Real<decltype(StandIn_fcntl64)>("fcntl64");
    return other(fd, command, argument);
  }
  FAIL_OR(kLock, EIO, -1, fcntl64, fd, command, argument);
}

STAND_IN(void*, mmap64, void* at, std::size_t size, int protection, int flags, int fd,
         off64_t offset) {
  FAIL_OR(kMap, ENOMEM, reinterpret_cast<void*>(-1), mmap64, at, size, protection, flags, fd,
          offset);
}

STAND_IN(int, setresuid, uid_t real_uid, uid_t effective, uid_t saved) {
  FAIL_OR(kIdentity, EAGAIN, -1, setresuid, real_uid, effective, saved);
}

STAND_IN(int, setresgid, gid_t real_gid, gid_t effective, gid_t saved) {
  FAIL_OR(kIdentity, EAGAIN, -1, setresgid, real_gid, effective, saved);
}

STAND_IN(void, syslog, int /*priority*/, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  tuvo_test::Note(format, arguments);
  va_end(arguments);
}

STAND_IN(void, vsyslog, int /*priority*/, const char* format, va_list arguments) {
  tuvo_test::Note(format, arguments);
}

// What a build with _FORTIFY_SOURCE calls instead.
STAND_IN(void, __syslog_chk, int /*priority*/, int /*flag*/, const char* format, ...) {
  va_list arguments;
  va_start(arguments, format);
  tuvo_test::Note(format, arguments);
  va_end(arguments);
}

STAND_IN(void, __vsyslog_chk, int /*priority*/, int /*flag*/, const char* format,
         va_list arguments) {
  tuvo_test::Note(format, arguments);
}

#ifndef __SANITIZE_ADDRESS__

extern "C" {
void* __libc_malloc(std::size_t size);
void* __libc_calloc(std::size_t count, std::size_t size);
void* __libc_realloc(void* memory, std::size_t size);
void __libc_free(void* memory);
}

namespace {

void* Counted(void* memory) {
  tuvo_test::blocks_alive += memory != nullptr ? 1 : 0;
  return memory;
}

bool MemoryFails() {
  if (tuvo_test::Fails(tuvo_test::kMemory)) {
    errno = ENOMEM;
    return true;
  }
  return false;
}

}  // namespace

STAND_IN(void*, malloc, std::size_t size) {
  return MemoryFails() ? nullptr : Counted(__libc_malloc(size));
}

STAND_IN(void*, calloc, std::size_t count, std::size_t size) {
  return MemoryFails() ? nullptr : Counted(__libc_calloc(count, size));
}

STAND_IN(void*, realloc, void* memory, std::size_t size) {
  if (MemoryFails()) {
    return nullptr;
  }
  void* moved = __libc_realloc(memory, size);
  if (memory == nullptr) {
    Counted(moved);
  } else if (size == 0) {
    --tuvo_test::blocks_alive;
  }
  return moved;
}

STAND_IN(void, free, void* memory) {
  tuvo_test::blocks_alive -= memory != nullptr ? 1 : 0;
  __libc_free(memory);
}

#else

// The sanitizer has the C library's functions to itself; what the library and SQLite allocate can
// be made to fail beside it.
namespace {

sqlite3_mem_methods real_methods;

void* SqliteMalloc(int size) {
  return tuvo_test::Fails(tuvo_test::kMemory) ? nullptr : real_methods.xMalloc(size);
}

void* SqliteRealloc(void* memory, int size) {
  return tuvo_test::Fails(tuvo_test::kMemory) ? nullptr : real_methods.xRealloc(memory, size);
}

__attribute__((constructor)) void StandBeforeSqlitesMemory() {
  sqlite3_config(SQLITE_CONFIG_GETMALLOC, &real_methods);
  sqlite3_mem_methods methods = real_methods;
  methods.xMalloc = SqliteMalloc;
  methods.xRealloc = SqliteRealloc;
  sqlite3_config(SQLITE_CONFIG_MALLOC, &methods);
}

}  // namespace

bool tuvo_test::MayAllocate() noexcept {
  return !Fails(kMemory);
}

#endif
