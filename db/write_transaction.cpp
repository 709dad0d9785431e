#include <internal/base_db_private.h>
#include <internal/write_transaction.h>

namespace TUVO::sharing::db {

bool WriteTransaction::IsOpenIn(const BaseDB& db) {
  return db.p_->IsInTransaction();
}

WriteTransaction::WriteTransaction(BaseDB& db, bool joins)
    : db_(db), joins_(joins), held_(Hold()) {}

WriteTransaction::~WriteTransaction() {
  // Once more: a transaction that a passing fault leaves open would lock everybody out, and take in
  // all that this process writes from now on.
  for (int tries = 0; tries < 2 && !joins_ && IsOpen(); ++tries) {
    db_.Execute("ROLLBACK");
  }
}

// A transaction of the caller's may hold nothing yet. Its first statement waits for whoever is
// writing only when it writes itself: one that reads first is refused at once when it writes later.
bool WriteTransaction::Hold() {
  return db_.Execute(joins_ ? "DELETE FROM entry WHERE 0" : "BEGIN IMMEDIATE");
}

bool WriteTransaction::IsOpen() const {
  return held_ && IsOpenIn(db_);
}

bool WriteTransaction::Commit() {
  return IsOpen() && (joins_ || db_.Commit());
}

}  // namespace TUVO::sharing::db
