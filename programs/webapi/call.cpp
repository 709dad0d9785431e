#include "webapi/call.h"

#include <algorithm>
#include <charconv>
#include <utility>

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::MaybeProblem;

constexpr const char* kApi = "api";
constexpr const char* kVersion = "version";
constexpr const char* kMethod = "method";

constexpr int kNoVersion = -1;  // stands for every number that no version has

bool IsDecimal(const std::string& text) {
  const size_t sign = text.compare(0, 1, "-") == 0 ? 1 : 0;
  return text.size() > sign && std::all_of(text.begin() + static_cast<std::ptrdiff_t>(sign),
                                           text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

bool ReadVersionText(const std::string& text, int* version) {
  if (!IsDecimal(text)) {
    return false;
  }
  int number = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
  *version = error == std::errc() ? number : kNoVersion;
  return true;
}

// A version is a whole number: 1.0 is none, as the arguments' integers have it.
bool ReadVersion(const Json::Value& value, bool texts, int* version) {
  if (texts) {
    return value.isString() && ReadVersionText(value.asString(), version);
  }
  if (value.type() != Json::intValue && value.type() != Json::uintValue) {
    return false;
  }
  *version = value.isInt() ? value.asInt() : kNoVersion;
  return true;
}

}  // namespace

MaybeProblem ReadCall(Json::Value request, bool texts, Call* call) {
  if (!request.isObject()) {
    return Fault(Error::kMalformedRequest, "the request must be an object");
  }
  if (!request[kApi].isString()) {
    return Fault(Error::kMalformedRequest, "must be the name of an API", kApi);
  }
  if (!ReadVersion(request[kVersion], texts, &call->version)) {
    return Fault(Error::kMalformedRequest, "must be a number", kVersion);
  }
  if (!request[kMethod].isString()) {
    return Fault(Error::kMalformedRequest, "must be the name of a method", kMethod);
  }
  call->api = request[kApi].asString();
  call->method = request[kMethod].asString();
  for (const char* name : {kApi, kVersion, kMethod}) {
    request.removeMember(name);
  }
  call->arguments = std::move(request);
  call->texts = texts;
  return std::nullopt;
}

}  // namespace webapi
