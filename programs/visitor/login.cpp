#include "visitor/login.h"

#include <tuvosharing/keys.h>
#include <tuvosharing/login.h>

#include <string>

#include "visitor/events.h"
#include "visitor/former_session.h"
#include "visitor/page_answers.h"
#include "visitor/session_cookie.h"

namespace visitor {

namespace {

constexpr int kSeeOther = 303;

// The library would forget an address's failed logins when one succeeds: whoever guesses at one
// link could open another now and then, and go on for ever. They are forgotten by their age alone.
// (The flag also leaves an account that has proved itself, and is not the link's, uncounted: that
// was no guess.)
constexpr bool kKeepFailures = true;

// No login goes on with the session that the cookie names: whoever has put the cookie there knows
// its identifier, and would be admitted with the visitor who proves himself. Every login begins
// a session of its own, of which nobody else can know.
_tag_sharing_login_params ParamsOf(const Request& request, const TUVOCGI* cgi) {
  _tag_sharing_login_params params{};
  params.sharing_id = request.route.hash.c_str();
  params.password = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_PASSWORD_);
  params.zor_username = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_ZOR_USERNAME);
  params.zor_password = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_ZOR_PASSWORD);
  params.sharing_sid = nullptr;
  return params;
}

Answer BackToLink(const Request& request) {
  Answer answer;
  answer.status = kSeeOther;
  answer.carries_cookie = true;
  std::string location = LinkPath(request.route.hash);
  if (request.asks_redirect) {
    location += "?" + std::string(kRedirectParameter) + "=1";
  }
  AddHeader(&answer, "Location", location);
  return answer;
}

}  // namespace

Answer Login(const Request& request, TUVOCGI* cgi) {
  _tag_sharing_login_params params = ParamsOf(request, cgi);
  std::string session_id;
  const int code = TUVO::TuvoSharingLogin(session_id, &params, kKeepFailures);
  LogLogin(request.route.hash, code);
  if (code != 1) {
    return RefusalAnswer(request, RefusedLogin(code),
                         params.zor_username == nullptr ? "" : params.zor_username);
  }
  if (!QueueSessionCookie(cgi, session_id)) {
    return NoticeAnswer(Notice::kFailure);
  }
  if (!request.session_id.empty()) {
    TakeOver(request.session_id, session_id);
  }
  return BackToLink(request);
}

}  // namespace visitor
