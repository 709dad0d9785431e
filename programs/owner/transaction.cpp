#include "owner/transaction.h"

#include <tuvoplatform/random.h>

#include <algorithm>
#include <chrono>
#include <string>
#include <thread>

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::EntryDB;
using Work = std::function<MaybeProblem(EntryDB&)>;

constexpr int kShortestPause = 5;    // milliseconds
constexpr int kLongestPause = 1000;  // milliseconds

// What SQLite says of a file that another connection writes to, and of a transaction whose reads
// another connection's write has made stale.
bool MetAnotherWriter(const BaseDB& db) {
  return db.GetLastError().find("locked") != std::string::npos;
}

// Two that have met are not to meet again at once. The pauses grow, to about ten seconds in all: as
// long as a single statement waits for a locked file.
void Pause(int attempt) {
  TUVO::RANDOM::TUVORandom random;
  constexpr int kDoublings = 8;
  const int longest = std::min(kShortestPause << std::min(attempt, kDoublings), kLongestPause);
  std::this_thread::sleep_for(std::chrono::milliseconds(random.random(kShortestPause, longest)));
}

// Takes back what was not committed.
class OpenTransaction {
 public:
  explicit OpenTransaction(BaseDB& db) : db_(db), open_(db.Begin()) {}
  ~OpenTransaction() {
    if (open_) {
      db_.Execute("ROLLBACK");
    }
  }
  OpenTransaction(const OpenTransaction&) = delete;
  OpenTransaction& operator=(const OpenTransaction&) = delete;

  bool IsOpen() const { return open_; }
  // A commit that fails is taken back by the connection itself.
  bool Commit() {
    open_ = false;
    return db_.Commit();
  }

 private:
  BaseDB& db_;
  bool open_;
};

enum class Outcome { kDone, kProblem, kAgain };

Outcome Attempt(BaseDB& db, EntryDB& links, const Work& work, MaybeProblem* problem) {
  OpenTransaction transaction(db);
  *problem = transaction.IsOpen() ? work(links) : InternalFault();
  if (!*problem && !transaction.Commit()) {
    *problem = InternalFault();
  }
  if (!*problem) {
    return Outcome::kDone;
  }
  const bool failed = (*problem)->error == Error::kInternal;
  return failed && MetAnotherWriter(db) ? Outcome::kAgain : Outcome::kProblem;
}

}  // namespace

MaybeProblem InTransaction(BaseDB& db, const Work& work) {
  EntryDB links(db);  // ends, and checkpoints, behind the last transaction
  for (int attempt = 0; attempt < kMostAttempts; ++attempt) {
    MaybeProblem problem;
    if (Attempt(db, links, work, &problem) != Outcome::kAgain) {
      return problem;
    }
    Pause(attempt);
  }
  return Fault(Error::kBusy, "other programs keep writing; try again");
}

}  // namespace owner
