#include "cgi_urlencoded.h"

#include "cgi_text.h"

namespace tuvo_platform {

namespace {

constexpr std::string_view kHexDigits = "0123456789abcdefABCDEF";

bool HasOnlyGoodEscapes(std::string_view text) {
  for (size_t at = text.find('%'); at != std::string_view::npos; at = text.find('%', at + 1)) {
    const std::string_view digits = text.substr(at + 1, 2);
    if (digits.size() != 2 || digits == "00" ||
        digits.find_first_not_of(kHexDigits) != std::string_view::npos) {
      return false;
    }
  }
  return true;
}

void AppendField(std::string_view field, std::string* out) {
  if (!out->empty()) {
    out->push_back('&');
  }
  for (const char c : field) {
    if (c == ';') {
      out->append("%3B");
    } else {
      out->push_back(c);
    }
  }
  if (field.find('=') == std::string_view::npos) {
    out->push_back('=');
  }
}

}  // namespace

std::optional<std::string> CleanUrlEncoded(std::string_view text, size_t* fields_left) {
  if (HoldsZeroByte(text) || !HasOnlyGoodEscapes(text)) {
    return std::nullopt;
  }
  std::string out;
  while (!text.empty()) {
    const std::string_view field = TakeUntil('&', &text);
    if (field.empty()) {
      continue;
    }
    if (*fields_left == 0) {
      return std::nullopt;
    }
    --*fields_left;
    AppendField(field, &out);
  }
  return out;
}

}  // namespace tuvo_platform
