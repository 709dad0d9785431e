#include "database_log.h"

#include <sqlite3.h>

#include <chrono>
#include <thread>
#include <utility>

#include "database_connection.h"
#include "database_wait.h"

namespace tuvo_platform {

namespace {

using std::chrono::milliseconds;

// In pages. The first is what SQLite itself would take; 2000 pages are 8 MB.
constexpr int kLong = 1000;
constexpr int kVeryLong = 2000;

// A reader of old pages, a copy in the making for one, may stay for long: so many attempts, and the
// next commit goes on. No lock is held in between, so that nobody else waits meanwhile.
constexpr int kAttempts = 20;
constexpr milliseconds kPause{5};
constexpr milliseconds kNoWait{0};

int FoldBack(sqlite3* sqlite, int mode) {
  return sqlite3_wal_checkpoint_v2(sqlite, nullptr, mode, nullptr, nullptr);
}

// An ordinary checkpoint ends where the log ended when it began. Among many writers there is more
// by then, and the log would never be begun anew. This one lets nobody write until it is through.
void FoldBackAll(sqlite3* sqlite) {
  SetBusyWait(sqlite, &kNoWait);
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    if (FoldBack(sqlite, SQLITE_CHECKPOINT_RESTART) != SQLITE_BUSY) {
      break;
    }
    std::this_thread::sleep_for(kPause);
  }
  SetBusyWait(sqlite);
}

int AfterCommit(void* connection, sqlite3* /*sqlite*/, const char* /*database*/, int pages) {
  static_cast<Connection*>(connection)->log_pages = pages;
  return SQLITE_OK;
}

}  // namespace

void WatchLog(Connection* connection) {
  sqlite3_wal_hook(connection->sqlite, AfterCommit, connection);
}

void KeepLogShort(Connection* connection) {
  const int pages = std::exchange(connection->log_pages, 0);
  if (pages >= kVeryLong) {
    FoldBackAll(connection->sqlite);
  } else if (pages >= kLong) {
    FoldBack(connection->sqlite, SQLITE_CHECKPOINT_PASSIVE);
  }
}

}  // namespace tuvo_platform
