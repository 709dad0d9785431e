/* The floor: what SQLite and the kernel take for the statements that the library runs, with the
 * same texts in the same order, the same pragmas, identity switches and checkpoints, and nothing
 * else. `scripts/bench --check-floor` compares the two call by call. */
#include <inttypes.h>
#include <stdio.h>
#include <string.h>
#include <time.h>

#include "common/content.h"
#include "common/measure.h"
#include "floor/auto_block.h"
#include "floor/database.h"
#include "floor/json.h"

enum { kLifetime = 86400, kLongestData = 1024 };

/* What the statements read, as far as later ones need it. */
static struct {
  sqlite3_int64 id;
  char ip[65];
  sqlite3_int64 uid;
  char session_id[BENCH_SESSION_SIZE];
} session;

static struct {
  sqlite3_int64 id;
  char hash[64];
  char project[64];
  sqlite3_int64 enabled, owner, start_at, expire_at, expire_times, use_count, auto_gc;
  char data[kLongestData];
} link;

static struct { sqlite3_int64 id, entry, session; } token;

static int rows = 0;
static int unread = 0;

static void copy_text(sqlite3_stmt* statement, int column, char* text, size_t size) {
  const unsigned char* value = sqlite3_column_text(statement, column);
  if (value == NULL || strlen((const char*)value) >= size) {
    ++unread;
    return;
  }
  strcpy(text, (const char*)value);
}

static void read_session(sqlite3_stmt* statement) {
  ++rows;
  session.id = sqlite3_column_int64(statement, 0);
  copy_text(statement, 1, session.session_id, sizeof session.session_id);
  session.uid = sqlite3_column_int64(statement, 2);
  copy_text(statement, 3, session.ip, sizeof session.ip);
  (void)sqlite3_column_int64(statement, 4);
}

static void read_link(sqlite3_stmt* statement) {
  ++rows;
  link.id = sqlite3_column_int64(statement, 0);
  copy_text(statement, 1, link.hash, sizeof link.hash);
  copy_text(statement, 2, link.project, sizeof link.project);
  link.enabled = sqlite3_column_int64(statement, 3);
  link.owner = sqlite3_column_int64(statement, 4);
  link.start_at = sqlite3_column_int64(statement, 5);
  link.expire_at = sqlite3_column_int64(statement, 6);
  link.expire_times = sqlite3_column_int64(statement, 7);
  link.use_count = sqlite3_column_int64(statement, 8);
  link.auto_gc = sqlite3_column_int64(statement, 9);
  copy_text(statement, 10, link.data, sizeof link.data);
}

static void read_token(sqlite3_stmt* statement) {
  ++rows;
  token.id = sqlite3_column_int64(statement, 0);
  token.entry = sqlite3_column_int64(statement, 1);
  token.session = sqlite3_column_int64(statement, 2);
  (void)sqlite3_column_int64(statement, 3);
}

static void read_listed(sqlite3_stmt* statement) {
  read_link(statement);
  if (parse_json(link.data, strlen(link.data)) != 0) {
    ++unread;
  }
}

static void read_count(sqlite3_stmt* statement) {
  rows += sqlite3_column_int64(statement, 0) == 0;
}

/* 0 when a statement gave so many rows, each readable. */
static int expect(int failed, int wanted) {
  const int got = rows;
  rows = 0;
  return failed != 0 || got != wanted || unread != 0 ? -1 : 0;
}

static int find_session(const char* id) {
  return expect(runf(read_session, "SELECT * FROM session WHERE session_id = '%s'", id), 1);
}

static int find_link(const char* hash) {
  return expect(runf(read_link, "SELECT * FROM entry WHERE hash = '%s'", hash), 1);
}

static int find_token(int wanted) {
  return expect(runf(read_token, "SELECT * FROM token WHERE session_id = %lld AND entry_id = %lld",
                     session.id, link.id),
                wanted);
}

static long long end_of_lifetime(void) {
  return (long long)time(NULL) + kLifetime;
}

static int update_session(void) {
  return runf(NULL,
              "UPDATE session SET ip='%s',session_id='%s',timeout='%lld',uid='%lld' WHERE id=%lld",
              session.ip, session.session_id, end_of_lifetime(), session.uid, session.id);
}

static int update_token(void) {
  return runf(NULL,
              "UPDATE token SET entry_id='%lld',session_id='%lld',timeout='%lld' WHERE id=%lld",
              token.entry, token.session, end_of_lifetime(), token.id);
}

static int update_link(void) {
  return runf(NULL,
              "UPDATE entry SET auto_gc='%lld',data='%s',enabled='%lld',expire_at='%lld',"
              "expire_times='%lld',hash='%s',owner_uid='%lld',project_name='%s',start_at='%lld',"
              "use_count='%lld' WHERE id=%lld",
              link.auto_gc, link.data, link.enabled, link.expire_at, link.expire_times, link.hash,
              link.owner, link.project, link.start_at, link.use_count, link.id);
}

static int checkpoint_three(void) {
  return checkpoint() == 0 && checkpoint() == 0 ? checkpoint() : -1;
}

static int find_all(uint64_t i) {
  char hash[BENCH_HASH_SIZE];
  char id[BENCH_SESSION_SIZE];
  bench_hash(i, hash);
  bench_session(i, id);
  return find_session(id) == 0 && find_link(hash) == 0 ? find_token(1) : -1;
}

static int check(const struct bench_target* target) {
  return find_all(target->link) == 0 && update_session() == 0 && update_token() == 0
             ? checkpoint_three()
             : -1;
}

