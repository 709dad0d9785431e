#include "visitor/session_address.h"

#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include "common/client_address.h"

namespace visitor {

bool IsSessionOfThisAddress(const std::string& session_id) {
  const std::string address = common::ClientAddress();
  TUVO::sharing::record::Session session;
  return !address.empty() &&
         TUVO::sharing::db::SessionDB(TUVO::sharing::db::SharingDB::Instance())
             .GetBySessionId(session_id, session) &&
         session.get_ip() == address;
}

}  // namespace visitor
