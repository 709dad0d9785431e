#include "webapi/http_request.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstdlib>
#include <optional>
#include <string>

#include "common/client_address.h"
#include "owner/argument.h"
#include "webapi/same_origin.h"
#include "webapi/text_arguments.h"

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::MaybeProblem;

std::optional<std::string> Variable(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::nullopt : std::optional<std::string>(value);
}

std::string Text(const char* name) {
  return Variable(name).value_or("");
}

// Digits alone, to the text's end.
std::optional<std::int64_t> Number(const std::string& text) {
  std::int64_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end || number < 0) {
    return std::nullopt;
  }
  return number;
}

// The way web servers tell: absent, empty, "off" or "on".
bool IsHttps() {
  const std::string https = Text("HTTPS");
  return !https.empty() && https != "off";
}

// What stands behind the type, a character set for example, says nothing about JSON.
bool IsDeclaredAsJson() {
  std::string type = Text("CONTENT_TYPE");
  type.erase(std::min(type.find(';'), type.size()));
  type.erase(type.find_last_not_of(" \t") + 1);
  constexpr std::string_view kJson = "application/json";
  return type.size() == kJson.size() &&
         std::equal(kJson.begin(), kJson.end(), type.begin(), [](char expected, char c) {
           return (c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c) == expected;
         });
}

MaybeProblem ReadBody(common::Exchange& exchange, size_t length, std::string* body) {
  body->resize(length);
  for (size_t done = 0; done < length;) {
    const size_t count = exchange.Read(body->data() + done, length - done);
    if (count == 0) {
      return Fault(Error::kMalformedRequest, "the body is shorter than announced");
    }
    done += count;
  }
  return std::nullopt;
}

MaybeProblem ReadJsonBody(common::Exchange& exchange, Json::Value* request) {
  if (!IsDeclaredAsJson()) {
    return Fault(Error::kNeedsJson, "the body must be declared as application/json");
  }
  const std::string announced = Text("CONTENT_LENGTH");
  const std::optional<std::int64_t> length = Number(announced);
  if (!length && announced.find_first_not_of("0123456789") != std::string::npos) {
    return Fault(Error::kMalformedRequest, "the body's length cannot be read");
  }
  if (announced.empty()) {
    return Fault(Error::kMalformedRequest, "the body's length is not announced");
  }
  // A number that is too large to be one is a length that is too large.
  if (!length || *length > static_cast<std::int64_t>(kLargestRequest)) {
    return Fault(Error::kTooLarge, "the request is too large");
  }
  std::string body;
  if (MaybeProblem problem = ReadBody(exchange, static_cast<size_t>(*length), &body)) {
    return problem;
  }
  return owner::ReadJson(body, request)
             ? std::nullopt
             : Fault(Error::kMalformedRequest, "the body is not JSON as it is expected");
}

MaybeProblem ReadRequest(common::Exchange& exchange, Json::Value* request, Call* call) {
  switch (RequestMethod()) {
    case HttpMethod::kPost:
      return ReadJsonBody(exchange, request);
    case HttpMethod::kGet:
    case HttpMethod::kHead:
      call->may_change = false;
      return ReadQuery(Text("QUERY_STRING"), request);
    case HttpMethod::kOther:
      break;
  }
  return Fault(Error::kNeedsPost, "only GET, HEAD and POST are understood");
}

void ReadCircumstances(Call* call) {
  call->place.https = IsHttps();
  const std::int64_t port = Number(Text("SERVER_PORT")).value_or(0);
  call->place.port = port <= UINT16_MAX ? static_cast<int>(port) : 0;
  call->same_origin = IsSameOrigin({Variable("HTTP_SEC_FETCH_SITE"), Variable("HTTP_ORIGIN"),
                                    Text("HTTP_HOST"), call->place.https});
  call->address = common::ClientAddress();
  const std::string user = Text("REMOTE_USER");
  if (!user.empty()) {
    call->account = owner::AccountOfName(user);
  }
}

}  // namespace

HttpMethod RequestMethod() {
  const std::string method = Text("REQUEST_METHOD");
  if (method == "GET") {
    return HttpMethod::kGet;
  }
  if (method == "HEAD") {
    return HttpMethod::kHead;
  }
  return method == "POST" ? HttpMethod::kPost : HttpMethod::kOther;
}

MaybeProblem ReadHttpCall(common::Exchange& exchange, Call* call) {
  Json::Value request;
  if (MaybeProblem problem = ReadRequest(exchange, &request, call)) {
    return problem;
  }
  const bool texts = RequestMethod() != HttpMethod::kPost;
  if (MaybeProblem problem = ReadCall(std::move(request), texts, call)) {
    return problem;
  }
  ReadCircumstances(call);
  return std::nullopt;
}

}  // namespace webapi