static int logout(const struct bench_target* target) {
  return find_all(target->link) == 0 && runf(NULL, "DELETE FROM token WHERE id=%lld", token.id) == 0
             ? checkpoint_three()
             : -1;
}

static int count_one_use(const char* hash) {
  if (find_link(hash) != 0) {
    return -1;
  }
  ++link.use_count;
  return update_link();
}

/* A use in a transaction of its own. */
static int count_alone(const char* hash) {
  return run("BEGIN IMMEDIATE", NULL) == 0 && count_one_use(hash) == 0 && run("COMMIT", NULL) == 0
             ? checkpoint()
             : -1;
}

static int count_use(const struct bench_target* target) {
  char hash[BENCH_HASH_SIZE];
  bench_hash(target->link, hash);
  return count_alone(hash);
}

/* Numbers from here on are those of new links and sessions. */
static uint64_t new_number(const struct bench_target* target) {
  return (UINT64_C(1) << 40) + target->turn;
}

static int make_session(const struct bench_target* target) {
  bench_session(new_number(target), session.session_id);
  strcpy(session.ip, BENCH_ADDRESS);
  session.uid = BENCH_NOBODY;
  const int failed = runf(NULL, "INSERT INTO session VALUES (NULL,'%s','%lld','%s','%lld')",
                          session.session_id, session.uid, session.ip, end_of_lifetime());
  session.id = sqlite3_last_insert_rowid(database);
  return failed;
}

static int make_token(void) {
  return find_token(0) == 0 &&
                 expect(runf(read_count,
                             "SELECT COUNT(*) AS c FROM token WHERE `session_id` = '%lld' AND "
                             "`entry_id` = '%lld'",
                             session.id, link.id),
                        1) == 0
             ? runf(NULL, "INSERT INTO token VALUES (NULL,'%lld','%lld','%lld')", link.id,
                    session.id, end_of_lifetime())
             : -1;
}

/* The link is looked at once more, with the file held. */
static int admit(const struct bench_target* target, const char* hash) {
  return run("BEGIN IMMEDIATE", NULL) == 0 && find_link(hash) == 0 && make_session(target) == 0 &&
                 make_token() == 0 && update_session() == 0 && run("COMMIT", NULL) == 0 &&
                 checkpoint() == 0
             ? checkpoint()
             : -1;
}

static int login(const struct bench_target* target) {
  char hash[BENCH_HASH_SIZE];
  bench_hash(target->link, hash);
  return ask_auto_block() == 0 && find_link(hash) == 0 && count_alone(hash) == 0 &&
                 admit(target, hash) == 0 && reset_auto_block() == 0
             ? checkpoint()
             : -1;
}

static int create(const struct bench_target* target) {
  char hash[BENCH_HASH_SIZE];
  bench_hash(new_number(target), hash);
  return runf(NULL,
              "INSERT INTO entry VALUES (NULL,'%s','" BENCH_PROJECT
              "','1','%u','0','0','0','0','1','%s')",
              hash, bench_owner(target->turn, target->links), bench_data(BENCH_OPEN)) == 0
             ? checkpoint()
             : -1;
}

static int page(const struct bench_target* target) {
  const int failed = runf(read_listed,
                          "SELECT * FROM entry WHERE `owner_uid` = '%u' ORDER BY id ASC LIMIT 50 "
                          "OFFSET 100",
                          bench_owner(target->link, target->links));
  return expect(failed, 50) == 0 ? checkpoint() : -1;
}

static int query(const struct bench_target* target) {
  const int failed = run("SELECT * FROM entry", read_listed);
  return expect(failed, (int)target->links) == 0 ? checkpoint() : -1;
}

static int purge_entries(const struct bench_target* target) {
  (void)target;
  return runf(NULL,
              "DELETE FROM entry WHERE auto_gc = 1 AND  ((expire_at != 0 AND expire_at < %lld) OR "
              "(expire_times != 0 AND use_count >= expire_times))",
              (long long)time(NULL)) == 0
             ? checkpoint()
             : -1;
}

static int purge(const char* table) {
  return runf(NULL, "DELETE FROM %s WHERE timeout < '%lld'", table, (long long)time(NULL)) == 0
             ? checkpoint()
             : -1;
}

static int purge_sessions(const struct bench_target* target) {
  (void)target;
  return purge("session");
}

static int purge_tokens(const struct bench_target* target) {
  (void)target;
  return purge("token");
}

static const struct bench_row kRows[] = {
    {"check", BENCH_ANY, BENCH_OPEN, check},
    {"login_open", BENCH_ANY, BENCH_OPEN, login},
    {"login_password", BENCH_ANY, BENCH_WITH_PASSWORD, login},
    {"count_use", BENCH_ANY, BENCH_OPEN, count_use},
    {"logout", BENCH_EACH_ONCE, BENCH_OPEN, logout},
    {"create", BENCH_ANY, BENCH_OPEN, create},
    {"page", BENCH_ANY, BENCH_OPEN, page},
    {"query", BENCH_ANY, BENCH_OPEN, query},
    {"purge_entries", BENCH_ANY, BENCH_OPEN, purge_entries},
    {"purge_sessions", BENCH_ANY, BENCH_OPEN, purge_sessions},
    {"purge_tokens", BENCH_ANY, BENCH_OPEN, purge_tokens},
    {NULL, BENCH_ANY, BENCH_OPEN, NULL},
};

int main(int argc, char** argv) {
  return bench_main(argc, argv, kRows, open_database);
}
