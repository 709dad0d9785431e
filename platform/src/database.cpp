// The connection: opening, running texts of statements, error texts, closing.
#include <sqlite3.h>
#include <tuvoplatform/database.h>

#include <cstring>
#include <exception>
#include <memory>
#include <new>
#include <string>

#include "database_connection.h"
#include "database_log.h"
#include "database_result.h"
#include "database_statement.h"
#include "database_wait.h"
#include "log_restart.h"

namespace {

using tuvo_platform::Connection;
using tuvo_platform::kNoMemory;

constexpr char kRollback[] = "ROLLBACK";

bool RollBack(Connection* connection) {
  const bool done = sqlite3_step(connection->rollback) == SQLITE_DONE;
  if (!done) {
    connection->error = sqlite3_errmsg(connection->sqlite);
  }
  sqlite3_reset(connection->rollback);
  return done;
}

void RollBackIfOpen(Connection* connection) {
  if (sqlite3_get_autocommit(connection->sqlite) == 0) {
    sqlite3_step(connection->rollback);
    sqlite3_reset(connection->rollback);
  }
}

// Runs all statements of `sql`. On a failure its text is in `connection->error`.
bool RunAll(Connection* connection, const char* sql, std::unique_ptr<DBResult_tag>* rows) {
  try {
    if (std::strcmp(sql, kRollback) == 0) {
      return RollBack(connection);
    }
    while (*sql != '\0') {
      if (tuvo_platform::RunStatement(connection->sqlite, sql, &sql, rows) != SQLITE_OK) {
        connection->error = sqlite3_errmsg(connection->sqlite);
        return false;
      }
    }
    return true;
  } catch (const std::exception&) {  // the rows, or the error's text, do not fit
    connection->error = kNoMemory;
    return false;
  }
}

// Opens the file and makes ready what the connection needs.
bool Open(Connection* connection, const char* path) {
  return sqlite3_open_v2(path, &connection->sqlite, SQLITE_OPEN_READWRITE | SQLITE_OPEN_CREATE,
                         nullptr) == SQLITE_OK &&
         tuvo_platform::SetBusyWait(connection->sqlite) == SQLITE_OK &&
         sqlite3_prepare_v3(connection->sqlite, kRollback, -1, SQLITE_PREPARE_PERSISTENT,
                            &connection->rollback, nullptr) == SQLITE_OK;
}

}  // namespace

TUVODB* TUVODBConnect(const char* /*host*/, const char* /*user*/, const char* /*password*/,
                      const char* path) {
  if (path == nullptr || *path == '\0') {  // SQLite would make a nameless temporary database
    return nullptr;
  }
  std::unique_ptr<Connection> connection(new (std::nothrow) Connection());
  if (connection == nullptr || !Open(connection.get(), path)) {
    return nullptr;
  }
  tuvo_platform::WatchLog(connection.get());
  tuvo_platform::WatchLogRestarts(connection->sqlite);
  return connection.release();
}

int TUVODBExecute(TUVODB* db, const char* sql, DBResult_tag** result) {
  if (result != nullptr) {
    *result = nullptr;
  }
  if (db == nullptr) {
    return -1;
  }
  auto* connection = static_cast<Connection*>(db);
  if (sql == nullptr) {
    connection->error = "no text";
    return -1;
  }
  const bool callers_transaction = sqlite3_get_autocommit(db->sqlite) == 0;
  std::unique_ptr<DBResult_tag> rows;
  const bool done = RunAll(connection, sql, &rows);
  if (!done && !callers_transaction) {
    RollBackIfOpen(connection);
  }
  tuvo_platform::KeepLogShort(connection);
  if (!done) {
    return -1;
  }
  if (result != nullptr) {
    *result = rows.release();
  }
  return 0;
}

const char* TUVODBErrorGet(TUVODB* db) {
  return db != nullptr ? static_cast<Connection*>(db)->error.c_str() : "not connected";
}

void TUVODBClose(TUVODB* db) {
  delete static_cast<Connection*>(db);
}
