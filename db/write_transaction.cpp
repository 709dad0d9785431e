#include <internal/base_db_private.h>
#include <internal/write_transaction.h>

namespace TUVO::sharing::db {

WriteTransaction::WriteTransaction(BaseDB& db)
    : db_(db), own_(!db.p_->IsInTransaction() && db.Execute("BEGIN IMMEDIATE")) {}

WriteTransaction::~WriteTransaction() {
  // Once more: a transaction that a passing fault leaves open would lock everybody out, and take in
  // all that this process writes from now on.
  for (int tries = 0; tries < 2 && own_ && IsOpen(); ++tries) {
    db_.Execute("ROLLBACK");
  }
}

bool WriteTransaction::IsOpen() const {
  return db_.p_->IsInTransaction();
}

bool WriteTransaction::Commit() {
  return IsOpen() && (!own_ || db_.Commit());
}

}  // namespace TUVO::sharing::db
