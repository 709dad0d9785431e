#include "visitor/login.h"

#include <tuvosharing/keys.h>
#include <tuvosharing/login.h>

#include <string>

#include "visitor/events.h"
#include "visitor/page_answers.h"
#include "visitor/session_address.h"
#include "visitor/session_cookie.h"

namespace visitor {

namespace {

constexpr int kSeeOther = 303;

// A login moves the session it goes on with to the address it comes from. Whoever has stolen
// a cookie could so, by opening any link that is open to all, open the owner's other links; from
// another address a login therefore begins a session of its own.
bool MayGoOn(const Request& request) {
  return !request.session_id.empty() && IsSessionOfThisAddress(request.session_id);
}

_tag_sharing_login_params ParamsOf(const Request& request, const TUVOCGI* cgi) {
  _tag_sharing_login_params params{};
  params.sharing_id = request.route.hash.c_str();
  params.password = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_PASSWORD_);
  params.zor_username = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_ZOR_USERNAME);
  params.zor_password = TuvoCgiGetRequestParam(cgi, TUVO::sharing::SZK_ZOR_PASSWORD);
  params.sharing_sid = MayGoOn(request) ? request.session_id.c_str() : nullptr;
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
  const int code = TUVO::TuvoSharingLogin(session_id, &params, false);
  LogLogin(request.route.hash, code);
  if (code != 1) {
    return RefusalAnswer(request, RefusedLogin(code),
                         params.zor_username == nullptr ? "" : params.zor_username);
  }
  if (!QueueSessionCookie(cgi, session_id)) {
    return NoticeAnswer(Notice::kFailure);
  }
  return BackToLink(request);
}

}  // namespace visitor
