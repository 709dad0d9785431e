#include "common/redirect_target.h"

#include <algorithm>

namespace common {

namespace {

bool IsControl(char c) {
  return static_cast<unsigned char>(c) < ' ' || c == '\x7f';
}

// Compared without regard to case, as schemes are.
bool StartsWith(std::string_view text, std::string_view lower_start) {
  return text.size() >= lower_start.size() &&
         std::equal(lower_start.begin(), lower_start.end(), text.begin(), [](char a, char b) {
           return a == (b >= 'A' && b <= 'Z' ? static_cast<char>(b - 'A' + 'a') : b);
         });
}

// Whether the host's part, up to the path, has anything in it.
bool HasHost(std::string_view after_scheme) {
  const std::string_view authority = after_scheme.substr(0, after_scheme.find_first_of("/?#"));
  const size_t at = authority.rfind('@');
  const std::string_view host = at == std::string_view::npos ? authority : authority.substr(at + 1);
  return !host.empty() && host.front() != ':';
}

// A colon before the path, query and fragment would end a scheme.
bool HasScheme(std::string_view uri) {
  const size_t mark = uri.find_first_of(":/?#");
  return mark != std::string_view::npos && uri[mark] == ':';
}

bool IsAllowed(std::string_view uri) {
  if (uri.empty() || std::any_of(uri.begin(), uri.end(), IsControl) ||
      uri.find('\\') != std::string_view::npos) {
    return false;
  }
  for (const std::string_view scheme : {"http://", "https://"}) {
    if (StartsWith(uri, scheme)) {
      return HasHost(uri.substr(scheme.size()));
    }
  }
  return !HasScheme(uri) && !StartsWith(uri, "//");
}

// Percent signs stay: the address may be encoded already.
std::string Encoded(std::string_view uri) {
  constexpr const char* kDigits = "0123456789ABCDEF";
  constexpr std::string_view kUnsafe = "\"<>^`{|}";
  std::string out;
  for (const char c : uri) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte > ' ' && byte < 0x7f && kUnsafe.find(c) == std::string_view::npos) {
      out += c;
    } else {
      out += '%';
      out += kDigits[byte >> 4];
      out += kDigits[byte & 15];
    }
  }
  return out;
}

}  // namespace

std::optional<std::string> RedirectTarget(std::string_view uri) {
  if (!IsAllowed(uri)) {
    return std::nullopt;
  }
  return Encoded(uri);
}

bool NamesHost(std::string_view uri) {
  return StartsWith(uri, "http://") || StartsWith(uri, "https://");
}

}  // namespace common
