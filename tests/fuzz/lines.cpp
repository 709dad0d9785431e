#include "lines.h"

#include <charconv>

namespace fuzz {

namespace {

int DigitOf(char c) {
  if (c >= '0' && c <= '9') {
    return c - '0';
  }
  return c >= 'a' && c <= 'f' ? c - 'a' + 10 : -1;
}

// Takes the escape that `*text` begins with, behind its backslash, and returns its byte; the
// backslash itself, with nothing taken, for what is no escape.
char TakeEscape(std::string_view* text) {
  constexpr std::string_view kLetters = "nrt\\";
  constexpr std::string_view kBytes = "\n\r\t\\";
  const char first = text->empty() ? '\0' : text->front();
  const std::size_t letter = kLetters.find(first);
  if (letter != std::string_view::npos) {
    text->remove_prefix(1);
    return kBytes[letter];
  }
  const int high = first == 'x' && text->size() >= 3 ? DigitOf((*text)[1]) : -1;
  const int low = high >= 0 ? DigitOf((*text)[2]) : -1;
  if (low < 0) {
    return '\\';
  }
  text->remove_prefix(3);
  return static_cast<char>(high * 16 + low);
}

}  // namespace

Lines::Lines(const std::uint8_t* data, std::size_t size)
    : rest_(reinterpret_cast<const char*>(data), size) {}

std::string_view Lines::Raw() {
  const std::size_t end = rest_.find('\n');
  const std::string_view line = rest_.substr(0, end);
  rest_.remove_prefix(end == std::string_view::npos ? rest_.size() : end + 1);
  return line;
}

std::string Lines::Text() {
  std::string_view line = Raw();
  std::string text;
  while (!line.empty()) {
    const char c = line.front();
    line.remove_prefix(1);
    text.push_back(c == '\\' ? TakeEscape(&line) : c);
  }
  return text;
}

std::int64_t Lines::Number() {
  const std::string_view line = Raw();
  std::int64_t number = 0;
  const auto [end, error] = std::from_chars(line.data(), line.data() + line.size(), number);
  return error == std::errc() && end == line.data() + line.size() ? number : 0;
}

std::size_t Lines::Choice(std::size_t count) {
  return static_cast<std::size_t>(static_cast<std::uint64_t>(Number()) % count);
}

std::string_view Lines::Rest() {
  const std::string_view rest = rest_;
  rest_ = {};
  return rest;
}

}  // namespace fuzz
