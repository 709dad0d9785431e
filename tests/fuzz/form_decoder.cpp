#include "form_decoder.h"

#include <cctype>
#include <cstdlib>
#include <optional>

namespace fuzz {

namespace {

std::optional<std::string> Decode(std::string_view text) {
  std::string decoded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    char c = text[i] == '+' ? ' ' : text[i];
    if (c == '%') {
      const std::string digits(text.substr(i + 1, 2));
      if (digits.size() != 2 || std::isxdigit(static_cast<unsigned char>(digits[0])) == 0 ||
          std::isxdigit(static_cast<unsigned char>(digits[1])) == 0) {
        return std::nullopt;
      }
      c = static_cast<char>(std::strtol(digits.c_str(), nullptr, 16));
      i += 2;
    }
    if (c == '\0') {
      return std::nullopt;
    }
    decoded.push_back(c);
  }
  return decoded;
}

}  // namespace

bool DecodeForm(std::string_view text, std::vector<Field>* fields) {
  while (!text.empty()) {
    const std::size_t end = text.find('&');
    const std::string_view piece = text.substr(0, end);
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    if (piece.empty()) {
      continue;
    }
    const std::size_t equals = piece.find('=');
    const std::optional<std::string> name = Decode(piece.substr(0, equals));
    const std::optional<std::string> value =
        Decode(equals == std::string_view::npos ? std::string_view() : piece.substr(equals + 1));
    if (!name || !value) {
      return false;
    }
    fields->emplace_back(*name, *value);
  }
  return true;
}

}  // namespace fuzz
