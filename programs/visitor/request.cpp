#include "visitor/request.h"

#include <tuvosharing/keys.h>

#include <cstdlib>

#include "common/hash_text.h"

namespace visitor {

namespace {

std::string Variable(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? "" : value;
}

Method MethodOf(const std::string& name) {
  if (name == "GET") {
    return Method::kGet;
  }
  if (name == "HEAD") {
    return Method::kHead;
  }
  return name == "POST" ? Method::kPost : Method::kOther;
}

// Only checked text reaches the library: what cannot be an identifier of ours is none.
std::string SessionIdOf(TUVOCGI* cgi) {
  if (TuvoCgiLoadInCookies(cgi) != 1) {
    return {};
  }
  const char* value = TuvoCgiGetCookie(cgi, TUVO::sharing::SZK_SHARING_SID);
  return value != nullptr && common::IsSessionIdText(value) ? value : "";
}

// Browsers say so themselves (over HTTPS); other programs say nothing.
bool IsFromElsewhere(const std::string& fetch_site) {
  return fetch_site == "cross-site" || fetch_site == "same-site";
}

}  // namespace

Request ReadRequest(TUVOCGI* cgi) {
  Request request;
  request.method = MethodOf(Variable("REQUEST_METHOD"));
  request.route = ParseRoute(Variable("PATH_INFO"));
  request.session_id = SessionIdOf(cgi);
  request.asks_redirect =
      TuvoCgiGetRequestParam(cgi, std::string(kRedirectParameter).c_str()) != nullptr;
  request.from_elsewhere = IsFromElsewhere(Variable("HTTP_SEC_FETCH_SITE"));
  request.range = Variable("HTTP_RANGE");
  request.conditions.if_match = Variable("HTTP_IF_MATCH");
  request.conditions.if_unmodified_since = Variable("HTTP_IF_UNMODIFIED_SINCE");
  request.conditions.if_none_match = Variable("HTTP_IF_NONE_MATCH");
  request.conditions.if_modified_since = Variable("HTTP_IF_MODIFIED_SINCE");
  request.conditions.if_range = Variable("HTTP_IF_RANGE");
  return request;
}

}  // namespace visitor
