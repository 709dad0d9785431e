#ifndef INTERNAL_WRITE_TRANSACTION_H_
#define INTERNAL_WRITE_TRANSACTION_H_

#include <tuvosharing/base_db.h>

namespace TUVO::sharing::db {

// Holds a database file for writing until it is committed or taken back, at the latest with this
// object. Within a transaction of the caller's own this is none, and that one decides.
class WriteTransaction {
 public:
  explicit WriteTransaction(BaseDB& db);
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
  BaseDB& db_;
  bool own_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_WRITE_TRANSACTION_H_
