#include "inspect.h"

#include <tuvosharing/condition.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/login.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <cstdlib>
#include <iostream>

namespace demo {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;

bool ShowLink(const std::string& hash) {
  SharingDB& db = SharingDB::Instance();
  Entry entry;
  if (!EntryDB(db).GetByHash(hash, entry)) {
    std::cerr << "no such link\n";
    return false;
  }
  TokenDB tokens(db);
  tokens.GetCondition().Where(TUVO::sharing::SZK_ENTRY_ID, std::to_string(entry.get_id()));
  int admitted = 0;
  if (!tokens.Count(admitted)) {
    std::cerr << "the database cannot be read\n";
    return false;
  }
  std::cout << "uses " << entry.get_use_count() << ", admitted " << admitted << '\n';
  return true;
}

void ShowAuthorization(const std::string& hash, const std::string& session_id,
                       const std::string& address) {
  setenv("REMOTE_ADDR", address.c_str(), 1);
  _tag_sharing_login_params params{};
  params.sharing_id = hash.c_str();
  params.sharing_sid = session_id.c_str();
  std::cout << TUVO::TuvoSharingIsAuthorized(&params) << '\n';
}

}  // namespace demo
