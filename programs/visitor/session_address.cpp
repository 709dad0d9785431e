#include "visitor/session_address.h"

#include <tuvoplatform/cgi.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <array>

namespace visitor {

bool IsSessionOfThisAddress(const std::string& session_id) {
  constexpr size_t kAddressSize = 65;
  std::array<char, kAddressSize> address{};
  TUVO::sharing::record::Session session;
  return TuvoCgiGetRemoteIP(address.data(), address.size()) == 0 &&
         TUVO::sharing::db::SessionDB(TUVO::sharing::db::SharingDB::Instance())
             .GetBySessionId(session_id, session) &&
         session.get_ip() == address.data();
}

}  // namespace visitor
