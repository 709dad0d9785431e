#include "webapi/text_arguments.h"

#include <optional>

#include "webapi/call.h"

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::MaybeProblem;

MaybeProblem Add(const std::string& name, const std::string& value, Json::Value* request) {
  if (name.empty()) {
    return Fault(Error::kMalformedRequest, "an argument has no name");
  }
  if (request->isMember(name)) {
    return Fault(Error::kMalformedRequest, "an argument comes twice");
  }
  (*request)[name] = value;
  return std::nullopt;
}

MaybeProblem WithoutEquals() {
  return Fault(Error::kMalformedRequest, "an argument has no value: name=value is expected");
}

int DigitOf(char c) {
  if (c >= '0' && c <= '9') {
    return c - '0';
  }
  const char lower = c >= 'A' && c <= 'F' ? static_cast<char>(c - 'A' + 'a') : c;
  return lower >= 'a' && lower <= 'f' ? lower - 'a' + 10 : -1;
}

std::optional<std::string> Decoded(std::string_view text) {
  std::string decoded;
  for (size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      decoded += text[i] == '+' ? ' ' : text[i];
      continue;
    }
    const int high = i + 2 < text.size() ? DigitOf(text[i + 1]) : -1;
    const int low = i + 2 < text.size() ? DigitOf(text[i + 2]) : -1;
    if (high < 0 || low < 0) {
      return std::nullopt;
    }
    decoded += static_cast<char>(high * 16 + low);
    i += 2;
  }
  return decoded;
}

MaybeProblem AddEncoded(std::string_view piece, Json::Value* request) {
  const size_t equals = piece.find('=');
  if (equals == std::string_view::npos) {
    return WithoutEquals();
  }
  const std::optional<std::string> name = Decoded(piece.substr(0, equals));
  const std::optional<std::string> value = Decoded(piece.substr(equals + 1));
  if (!name || !value) {
    return Fault(Error::kMalformedRequest, "the query string is not encoded properly");
  }
  return Add(*name, *value, request);
}

MaybeProblem CheckSize(size_t size) {
  return size <= kLargestRequest ? std::nullopt
                                 : Fault(Error::kTooLarge, "the request is too large");
}

}  // namespace

MaybeProblem ReadTexts(const std::vector<std::string>& texts, Json::Value* request) {
  *request = Json::Value(Json::objectValue);
  size_t size = 0;
  for (const std::string& text : texts) {
    size += text.size();
    if (MaybeProblem problem = CheckSize(size)) {
      return problem;
    }
    const size_t equals = text.find('=');
    if (equals == std::string::npos) {
      return WithoutEquals();
    }
    if (MaybeProblem problem = Add(text.substr(0, equals), text.substr(equals + 1), request)) {
      return problem;
    }
  }
  return std::nullopt;
}

MaybeProblem ReadQuery(std::string_view query, Json::Value* request) {
  *request = Json::Value(Json::objectValue);
  if (MaybeProblem problem = CheckSize(query.size())) {
    return problem;
  }
  while (!query.empty()) {
    const size_t end = query.find('&');
    if (MaybeProblem problem = AddEncoded(query.substr(0, end), request)) {
      return problem;
    }
    if (end == query.size() - 1) {
      return WithoutEquals();  // nothing behind the last "&"
    }
    query.remove_prefix(end == std::string_view::npos ? query.size() : end + 1);
  }
  return std::nullopt;
}

}  // namespace webapi
