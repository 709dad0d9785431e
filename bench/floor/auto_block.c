#include "floor/auto_block.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <string.h>
#include <time.h>
#include <unistd.h>

#include "common/content.h"
#include "floor/identity.h"

enum { kBusyMilliseconds = 10000 };

/* With the address, when `binds` is at least 1, and the time, when it is 2. */
static int run_bound(sqlite3* sqlite, const char* sql, int binds) {
  sqlite3_stmt* statement = NULL;
  if (sqlite3_prepare_v2(sqlite, sql, -1, &statement, NULL) != SQLITE_OK) {
    return -1;
  }
  if (binds >= 1) {
    sqlite3_bind_text(statement, 1, BENCH_NETWORK, -1, SQLITE_STATIC);
  }
  if (binds >= 2) {
    sqlite3_bind_int64(statement, 2, time(NULL));
  }
  int code = sqlite3_step(statement);
  while (code == SQLITE_ROW) {
    code = sqlite3_step(statement);
  }
  sqlite3_finalize(statement);
  return code == SQLITE_DONE ? 0 : -1;
}

/* The file is there: the database was prepared with it. */
static sqlite3* open_store(void) {
  sqlite3* sqlite = NULL;
  const int file = open(BENCH_AUTO_BLOCK, O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, 0660);
  if (file >= 0) {
    close(file);
  }
  if (sqlite3_open_v2(BENCH_AUTO_BLOCK, &sqlite, SQLITE_OPEN_READWRITE, NULL) != SQLITE_OK) {
    return NULL;
  }
  sqlite3_busy_timeout(sqlite, kBusyMilliseconds);
  return run_bound(sqlite, "PRAGMA user_version", 0) == 0 ? sqlite : NULL;
}

static int ask(sqlite3* sqlite) {
  return run_bound(sqlite, "SELECT 1 FROM denial WHERE network = ? AND until > ?", 2);
}

/* There is nothing to reset. */
static int reset(sqlite3* sqlite) {
  return run_bound(sqlite,
                   "SELECT 1 FROM failure WHERE network = ?1 UNION ALL SELECT 1 FROM denial WHERE "
                   "network = ?1",
                   1);
}

static int with_store(int (*work)(sqlite3* sqlite)) {
  if (enter_system() != 0) {
    return -1;
  }
  sqlite3* sqlite = open_store();
  const int failed = sqlite == NULL ? -1 : work(sqlite);
  sqlite3_close(sqlite);
  return leave_system() != 0 ? -1 : failed;
}

int ask_auto_block(void) {
  return with_store(ask);
}
int reset_auto_block(void) {
  return with_store(reset);
}
