#include "owner/transaction.h"

#include <string>

#include "owner/database_log.h"

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::EntryDB;
using Work = std::function<MaybeProblem(EntryDB&)>;

// A success leaves the connection's error as it was: of an earlier statement, maybe of another
// command. A statement that the connection itself refuses puts a reason of its own there, which is
// returned: as long as it stands there, nothing else has failed.
std::string ForgetError(BaseDB& db) {
  db.Execute(std::string(1, '\0'));
  return db.GetLastError();
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
  bool Commit() {
    // BaseDB's own Commit takes back by itself what it could not commit, and whether that went well
    // is what the connection remembers then; here the reason of the first failure is still to be
    // asked for.
    open_ = !db_.Execute("COMMIT");
    return !open_;
  }

 private:
  BaseDB& db_;
  bool open_;
};

// A write that changes nothing takes the lock, and waits for it as every first statement does; one
// that comes after a read is refused at once.
bool TakeLock(BaseDB& db) {
  return db.Execute("DELETE FROM entry WHERE 0");
}

struct Outcome {
  MaybeProblem problem;
  std::string reason;  // the connection's, of a statement that failed; empty: none did
};

MaybeProblem WorkAndCommit(BaseDB& db, EntryDB& links, const Work& work, Locking locking,
                           OpenTransaction* transaction) {
  if (!transaction->IsOpen() || (locking == Locking::kFirst && !TakeLock(db))) {
    return InternalFault();
  }
  MaybeProblem problem = work(links);
  return problem || transaction->Commit() ? problem : InternalFault();
}

Outcome Attempt(BaseDB& db, EntryDB& links, const Work& work, Locking locking) {
  const std::string no_error = ForgetError(db);
  OpenTransaction transaction(db);
  Outcome outcome;
  outcome.problem = WorkAndCommit(db, links, work, locking, &transaction);
  // Now: SQLite has taken some failed transactions back already, and to do so again is an error.
  const std::string reason = db.GetLastError();
  outcome.reason = reason == no_error ? "" : reason;
  return outcome;
}

// What SQLite says of a file that another connection writes to, and of a transaction whose reads
// another connection's write has made stale.
bool MetAnotherWriter(const Outcome& outcome) {
  return outcome.problem && outcome.problem->error == Error::kInternal &&
         outcome.reason.find("locked") != std::string::npos;
}

}  // namespace

MaybeProblem InTransaction(BaseDB& db, const Work& work, Locking locking) {
  EntryDB links(db);  // ends, and checkpoints, behind the last transaction
  Outcome outcome = Attempt(db, links, work, locking);
  if (locking != Locking::kFirst && MetAnotherWriter(outcome)) {
    outcome = Attempt(db, links, work, Locking::kFirst);
  }
  if (MetAnotherWriter(outcome)) {
    return Fault(Error::kBusy, "other programs keep the links locked; try again");
  }
  if (outcome.problem && outcome.problem->error == Error::kInternal && !outcome.reason.empty()) {
    LogDatabaseFault(outcome.reason);
  }
  return outcome.problem;
}

}  // namespace owner
