// Reading and writing links as one step that no other program comes between.
#ifndef PROGRAMS_OWNER_TRANSACTION_H_
#define PROGRAMS_OWNER_TRANSACTION_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry_db.h>

#include <functional>

#include "owner/problem.h"

namespace owner {

// Runs `work` between Begin and Commit. What it reads is of one moment; when another program has
// written since, or keeps the file locked, the transaction is taken back and `work` runs again from
// the beginning, after a pause, up to kMostAttempts times: it must do nothing that cannot be
// repeated, and return InternalFault() when a statement failed. A problem that it returns takes
// everything back and is returned; Error::kBusy says that every attempt met another program.
// `work` must not make stores of its own: the end of a store checkpoints, which a transaction
// forbids. May throw std::bad_alloc; everything is then taken back.
constexpr int kMostAttempts = 25;
MaybeProblem InTransaction(TUVO::sharing::db::BaseDB& db,
                           const std::function<MaybeProblem(TUVO::sharing::db::EntryDB&)>& work);

}  // namespace owner

#endif  // PROGRAMS_OWNER_TRANSACTION_H_
