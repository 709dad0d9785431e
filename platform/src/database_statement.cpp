#include "database_statement.h"

#include <sqlite3.h>

#include <chrono>
#include <thread>
#include <utility>

#include "database_wait.h"

namespace tuvo_platform {

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

constexpr milliseconds kPause{5};

struct Finalize {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, Finalize>;

bool IsBusy(int code) {
  return (code & 0xff) == SQLITE_BUSY;
}

// One attempt at the first statement of `sql`. `*gave_row` tells whether a row came out of it.
int RunOnce(sqlite3* sqlite, const char* sql, const char** tail,
            std::unique_ptr<DBResult_tag>* rows, bool* gave_row) {
  sqlite3_stmt* prepared = nullptr;
  int code = sqlite3_prepare_v2(sqlite, sql, -1, &prepared, tail);
  const Statement statement(prepared);
  if (code != SQLITE_OK || statement == nullptr) {
    return code;  // no statement and no error: blanks or a comment
  }
  code = sqlite3_step(prepared);
  *gave_row = code == SQLITE_ROW;
  if (code != SQLITE_ROW && code != SQLITE_DONE) {
    return code;
  }
  if (sqlite3_column_count(prepared) == 0) {
    return SQLITE_OK;
  }
  auto result = std::make_unique<DBResult_tag>(prepared);
  for (; code == SQLITE_ROW; code = sqlite3_step(prepared)) {
    result->AddRow(prepared);
  }
  if (code != SQLITE_DONE) {
    return code;
  }
  *rows = std::move(result);
  return SQLITE_OK;
}

// Shortens SQLite's own waiting during further attempts, so that a statement never waits a second
// full time after the first, and puts the full time back at the end.
class RemainingWait {
 public:
  explicit RemainingWait(sqlite3* sqlite) : sqlite_(sqlite), deadline_(Clock::now() + kBusyWait) {}
  ~RemainingWait() {
    if (shortened_) {
      SetBusyWait(sqlite_);
    }
  }
  RemainingWait(const RemainingWait&) = delete;
  RemainingWait& operator=(const RemainingWait&) = delete;

  // Sleeps a little before the next attempt; false when the time is up.
  bool Pause() {
    left_ = std::chrono::duration_cast<milliseconds>(deadline_ - Clock::now()) - kPause;
    if (left_ <= milliseconds::zero()) {
      return false;
    }
    std::this_thread::sleep_for(kPause);
    SetBusyWait(sqlite_, &left_);
    shortened_ = true;
    return true;
  }

 private:
  sqlite3* sqlite_;
  Clock::time_point deadline_;
  milliseconds left_ = kBusyWait;
  bool shortened_ = false;
};

}  // namespace

// SQLite waits by itself where waiting can help the one lock it needs, but a change of the journal
// mode that meets another process answers "busy" at once: it would have to give up a lock that it
// holds. Starting over does give it up. That is only right while the statement is its own
// transaction, where a failure undoes all of it, and while the caller has seen no row of it.
int RunStatement(sqlite3* sqlite, const char* sql, const char** tail,
                 std::unique_ptr<DBResult_tag>* rows) {
  const bool own_transaction = sqlite3_get_autocommit(sqlite) != 0;
  RemainingWait wait(sqlite);
  for (;;) {
    bool gave_row = false;
    const int code = RunOnce(sqlite, sql, tail, rows, &gave_row);
    if (!IsBusy(code) || !own_transaction || gave_row || !wait.Pause()) {
      return code;
    }
  }
}

}  // namespace tuvo_platform
