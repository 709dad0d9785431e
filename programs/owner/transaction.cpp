#include "owner/transaction.h"

#include <string>

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::EntryDB;
using Work = std::function<MaybeProblem(EntryDB&)>;

// What SQLite says of a file that another connection writes to, and of a transaction whose reads
// another connection's write has made stale.
bool IsLocked(const BaseDB& db) {
  return db.GetLastError().find("locked") != std::string::npos;
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

// A write that changes nothing takes the lock, and waits for it as every first statement does; one
// that comes after a read is refused at once.
bool TakeLock(BaseDB& db) {
  return db.Execute("DELETE FROM entry WHERE 0");
}

MaybeProblem Attempt(BaseDB& db, EntryDB& links, const Work& work, Locking locking) {
  OpenTransaction transaction(db);
  if (!transaction.IsOpen() || (locking == Locking::kFirst && !TakeLock(db))) {
    return InternalFault();
  }
  MaybeProblem problem = work(links);
  if (!problem && !transaction.Commit()) {
    problem = InternalFault();
  }
  return problem;
}

bool MetAnotherWriter(const BaseDB& db, const MaybeProblem& problem) {
  return problem && problem->error == Error::kInternal && IsLocked(db);
}

}  // namespace

MaybeProblem InTransaction(BaseDB& db, const Work& work, Locking locking) {
  EntryDB links(db);  // ends, and checkpoints, behind the last transaction
  MaybeProblem problem = Attempt(db, links, work, locking);
  if (locking != Locking::kFirst && MetAnotherWriter(db, problem)) {
    problem = Attempt(db, links, work, Locking::kFirst);
  }
  return MetAnotherWriter(db, problem)
             ? Fault(Error::kBusy, "other programs keep the links locked; try again")
             : problem;
}

}  // namespace owner
