#include "owner/moment.h"

#include <array>
#include <charconv>
#include <cstdint>

namespace owner {

namespace {

constexpr int kFirstYear = 1970;
constexpr int kYearBase = 1900;

struct Unit {
  char letter;
  std::int64_t seconds;
};
constexpr std::array<Unit, 5> kUnits = {
    {{'s', 1}, {'m', 60}, {'h', 3600}, {'d', 86400}, {'w', 604800}}};

// Exactly `length` digits from the front of `text`.
bool TakeNumber(std::string_view* text, std::size_t length, int* number) {
  if (text->size() < length) {
    return false;
  }
  *number = 0;
  for (const char c : text->substr(0, length)) {
    if (c < '0' || c > '9') {
      return false;
    }
    *number = *number * 10 + (c - '0');
  }
  text->remove_prefix(length);
  return true;
}

bool TakeOneOf(std::string_view* text, std::string_view characters) {
  if (text->empty() || characters.find(text->front()) == std::string_view::npos) {
    return false;
  }
  text->remove_prefix(1);
  return true;
}

bool TakeDate(std::string_view* text, std::tm* date) {
  if (!TakeNumber(text, 4, &date->tm_year) || !TakeOneOf(text, "-") ||
      !TakeNumber(text, 2, &date->tm_mon) || !TakeOneOf(text, "-") ||
      !TakeNumber(text, 2, &date->tm_mday)) {
    return false;
  }
  if (date->tm_year < kFirstYear) {
    return false;
  }
  date->tm_year -= kYearBase;
  date->tm_mon -= 1;
  return true;
}

// With or without seconds, to the end of `text`.
bool TakeTimeOfDay(std::string_view* text, std::tm* date) {
  if (!TakeOneOf(text, " T") || !TakeNumber(text, 2, &date->tm_hour) || !TakeOneOf(text, ":") ||
      !TakeNumber(text, 2, &date->tm_min)) {
    return false;
  }
  if (!text->empty() && (!TakeOneOf(text, ":") || !TakeNumber(text, 2, &date->tm_sec))) {
    return false;
  }
  return text->empty() && date->tm_hour < 24 && date->tm_min < 60 && date->tm_sec < 60;
}

std::optional<std::time_t> InRange(std::int64_t moment) {
  if (moment <= 0 || moment > kLastMoment) {
    return std::nullopt;
  }
  return static_cast<std::time_t>(moment);
}

std::optional<std::time_t> ParseDate(std::string_view text, DayPart part) {
  std::tm date{};
  if (!TakeDate(&text, &date)) {
    return std::nullopt;
  }
  if (text.empty() && part == DayPart::kLastSecond) {
    date.tm_hour = 23;
    date.tm_min = 59;
    date.tm_sec = 59;
  } else if (!text.empty() && !TakeTimeOfDay(&text, &date)) {
    return std::nullopt;
  }
  date.tm_isdst = -1;
  std::tm normal = date;
  const std::time_t moment = std::mktime(&normal);
  // mktime makes the first of March of a 30th of February.
  if (normal.tm_year != date.tm_year || normal.tm_mon != date.tm_mon ||
      normal.tm_mday != date.tm_mday) {
    return std::nullopt;
  }
  return InRange(moment);
}

std::optional<std::time_t> ParseSpan(std::string_view text, std::time_t now) {
  std::int32_t count = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
  if (error != std::errc() || text.front() == '-' || end != text.data() + text.size() - 1) {
    return std::nullopt;
  }
  for (const Unit& unit : kUnits) {
    if (unit.letter == *end) {
      return InRange(static_cast<std::int64_t>(now) + count * unit.seconds);
    }
  }
  return std::nullopt;
}

}  // namespace

std::optional<std::time_t> ParseMoment(std::string_view text, std::time_t now, DayPart part) {
  if (TakeOneOf(&text, "+")) {
    return text.empty() ? std::nullopt : ParseSpan(text, now);
  }
  return ParseDate(text, part);
}

std::string MomentText(std::time_t moment) {
  std::tm parts{};
  if (moment == 0 || localtime_r(&moment, &parts) == nullptr) {
    return {};
  }
  std::array<char, 64> text{};
  const std::size_t length = std::strftime(text.data(), text.size(), "%Y-%m-%d %H:%M:%S", &parts);
  return {text.data(), length};
}

}  // namespace owner
