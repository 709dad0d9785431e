#ifndef INTERNAL_WRITE_TRANSACTION_H_
#define INTERNAL_WRITE_TRANSACTION_H_

#include <tuvosharing/base_db.h>

namespace TUVO::sharing::db {

// Holds the sharing database for writing until it is committed or taken back, at the latest with
// this object.
class WriteTransaction {
 public:
  // Whether a transaction is open: at the beginning of an operation, one of the caller's own.
  static bool IsOpenIn(const BaseDB& db);

  // `joins` when the caller has a transaction open, which then decides over all that is written.
  // Waits for the file; in vain, when the caller has read before and somebody else writes.
  WriteTransaction(BaseDB& db, bool joins);
  WriteTransaction(const WriteTransaction&) = delete;
  WriteTransaction& operator=(const WriteTransaction&) = delete;
  ~WriteTransaction();

  // False when the file could not be had, being locked by somebody else for one; later, when the
  // database took everything back on its own, as it does after a failed read or for want of memory
  // or room. What is written then is written at once.
  bool IsOpen() const;

  // False when it is not open any more or the commit failed: then nothing was written.
  bool Commit();

 private:
  bool Hold();

  BaseDB& db_;
  const bool joins_;
  const bool held_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_WRITE_TRANSACTION_H_
