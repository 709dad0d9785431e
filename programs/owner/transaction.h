// Reading and writing links as one step that no other program comes between.
#ifndef PROGRAMS_OWNER_TRANSACTION_H_
#define PROGRAMS_OWNER_TRANSACTION_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry_db.h>

#include <functional>

#include "owner/problem.h"

namespace owner {

// When a transaction is to have the file for itself.
enum class Locking {
  kWhenWriting,  // with its first write: short, and mostly nobody else is there
  kFirst,        // before anything else, for what begins with a write that must not be tried again
};

// Runs `work` between Begin and Commit. What it reads is of one moment; when another program has
// written since, or is writing, the transaction is taken back and `work` runs once more from the
// beginning, this time with the file locked before, for which it waits up to 10 seconds: `work`
// must do nothing that cannot be repeated, and return InternalFault() when a statement failed. With
// Locking::kFirst it runs so at once, and never again. A problem that it returns takes everything
// back and is returned; Error::kBusy says that the file could not be had, and with kInternal the
// connection's reason is in the system log.
// `work` must not make stores of its own: the end of a store checkpoints, which a transaction
// forbids. May throw std::bad_alloc; everything is then taken back.
MaybeProblem InTransaction(TUVO::sharing::db::BaseDB& db,
                           const std::function<MaybeProblem(TUVO::sharing::db::EntryDB&)>& work,
                           Locking locking = Locking::kWhenWriting);

}  // namespace owner

#endif  // PROGRAMS_OWNER_TRANSACTION_H_
