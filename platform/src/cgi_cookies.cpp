#include "cgi_cookies.h"

#include <string>

#include "cgi_text.h"

namespace tuvo_platform {

namespace {

std::string_view WithoutQuotes(std::string_view value) {
  if (value.size() >= 2 && value.front() == '"' && value.back() == '"') {
    return value.substr(1, value.size() - 2);
  }
  return value;
}

}  // namespace

std::vector<CgiField> ParseCookies(std::string_view header) {
  std::vector<CgiField> cookies;
  while (!header.empty()) {
    std::string_view value = TakeUntil(';', &header);
    const bool has_value = value.find('=') != std::string_view::npos;
    const std::string_view name = TrimBlanks(TakeUntil('=', &value));
    if (has_value && !name.empty()) {
      cookies.emplace_back(std::string(name), std::string(WithoutQuotes(TrimBlanks(value))));
    }
  }
  return cookies;
}

}  // namespace tuvo_platform
