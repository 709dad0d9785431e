// Requests that come over HTTP.
#ifndef PROGRAMS_WEBAPI_HTTP_REQUEST_H_
#define PROGRAMS_WEBAPI_HTTP_REQUEST_H_

#include <array>
#include <string_view>

#include "common/exchange.h"
#include "owner/problem.h"
#include "webapi/call.h"

namespace webapi {

// What is read of a request's variables, by this program and by the libraries.
constexpr std::array<std::string_view, 11> kRequestVariables = {
    "REQUEST_METHOD",     "QUERY_STRING", "CONTENT_TYPE", "CONTENT_LENGTH", "REMOTE_ADDR",
    "REMOTE_USER",        "HTTPS",        "SERVER_PORT",  "HTTP_HOST",      "HTTP_ORIGIN",
    "HTTP_SEC_FETCH_SITE"};

// The HTTP methods that only read, and POST.
enum class HttpMethod { kGet, kHead, kPost, kOther };

HttpMethod RequestMethod();

// Makes a call of the request whose variables are in the environment: of the query string of a GET
// or HEAD, of the body of a POST. The body is read only when it is declared as JSON and not too
// large. The account is the one that the web server authenticated, if the system knows it; no
// header that the client sends has a say in that.
owner::MaybeProblem ReadHttpCall(common::Exchange& exchange, Call* call);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_HTTP_REQUEST_H_
