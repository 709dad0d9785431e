#include "database_log.h"

#include <sqlite3.h>

#include <chrono>
#include <thread>

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

int FoldBack(sqlite3* sqlite, const char* database, int mode) {
  return sqlite3_wal_checkpoint_v2(sqlite, database, mode, nullptr, nullptr);
}

// An ordinary checkpoint ends where the log ended when it began. Among many writers there is more
// by then, and the log would never be begun anew. This one lets nobody write until it is through.
void FoldBackAll(sqlite3* sqlite, const char* database) {
  SetBusyWait(sqlite, &kNoWait);
  for (int attempt = 0; attempt < kAttempts; ++attempt) {
    if (FoldBack(sqlite, database, SQLITE_CHECKPOINT_RESTART) != SQLITE_BUSY) {
      break;
    }
    std::this_thread::sleep_for(kPause);
  }
  SetBusyWait(sqlite);
}

int AfterCommit(void* /*context*/, sqlite3* sqlite, const char* database, int pages) {
  if (pages >= kVeryLong) {
    FoldBackAll(sqlite, database);
  } else if (pages >= kLong) {
    FoldBack(sqlite, database, SQLITE_CHECKPOINT_PASSIVE);
  }
  return SQLITE_OK;
}

}  // namespace

void KeepLogShort(sqlite3* sqlite) {
  sqlite3_wal_hook(sqlite, AfterCommit, nullptr);
}

}  // namespace tuvo_platform
