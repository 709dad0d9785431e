#include "cgi_request.h"

#include <cgicc/CgiInput.h>
#include <cgicc/Cgicc.h>

#include <algorithm>
#include <cstring>
#include <new>
#include <stdexcept>

#include "cgi_cookies.h"
#include "cgi_multipart.h"
#include "cgi_text.h"
#include "cgi_urlencoded.h"

namespace tuvo_platform {

namespace {

constexpr std::string_view kUrlEncodedType = "application/x-www-form-urlencoded";
constexpr std::string_view kMultipartType = "multipart/form-data";

// A request's body, rewritten for cgicc; no fields, no text.
struct CleanBody {
  std::string type;
  std::string text;
};

// All that cgicc gets to see: rewritten texts whose sizes were checked. It is never let near the
// real environment or standard input, where it would make room for whatever length the client
// claims and look at headers that this project takes nothing from.
class CleanInput : public cgicc::CgiInput {
 public:
  CleanInput(std::string query, CleanBody body)
      : query_(std::move(query)), body_(std::move(body)), body_left_(body_.text) {}

  size_t read(char* data, size_t length) override {
    const size_t count = std::min(length, body_left_.size());
    std::memcpy(data, body_left_.data(), count);
    body_left_.remove_prefix(count);
    return count;
  }

  std::string getenv(const char* name) override {
    const std::string_view variable(name);
    if (variable == "QUERY_STRING") {
      return query_;
    }
    if (variable == "REQUEST_METHOD") {
      return body_.text.empty() ? "GET" : "POST";
    }
    if (body_.text.empty()) {
      return {};
    }
    if (variable == "CONTENT_TYPE") {
      return body_.type;
    }
    return variable == "CONTENT_LENGTH" ? std::to_string(body_.text.size()) : std::string();
  }

 private:
  const std::string query_;
  const CleanBody body_;
  std::string_view body_left_;
};

std::string_view ValueOf(const EnvironmentLookup& environment, const char* name) {
  return environment(name).value_or(std::string_view());
}

// A plain decimal number of at most `limit`; no text counts as 0, as CGI has it.
std::optional<size_t> ParseLength(std::string_view text, size_t limit) {
  size_t length = 0;
  for (const char c : text) {
    if (c < '0' || c > '9') {
      return std::nullopt;
    }
    length = length * 10 + static_cast<size_t>(c - '0');
    if (length > limit) {
      return std::nullopt;
    }
  }
  return length;
}

// Reads exactly as many bytes as CONTENT_LENGTH says: what may follow them is not the request's.
std::optional<std::string> ReadBody(const EnvironmentLookup& environment,
                                    const BodyReader& read_body, size_t limit) {
  const std::optional<size_t> length = ParseLength(ValueOf(environment, "CONTENT_LENGTH"), limit);
  if (!length) {
    return std::nullopt;
  }
  std::string body(*length, '\0');
  for (size_t done = 0; done < body.size();) {
    const size_t count = read_body(&body[done], body.size() - done);
    if (count == 0) {
      return std::nullopt;
    }
    done += count;
  }
  return body;
}

std::optional<CleanBody> ReadUrlEncoded(const EnvironmentLookup& environment,
                                        const BodyReader& read_body, size_t* fields_left) {
  const std::optional<std::string> body = ReadBody(environment, read_body, kMaxUrlEncodedBody);
  std::optional<std::string> clean;
  if (body) {
    clean = CleanUrlEncoded(*body, fields_left);
  }
  if (!clean) {
    return std::nullopt;
  }
  return CleanBody{std::string(kUrlEncodedType), std::move(*clean)};
}

std::optional<CleanBody> ReadMultipart(const EnvironmentLookup& environment,
                                       const BodyReader& read_body, size_t* fields_left) {
  const std::optional<std::string> boundary =
      MultipartBoundary(ValueOf(environment, "CONTENT_TYPE"));
  if (!boundary) {
    return std::nullopt;
  }
  const std::optional<std::string> body = ReadBody(environment, read_body, kMaxMultipartBody);
  std::optional<std::string> clean;
  if (body) {
    clean = CleanMultipart(*body, *boundary, fields_left);
  }
  if (!clean) {
    return std::nullopt;
  }
  return CleanBody{std::string(kMultipartType) + "; boundary=" + *boundary, std::move(*clean)};
}

std::optional<CleanBody> ReadCleanBody(const EnvironmentLookup& environment,
                                       const BodyReader& read_body, size_t* fields_left) {
  const std::string_view method = ValueOf(environment, "REQUEST_METHOD");
  if (method != "POST" && method != "PUT") {
    return CleanBody{};
  }
  std::string_view content_type = ValueOf(environment, "CONTENT_TYPE");
  const std::string_view type = TrimBlanks(TakeUntil(';', &content_type));
  if (type.empty() || EqualsIgnoringCase(type, kUrlEncodedType)) {
    return ReadUrlEncoded(environment, read_body, fields_left);
  }
  if (EqualsIgnoringCase(type, kMultipartType)) {
    return ReadMultipart(environment, read_body, fields_left);
  }
  return CleanBody{};  // no form: left for the program itself to read
}

std::vector<CgiField> FieldsOf(std::string query, CleanBody body) {
  CleanInput input(std::move(query), std::move(body));
  const cgicc::Cgicc parsed(&input);
  std::vector<CgiField> fields;
  for (const cgicc::FormEntry& entry : parsed.getElements()) {
    fields.emplace_back(entry.getName(), entry.getValue());
  }
  return fields;
}

bool IsHttps(const EnvironmentLookup& environment) {
  const std::string_view https = ValueOf(environment, "HTTPS");
  return https == "1" || EqualsIgnoringCase(https, "on");
}

}  // namespace

std::optional<CgiRequest> ParseCgiRequest(const EnvironmentLookup& environment,
                                          const BodyReader& read_body) {
  if (!environment("REQUEST_METHOD")) {
    return CgiRequest{};
  }
  const std::string_view cookies = ValueOf(environment, "HTTP_COOKIE");
  const std::string_view query = ValueOf(environment, "QUERY_STRING");
  if (cookies.size() > kMaxCookieHeader || HoldsZeroByte(cookies) ||
      query.size() > kMaxQueryString) {
    return std::nullopt;
  }
  size_t fields_left = kMaxFields;
  std::optional<std::string> clean_query = CleanUrlEncoded(query, &fields_left);
  if (!clean_query) {
    return std::nullopt;
  }
  std::optional<CleanBody> body = ReadCleanBody(environment, read_body, &fields_left);
  if (!body) {
    return std::nullopt;
  }
  CgiRequest request;
  try {
    request.fields = FieldsOf(std::move(*clean_query), std::move(*body));
  } catch (const std::bad_alloc&) {
    throw;
  } catch (const std::exception&) {  // cgicc's way to say that it cannot read this
    return std::nullopt;
  }
  request.cookies = ParseCookies(cookies);
  request.https = IsHttps(environment);
  return request;
}

const char* FindCgiField(const std::vector<CgiField>& fields, std::string_view name) {
  const auto found = std::find_if(fields.begin(), fields.end(),
                                  [name](const CgiField& field) { return field.first == name; });
  return found == fields.end() ? nullptr : found->second.c_str();
}

}  // namespace tuvo_platform
