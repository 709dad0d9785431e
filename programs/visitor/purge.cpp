#include "visitor/purge.h"

#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

namespace visitor {

void PurgeNowAndThen() {
  // One per cent: the library cuts fractions of a per cent off, and the nearest float to 0.01 lies
  // below it, where it would mean never.
  constexpr float kProbability = 0.015F;
  TUVO::sharing::db::SharingDB& db = TUVO::sharing::db::SharingDB::Instance();
  TUVO::sharing::db::SessionDB(db).PurgeExpired(kProbability);
  TUVO::sharing::db::TokenDB(db).PurgeExpired(kProbability);
  TUVO::sharing::db::EntryDB(db).PurgeExpired(kProbability);
}

}  // namespace visitor
