/* Preloaded into library and floor when the two are compared, never while they are measured:
 * appends what a process asks of SQLite and the kernel to the file that BENCH_TRACE names, a line
 * each. */
#include <dlfcn.h>
#include <fcntl.h>
#include <sqlite3.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <unistd.h>

/* By its bytes: a pointer to data is no pointer to a function in C. */
#define FIND(pointer, name)                   \
  do {                                        \
    void* found = dlsym(RTLD_NEXT, (name));   \
    memcpy(&(pointer), &found, sizeof found); \
  } while (0)

static int file = -1;

__attribute__((constructor)) static void open_trace(void) {
  const char* path = getenv("BENCH_TRACE");
  if (path != NULL) {
    file = open(path, O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0666);
  }
}

__attribute__((format(printf, 1, 2))) static void note(const char* format, ...) {
  char line[8192];
  va_list arguments;
  va_start(arguments, format);
  const int length = vsnprintf(line, sizeof line, format, arguments);
  va_end(arguments);
  if (file >= 0 && length > 0) {
    const size_t whole = (size_t)length < sizeof line ? (size_t)length : sizeof line - 1;
    if (write(file, line, whole) < 0) {
      abort();
    }
  }
}

int sqlite3_open_v2(const char* name, sqlite3** sqlite, int flags, const char* vfs) {
  int (*real)(const char*, sqlite3**, int, const char*);
  FIND(real, "sqlite3_open_v2");
  note("open %s %d\n", name, flags);
  return real(name, sqlite, flags, vfs);
}

int sqlite3_close(sqlite3* sqlite) {
  int (*real)(sqlite3*);
  FIND(real, "sqlite3_close");
  note("close\n");
  return real(sqlite);
}

int sqlite3_close_v2(sqlite3* sqlite) {
  int (*real)(sqlite3*);
  FIND(real, "sqlite3_close_v2");
  note("close_v2\n");
  return real(sqlite);
}

int sqlite3_prepare_v2(sqlite3* sqlite, const char* sql, int length, sqlite3_stmt** statement,
                       const char** tail) {
  int (*real)(sqlite3*, const char*, int, sqlite3_stmt**, const char**);
  FIND(real, "sqlite3_prepare_v2");
  note("prepare %s\n", sql);
  return real(sqlite, sql, length, statement, tail);
}

int sqlite3_prepare_v3(sqlite3* sqlite, const char* sql, int length, unsigned int flags,
                       sqlite3_stmt** statement, const char** tail) {
  int (*real)(sqlite3*, const char*, int, unsigned int, sqlite3_stmt**, const char**);
  FIND(real, "sqlite3_prepare_v3");
  note("prepare %s\n", sql);
  return real(sqlite, sql, length, flags, statement, tail);
}

int sqlite3_step(sqlite3_stmt* statement) {
  int (*real)(sqlite3_stmt*);
  FIND(real, "sqlite3_step");
  const int code = real(statement);
  note("step %d\n", code);
  return code;
}

int sqlite3_wal_checkpoint_v2(sqlite3* sqlite, const char* name, int mode, int* log, int* done) {
  int (*real)(sqlite3*, const char*, int, int*, int*);
  FIND(real, "sqlite3_wal_checkpoint_v2");
  note("checkpoint %d\n", mode);
  return real(sqlite, name, mode, log, done);
}

int fsync(int descriptor) {
  int (*real)(int);
  FIND(real, "fsync");
  note("fsync\n");
  return real(descriptor);
}

int fdatasync(int descriptor) {
  int (*real)(int);
  FIND(real, "fdatasync");
  note("fdatasync\n");
  return real(descriptor);
}

int setresuid(uid_t real_id, uid_t effective, uid_t saved) {
  int (*real)(uid_t, uid_t, uid_t);
  FIND(real, "setresuid");
  note("setresuid %d %d %d\n", (int)real_id, (int)effective, (int)saved);
  return real(real_id, effective, saved);
}

int setresgid(gid_t real_id, gid_t effective, gid_t saved) {
  int (*real)(gid_t, gid_t, gid_t);
  FIND(real, "setresgid");
  note("setresgid %d %d %d\n", (int)real_id, (int)effective, (int)saved);
  return real(real_id, effective, saved);
}
