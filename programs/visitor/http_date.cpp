#include "visitor/http_date.h"

#include <array>

namespace visitor {

namespace {

// The program never sets a locale, so that the names of days and months are the English ones.
constexpr const char* kFixedDate = "%a, %d %b %Y %H:%M:%S GMT";
constexpr const char* kLongDayDate = "%A, %d-%b-%y %H:%M:%S GMT";
constexpr const char* kCtimeDate = "%a %b %e %H:%M:%S %Y";

std::optional<std::time_t> Parse(const std::string& text, const char* format) {
  std::tm time{};
  const char* end = strptime(text.c_str(), format, &time);
  if (end == nullptr || end != text.c_str() + text.size()) {
    return std::nullopt;
  }
  return timegm(&time);
}

}  // namespace

std::string HttpDate(std::time_t time) {
  std::tm parts{};
  std::array<char, 64> text{};
  if (gmtime_r(&time, &parts) == nullptr ||
      strftime(text.data(), text.size(), kFixedDate, &parts) == 0) {
    return {};
  }
  return text.data();
}

std::optional<std::time_t> ParseHttpDate(const std::string& text) {
  for (const char* format : {kFixedDate, kLongDayDate, kCtimeDate}) {
    if (const std::optional<std::time_t> time = Parse(text, format)) {
      return time;
    }
  }
  return std::nullopt;
}

}  // namespace visitor
