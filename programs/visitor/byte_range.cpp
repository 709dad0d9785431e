#include "visitor/byte_range.h"

#include <algorithm>
#include <limits>
#include <optional>

namespace visitor {

namespace {

constexpr std::int64_t kMaxPosition = std::numeric_limits<std::int64_t>::max();

char ToLower(char c) {
  return c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
}

// Takes the unit and the equals sign away; false when the unit is another.
bool TakeBytesUnit(std::string_view* header) {
  constexpr std::string_view kUnit = "bytes=";
  if (header->size() < kUnit.size() ||
      !std::equal(kUnit.begin(), kUnit.end(), header->begin(),
                  [](char unit, char given) { return unit == ToLower(given); })) {
    return false;
  }
  header->remove_prefix(kUnit.size());
  return true;
}

std::string_view TrimBlanks(std::string_view text) {
  constexpr std::string_view kBlanks = " \t";
  const size_t first = text.find_first_not_of(kBlanks);
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(kBlanks) - first + 1);
}

// Only digits; a number that is too large counts as the largest, which is beyond any file's end.
std::optional<std::int64_t> ParsePosition(std::string_view text) {
  if (text.empty()) {
    return std::nullopt;
  }
  std::int64_t position = 0;
  for (const char c : text) {
    if (c < '0' || c > '9') {
      return std::nullopt;
    }
    const int digit = c - '0';
    position = position > (kMaxPosition - digit) / 10 ? kMaxPosition : position * 10 + digit;
  }
  return position;
}

// "-500": the last 500 bytes.
RangeRequest Suffix(std::int64_t count, std::int64_t size) {
  const std::int64_t length = std::min(count, size);
  if (length == 0) {
    return {RangeRequest::kUnsatisfiable, 0, 0};
  }
  return {RangeRequest::kPart, size - length, length};
}

}  // namespace

RangeRequest ParseRange(std::string_view header, std::int64_t size) {
  header = TrimBlanks(header);
  if (!TakeBytesUnit(&header)) {
    return {};
  }
  header = TrimBlanks(header);
  const size_t dash = header.find('-');
  if (dash == std::string_view::npos) {
    return {};
  }
  const std::string_view first_text = header.substr(0, dash);
  const std::string_view last_text = header.substr(dash + 1);
  const std::optional<std::int64_t> last = ParsePosition(last_text);
  if (first_text.empty()) {
    return last ? Suffix(*last, size) : RangeRequest{};
  }
  const std::optional<std::int64_t> first = ParsePosition(first_text);
  if (!first || (!last && !last_text.empty()) || (last && *last < *first)) {
    return {};
  }
  if (*first >= size) {
    return {RangeRequest::kUnsatisfiable, 0, 0};
  }
  const std::int64_t end = last ? std::min(*last, size - 1) : size - 1;
  return {RangeRequest::kPart, *first, end - *first + 1};
}

}  // namespace visitor
