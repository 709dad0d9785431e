#include "webapi/http_answer.h"

namespace webapi {

namespace {

constexpr int kMethodNotAllowed = 405;
constexpr int kServiceUnavailable = 503;

std::string_view ReasonOf(int status) {
  switch (status) {
    case 200:
      return "OK";
    case 400:
      return "Bad Request";
    case 401:
      return "Unauthorized";
    case 403:
      return "Forbidden";
    case 404:
      return "Not Found";
    case kMethodNotAllowed:
      return "Method Not Allowed";
    case 409:
      return "Conflict";
    case 413:
      return "Content Too Large";
    case 415:
      return "Unsupported Media Type";
    case kServiceUnavailable:
      return "Service Unavailable";
    default:
      return "Internal Server Error";
  }
}

constexpr std::string_view kEveryAnswer =
    "Content-Type: application/json\r\n"
    "Cache-Control: no-store\r\n"
    "X-Content-Type-Options: nosniff\r\n"
    "Cross-Origin-Resource-Policy: same-origin\r\n"
    "Content-Security-Policy: default-src 'none'; frame-ancestors 'none'\r\n"
    "Referrer-Policy: no-referrer\r\n"
    "X-Robots-Tag: noindex\r\n";

}  // namespace

std::string HeadOf(int status, HttpMethod method, size_t length) {
  std::string head = "Status: " + std::to_string(status) + " ";
  head.append(ReasonOf(status)).append("\r\n");
  head.append("Content-Length: ").append(std::to_string(length)).append("\r\n");
  head.append(kEveryAnswer);
  if (status == kMethodNotAllowed) {
    head.append(method == HttpMethod::kOther ? "Allow: GET, HEAD, POST\r\n" : "Allow: POST\r\n");
  }
  if (status == kServiceUnavailable) {
    head.append("Retry-After: 1\r\n");
  }
  return head.append("\r\n");
}

}  // namespace webapi
