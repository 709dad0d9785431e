// A whole request, as a web server hands it over: environment and body.
//
// Input: REQUEST_METHOD ("-": not set), CONTENT_TYPE, CONTENT_LENGTH ("=": the body's true length),
// QUERY_STRING, HTTP_COOKIE, HTTPS, how many bytes the body gives at a time; then the body.
#include "cgi_request.h"

#include <algorithm>
#include <map>
#include <optional>
#include <string>
#include <string_view>

#include "cgi_cookies.h"
#include "cgi_text.h"
#include "form_decoder.h"
#include "lines.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using tuvo_platform::CgiField;
using tuvo_platform::CgiRequest;

struct Given {
  std::map<std::string, std::string> environment;
  std::string_view body;
  std::size_t chunk = 1;
  std::size_t taken = 0;
};

Given ReadInput(fuzz::Lines lines) {
  Given given;
  for (const char* name : {"REQUEST_METHOD", "CONTENT_TYPE", "CONTENT_LENGTH", "QUERY_STRING",
                           "HTTP_COOKIE", "HTTPS"}) {
    std::string value = lines.Text();
    if (value != "-") {
      given.environment[name] = std::move(value);
    }
  }
  given.chunk = lines.Choice(4096) + 1;
  given.body = lines.Rest();
  if (given.environment["CONTENT_LENGTH"] == "=") {
    given.environment["CONTENT_LENGTH"] = std::to_string(given.body.size());
  }
  return given;
}

std::optional<CgiRequest> Parse(Given* given) {
  given->taken = 0;
  return tuvo_platform::ParseCgiRequest(
      [given](const char* name) -> std::optional<std::string_view> {
        const auto found = given->environment.find(name);
        if (found == given->environment.end()) {
          return std::nullopt;
        }
        return found->second;
      },
      [given](char* data, std::size_t length) {
        Require(length <= tuvo_platform::kMaxMultipartBody, "no more room than a body may take");
        const std::size_t count =
            std::min({length, given->chunk, given->body.size() - given->taken});
        std::copy_n(given->body.data() + given->taken, count, data);
        given->taken += count;
        return count;
      });
}

std::string Shown(const std::vector<CgiField>& fields) {
  std::string text;
  for (const CgiField& field : fields) {
    text += std::to_string(field.first.size()) + ":" + field.first + "=" +
            std::to_string(field.second.size()) + ":" + field.second + "\n";
  }
  return text;
}

bool HoldsZero(const std::vector<CgiField>& fields) {
  return std::any_of(fields.begin(), fields.end(), [](const CgiField& field) {
    return field.first.find('\0') != std::string::npos ||
           field.second.find('\0') != std::string::npos;
  });
}

// Callers see C texts: FindCgiField has to give the first field of the name, whole.
void CheckFinding(const std::vector<CgiField>& fields) {
  for (const CgiField& field : fields) {
    const auto first = std::find_if(fields.begin(), fields.end(), [&field](const CgiField& other) {
      return other.first == field.first;
    });
    const char* found = tuvo_platform::FindCgiField(fields, field.first);
    Require(found != nullptr, "a field that is there is found");
    RequireEqual(found, first->second, "the first field of a name counts");
  }
}

// The limits and texts of a form's fields that the second opinion reads alike. Nothing: the request
// has to be refused.
std::optional<std::vector<CgiField>> Expected(const Given& given, bool has_body) {
  std::vector<CgiField> fields;
  const std::string& query = given.environment.at("QUERY_STRING");
  if (has_body && !fuzz::DecodeForm(given.body.substr(0, given.taken), &fields)) {
    return std::nullopt;
  }
  if (!fuzz::DecodeForm(query, &fields) || fields.size() > tuvo_platform::kMaxFields) {
    return std::nullopt;
  }
  return fields;
}

bool IsUrlEncoded(std::string_view content_type) {
  const std::string_view type =
      tuvo_platform::TrimBlanks(content_type.substr(0, content_type.find(';')));
  return type.empty() ||
         tuvo_platform::EqualsIgnoringCase(type, "application/x-www-form-urlencoded");
}

void Check(Given* given, const std::optional<CgiRequest>& request) {
  std::map<std::string, std::string>& environment = given->environment;
  const std::string& method = environment["REQUEST_METHOD"];
  const bool may_have_body = method == "POST" || method == "PUT";
  Require(may_have_body || given->taken == 0, "only POST and PUT have a body");
  if (!request) {
    return;
  }
  Require(request->fields.size() <= tuvo_platform::kMaxFields, "no more fields than the limit");
  Require(!HoldsZero(request->fields) && !HoldsZero(request->cookies), "no zero bytes in texts");
  Require(environment["QUERY_STRING"].size() <= tuvo_platform::kMaxQueryString &&
              environment["HTTP_COOKIE"].size() <= tuvo_platform::kMaxCookieHeader,
          "texts over their limits are refused");
  CheckFinding(request->fields);
  CheckFinding(request->cookies);
  const bool url_encoded = may_have_body && IsUrlEncoded(environment["CONTENT_TYPE"]);
  if (may_have_body && !url_encoded && given->taken != 0) {
    return;  // of the target "multipart"
  }
  const auto expected = Expected(*given, url_encoded);
  Require(expected.has_value(), "what the form's definition refuses is refused");
  RequireEqual(Shown(request->fields), Shown(*expected), "the fields");
}

// The reverse: a form that its definition admits is taken.
void CheckRefusal(const Given& given) {
  const std::map<std::string, std::string>& environment = given.environment;
  const std::string& method = environment.at("REQUEST_METHOD");
  const std::string& query = environment.at("QUERY_STRING");
  const std::string& cookies = environment.at("HTTP_COOKIE");
  if (method == "POST" || method == "PUT" || query.size() > tuvo_platform::kMaxQueryString ||
      cookies.size() > tuvo_platform::kMaxCookieHeader || cookies.find('\0') != std::string::npos) {
    return;
  }
  Require(!Expected(given, false), "a request that is in order is not refused");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Given given = ReadInput(fuzz::Lines(data, size));
  const bool is_request = given.environment.count("REQUEST_METHOD") != 0;
  const std::optional<CgiRequest> request = Parse(&given);
  if (!is_request) {
    Require(request && request->fields.empty() && request->cookies.empty() && given.taken == 0,
            "without a web server the request is empty");
    return 0;
  }
  given.environment.try_emplace("QUERY_STRING");
  given.environment.try_emplace("HTTP_COOKIE");
  Check(&given, request);
  if (!request) {
    CheckRefusal(given);
  }
  const std::string shown = request ? Shown(request->fields) + Shown(request->cookies) : "refused";
  given.chunk = given.body.size() + 1;
  const std::optional<CgiRequest> at_once = Parse(&given);
  RequireEqual(at_once ? Shown(at_once->fields) + Shown(at_once->cookies) : "refused", shown,
               "the body's pieces make no difference");
  return 0;
}
