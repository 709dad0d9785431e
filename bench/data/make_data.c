/* Makes a database of the measurements:
 *
 *   bench_make_data FILE SCHEMA-FOLDER COUNT EXPIRED
 *
 * with COUNT links, sessions and tokens in force, and EXPIRED more of each that are over. One
 * transaction, and the indices last, since only then a million rows take seconds. */
#include <inttypes.h>
#include <sqlite3.h>
#include <stdio.h>
#include <stdlib.h>

#include "common/content.h"

/* In force until 2100, so that a kept database stays what it was; over since 2001. */
#define END_IN_FORCE INT64_C(4102444800)
#define END_OVER INT64_C(1000000000)

static sqlite3* database = NULL;

static void fail(const char* what) {
  fprintf(stderr, "%s: %s\n", what, database != NULL ? sqlite3_errmsg(database) : "no memory");
  exit(1);
}

static void execute(const char* sql) {
  if (sqlite3_exec(database, sql, NULL, NULL, NULL) != SQLITE_OK) {
    fail(sql);
  }
}

static void execute_file(const char* folder, const char* name) {
  static char sql[65536];
  char path[4096];
  snprintf(path, sizeof path, "%s/%s", folder, name);
  FILE* file = fopen(path, "r");
  if (file == NULL) {
    fail(path);
  }
  const size_t length = fread(sql, 1, sizeof sql - 1, file);
  fclose(file);
  sql[length] = '\0';
  execute(sql);
}

static sqlite3_stmt* prepare(const char* sql) {
  sqlite3_stmt* statement = NULL;
  if (sqlite3_prepare_v2(database, sql, -1, &statement, NULL) != SQLITE_OK) {
    fail(sql);
  }
  return statement;
}

static void step(sqlite3_stmt* statement) {
  if (sqlite3_step(statement) != SQLITE_DONE) {
    fail("insert");
  }
  sqlite3_reset(statement);
}

static int64_t end_of(uint64_t i, uint64_t in_force) {
  return i < in_force ? END_IN_FORCE : END_OVER;
}

static void add_links(uint64_t in_force, uint64_t all) {
  sqlite3_stmt* insert =
      prepare("INSERT INTO entry VALUES (NULL, ?, '" BENCH_PROJECT "', 1, ?, 0, ?, 0, 0, 1, ?)");
  char hash[BENCH_HASH_SIZE];
  for (uint64_t i = 0; i < all; ++i) {
    bench_hash(i, hash);
    sqlite3_bind_text(insert, 1, hash, -1, SQLITE_STATIC);
    sqlite3_bind_int64(insert, 2, bench_owner(i, in_force));
    sqlite3_bind_int64(insert, 3, i < in_force ? 0 : END_OVER);
    sqlite3_bind_text(insert, 4, bench_data(i), -1, SQLITE_STATIC);
    step(insert);
  }
  sqlite3_finalize(insert);
}

static void add_sessions(uint64_t in_force, uint64_t all) {
  sqlite3_stmt* insert =
      prepare("INSERT INTO session VALUES (NULL, ?, 4294967295, '" BENCH_ADDRESS "', ?)");
  char session[BENCH_SESSION_SIZE];
  for (uint64_t i = 0; i < all; ++i) {
    bench_session(i, session);
    sqlite3_bind_text(insert, 1, session, -1, SQLITE_STATIC);
    sqlite3_bind_int64(insert, 2, end_of(i, in_force));
    step(insert);
  }
  sqlite3_finalize(insert);
}

static void add_tokens(uint64_t in_force, uint64_t all) {
  sqlite3_stmt* insert = prepare("INSERT INTO token VALUES (NULL, ?, ?, ?)");
  for (uint64_t i = 0; i < all; ++i) {
    sqlite3_bind_int64(insert, 1, (sqlite3_int64)i + 1);
    sqlite3_bind_int64(insert, 2, (sqlite3_int64)i + 1);
    sqlite3_bind_int64(insert, 3, end_of(i, in_force));
    step(insert);
  }
  sqlite3_finalize(insert);
}

int main(int argc, char** argv) {
  if (argc != 5) {
    fprintf(stderr, "usage: %s FILE SCHEMA-FOLDER COUNT EXPIRED\n", argv[0]);
    return 2;
  }
  const uint64_t in_force = strtoull(argv[3], NULL, 10);
  const uint64_t all = in_force + strtoull(argv[4], NULL, 10);
  if (sqlite3_open(argv[1], &database) != SQLITE_OK) {
    fail(argv[1]);
  }
  /* A file that is not finished is thrown away, so nothing has to survive. */
  execute("PRAGMA journal_mode = OFF; PRAGMA synchronous = OFF; PRAGMA cache_size = -500000");
  execute_file(argv[2], "1.sql");
  execute("BEGIN");
  add_links(in_force, all);
  add_sessions(in_force, all);
  add_tokens(in_force, all);
  execute("COMMIT");
  execute_file(argv[2], "2.sql");
  execute("PRAGMA journal_mode = WAL");
  sqlite3_close(database);
  return 0;
}
