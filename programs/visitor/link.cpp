#include "visitor/link.h"

#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

namespace visitor {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

bool LoadLink(const std::string& hash, Entry* entry) {
  return EntryDB(SharingDB::Instance()).GetByHash(hash, *entry);
}

LinkState LookUpLink(const std::string& hash, Entry* entry) {
  if (!SharingDB::Instance().IsGood()) {
    return LinkState::kFailure;
  }
  if (!LoadLink(hash, entry) || !entry->IsValid()) {
    return LinkState::kNone;
  }
  const bool used_up =
      entry->get_expire_times() > 0 && entry->get_use_count() >= entry->get_expire_times();
  return used_up ? LinkState::kUsedUp : LinkState::kOpen;
}

}  // namespace visitor
