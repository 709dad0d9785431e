#include "visitor/session_cookie.h"

#include <tuvosharing/keys.h>

#include "visitor/route.h"

namespace visitor {

bool QueueSessionCookie(TUVOCGI* cgi, const std::string& session_id) {
  return TuvoCgiSetCookies(cgi, TUVO::sharing::SZK_SHARING_SID, session_id.c_str(),
                           std::string(kMountPath).c_str()) == 1;
}

bool WriteSessionCookie(TUVOCGI* cgi, std::FILE* out) {
  return TuvoCgiWriteCookies(cgi, TUVO::sharing::SZK_SHARING_SID, out) >= 0;
}

}  // namespace visitor
