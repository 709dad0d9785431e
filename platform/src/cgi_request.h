// One CGI request, parsed.
#ifndef PLATFORM_SRC_CGI_REQUEST_H_
#define PLATFORM_SRC_CGI_REQUEST_H_

#include <cstddef>
#include <functional>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace tuvo_platform {

// What is accepted of one request. A request over a limit is refused before the part in question
// is copied or read.
constexpr size_t kMaxUrlEncodedBody = size_t{64} * 1024;
constexpr size_t kMaxMultipartBody = size_t{1024} * 1024;
constexpr size_t kMaxQueryString = size_t{16} * 1024;
constexpr size_t kMaxCookieHeader = size_t{16} * 1024;
constexpr size_t kMaxFields = 256;  // of body and query string together, files included

// A name and its value.
using CgiField = std::pair<std::string, std::string>;

struct CgiRequest {
  std::vector<CgiField> fields;   // the body's, then the query string's, each in their order
  std::vector<CgiField> cookies;  // in their order
  bool https = false;
};

// The value of an environment variable, nothing when it is not set. The text stays the provider's.
using EnvironmentLookup = std::function<std::optional<std::string_view>(const char* name)>;

// Stores up to `length` further bytes of the request's body and returns how many; 0 at its end and
// on an error.
using BodyReader = std::function<size_t(char* data, size_t length)>;

// Parses the request. Only POST and PUT have a body, and only one of the two form types is read
// (no type counts as url-encoded); exactly CONTENT_LENGTH bytes are then taken from `read_body`.
// Without REQUEST_METHOD there is no web server, and the request is an empty one.
// Nothing when the request is over a limit or malformed. May throw std::bad_alloc.
std::optional<CgiRequest> ParseCgiRequest(const EnvironmentLookup& environment,
                                          const BodyReader& read_body);

// The value of the first of `fields` that has exactly this name; null when there is none.
const char* FindCgiField(const std::vector<CgiField>& fields, std::string_view name);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CGI_REQUEST_H_
