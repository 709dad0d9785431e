#include "auto_block_config.h"

#include <charconv>
#include <fstream>
#include <string_view>

namespace tuvo_platform {

namespace {

std::string_view Trim(std::string_view text) {
  constexpr std::string_view kBlanks = " \t\r";
  const size_t begin = text.find_first_not_of(kBlanks);
  if (begin == std::string_view::npos) {
    return {};
  }
  return text.substr(begin, text.find_last_not_of(kBlanks) - begin + 1);
}

int64_t PositiveOr(int64_t fallback, std::string_view text) {
  int32_t value = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, value);
  return error == std::errc() && stop == end && value > 0 ? value : fallback;
}

void ReadLine(std::string_view line, AutoBlockLimits* limits) {
  constexpr AutoBlockLimits kDefaults;
  line = line.substr(0, line.find('#'));
  const size_t equals = line.find('=');
  if (equals == std::string_view::npos) {
    return;
  }
  const std::string_view name = Trim(line.substr(0, equals));
  const std::string_view value = Trim(line.substr(equals + 1));
  if (name == "failures") {
    limits->failures = PositiveOr(kDefaults.failures, value);
  } else if (name == "window_seconds") {
    limits->window_seconds = PositiveOr(kDefaults.window_seconds, value);
  } else if (name == "block_seconds") {
    limits->block_seconds = PositiveOr(kDefaults.block_seconds, value);
  }
}

}  // namespace

AutoBlockLimits ReadAutoBlockLimits(const std::string& path) {
  AutoBlockLimits limits;
  std::ifstream file(path);
  for (std::string line; std::getline(file, line);) {
    ReadLine(line, &limits);
  }
  return limits;
}

}  // namespace tuvo_platform
