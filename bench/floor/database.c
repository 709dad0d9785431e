#include "floor/database.h"

#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>

#include "common/content.h"
#include "floor/identity.h"

sqlite3* database = NULL;

static sqlite3_stmt* rollback = NULL;
static int log_pages = 0;

enum { kBusyMilliseconds = 10000, kLongLog = 1000, kVeryLongLog = 2000, kLongestStatement = 4096 };

static int after_commit(void* context, sqlite3* sqlite, const char* name, int pages) {
  (void)context;
  (void)sqlite;
  (void)name;
  log_pages = pages;
  return SQLITE_OK;
}

static void keep_log_short(void) {
  const int pages = log_pages;
  log_pages = 0;
  if (pages >= kVeryLongLog) {
    sqlite3_wal_checkpoint_v2(database, NULL, SQLITE_CHECKPOINT_RESTART, NULL, NULL);
  } else if (pages >= kLongLog) {
    sqlite3_wal_checkpoint_v2(database, NULL, SQLITE_CHECKPOINT_PASSIVE, NULL, NULL);
  }
}

static int run_one(const char* sql, const char** tail, on_row row) {
  sqlite3_stmt* statement = NULL;
  if (sqlite3_prepare_v2(database, sql, -1, &statement, tail) != SQLITE_OK) {
    return -1;
  }
  int code = sqlite3_step(statement);
  for (; code == SQLITE_ROW; code = sqlite3_step(statement)) {
    if (row != NULL) {
      row(statement);
    }
  }
  sqlite3_finalize(statement);
  return code == SQLITE_DONE ? 0 : -1;
}

int run(const char* sql, on_row row) {
  int failed = enter_system();
  while (failed == 0 && *sql != '\0') {
    failed = run_one(sql, &sql, row);
  }
  if (failed != 0) {
    fprintf(stderr, "%s: %s\n", sqlite3_errmsg(database), sql);
  }
  keep_log_short();
  return leave_system() != 0 ? -1 : failed;
}

int runf(on_row row, const char* format, ...) {
  char sql[kLongestStatement];
  va_list arguments;
  va_start(arguments, format);
  const int length = vsnprintf(sql, sizeof sql, format, arguments);
  va_end(arguments);
  return length < 0 || length >= (int)sizeof sql ? -1 : run(sql, row);
}

int checkpoint(void) {
  return run("PRAGMA wal_checkpoint;", NULL);
}

static void close_database(void) {
  enter_system();
  sqlite3_finalize(rollback);
  sqlite3_close_v2(database);
  leave_system();
}

static int connect_database(void) {
  if (sqlite3_open_v2(BENCH_DATABASE, &database, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE,
                      NULL) != SQLITE_OK ||
      sqlite3_busy_timeout(database, kBusyMilliseconds) != SQLITE_OK ||
      sqlite3_prepare_v3(database, "ROLLBACK", -1, SQLITE_PREPARE_PERSISTENT, &rollback, NULL) !=
          SQLITE_OK) {
    return -1;
  }
  sqlite3_wal_hook(database, after_commit, NULL);
  return 0;
}

int open_database(void) {
  if (enter_system() != 0) {
    return -1;
  }
  const int failed = connect_database();
  if (leave_system() != 0 || failed != 0 || atexit(close_database) != 0) {
    return -1;
  }
  return run("PRAGMA cache_size = 5000;PRAGMA foreign_keys = ON;PRAGMA journal_mode = WAL;"
             "PRAGMA synchronous = NORMAL;",
             NULL) == 0
             ? run("PRAGMA user_version", NULL)
             : -1;
}
