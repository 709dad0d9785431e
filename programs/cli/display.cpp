#include "cli/display.h"

#include <array>
#include <cstdint>
#include <cstdio>
#include <cwchar>

#include "owner/text_check.h"

namespace cli {

namespace {

constexpr const char* kEllipsis = "\xE2\x80\xA6";

struct Range {
  std::uint32_t first;
  std::uint32_t last;
};
// Controls, separators of lines and paragraphs, and all format characters (Cf) of Unicode 15, which
// are there to steer how others are shown; with the places kept for more of them.
constexpr std::array<Range, 21> kUnshown = {
    {{0x00, 0x1F},       {0x7F, 0x9F},       {0xAD, 0xAD},       {0x600, 0x605},
     {0x61C, 0x61C},     {0x6DD, 0x6DD},     {0x70F, 0x70F},     {0x890, 0x891},
     {0x8E2, 0x8E2},     {0x180E, 0x180E},   {0x200B, 0x200F},   {0x2028, 0x202E},
     {0x2060, 0x206F},   {0xFEFF, 0xFEFF},   {0xFFF9, 0xFFFB},   {0x110BD, 0x110BD},
     {0x110CD, 0x110CD}, {0x13430, 0x1343F}, {0x1BCA0, 0x1BCA3}, {0x1D173, 0x1D17A},
     {0xE0000, 0xE0FFF}}};

bool IsUnshown(std::uint32_t character) {
  for (const Range& range : kUnshown) {
    if (character >= range.first && character <= range.last) {
      return true;
    }
  }
  return false;
}

std::size_t LengthOf(char lead) {
  const auto byte = static_cast<unsigned char>(lead);
  return byte < 0x80U ? 1 : byte < 0xE0U ? 2 : byte < 0xF0U ? 3 : 4;
}

// The first character of well-formed UTF-8; the bytes it takes go to `*bytes`.
std::uint32_t FrontOf(std::string_view text, std::string_view* bytes) {
  constexpr std::array<unsigned int, 5> kLeadBits = {0, 0x7FU, 0x1FU, 0x0FU, 0x07U};
  constexpr unsigned int kContinuationBits = 6;
  *bytes = text.substr(0, LengthOf(text.front()));
  std::uint32_t character = static_cast<unsigned char>(text.front()) & kLeadBits[bytes->size()];
  for (const char byte : bytes->substr(1)) {
    character = (character << kContinuationBits) | (static_cast<unsigned char>(byte) & 0x3FU);
  }
  return character;
}

// Calls `take(character, bytes)` for each character until that answers false.
template <typename Take>
void ForEach(std::string_view text, Take take) {
  while (!text.empty()) {
    std::string_view bytes;
    const std::uint32_t character = FrontOf(text, &bytes);
    if (!take(character, bytes)) {
      return;
    }
    text.remove_prefix(bytes.size());
  }
}

std::string Escaped(std::uint32_t character) {
  if (character == '\n') {
    return "\\n";
  }
  if (character == '\t') {
    return "\\t";
  }
  std::array<char, 16> text{};
  (void)std::snprintf(text.data(), text.size(), character < 0x100 ? "\\x%02x" : "\\u%04x",
                      character);
  return text.data();
}

// JSON has four digits, and pairs of surrogates beyond.
std::string JsonEscaped(std::uint32_t character) {
  constexpr std::uint32_t kFirstBeyond = 0x10000;
  constexpr std::uint32_t kHighSurrogates = 0xD800;
  constexpr std::uint32_t kLowSurrogates = 0xDC00;
  constexpr std::uint32_t kHalfBits = 10;
  std::array<char, 16> text{};
  if (character < kFirstBeyond) {
    (void)std::snprintf(text.data(), text.size(), "\\u%04x", character);
  } else {
    const std::uint32_t rest = character - kFirstBeyond;
    (void)std::snprintf(text.data(), text.size(), "\\u%04x\\u%04x",
                        kHighSurrogates + (rest >> kHalfBits), kLowSurrogates + (rest & 0x3FFU));
  }
  return text.data();
}

// What the terminal is not known to show takes one column, as its replacement would.
std::size_t WidthOf(std::uint32_t character) {
  const int width = wcwidth(static_cast<wchar_t>(character));
  return width < 0 ? 1 : static_cast<std::size_t>(width);
}

}  // namespace

std::string Harmless(std::string_view text) {
  std::string shown;
  ForEach(owner::RepairedUtf8(text), [&shown](std::uint32_t character, std::string_view bytes) {
    shown += IsUnshown(character) ? Escaped(character) : std::string(bytes);
    return true;
  });
  return shown;
}

// Within JSON these characters stand in strings alone, where an escape means the same.
std::string HarmlessJson(const std::string& json) {
  std::string shown;
  ForEach(owner::RepairedUtf8(json), [&shown](std::uint32_t character, std::string_view bytes) {
    shown += IsUnshown(character) ? JsonEscaped(character) : std::string(bytes);
    return true;
  });
  return shown;
}

std::size_t DisplayWidth(std::string_view text) {
  std::size_t width = 0;
  ForEach(text, [&width](std::uint32_t character, std::string_view /*bytes*/) {
    width += WidthOf(character);
    return true;
  });
  return width;
}

std::string Cut(const std::string& text, std::size_t width) {
  if (DisplayWidth(text) <= width) {
    return text;
  }
  std::string kept;
  std::size_t used = 1;  // the ellipsis
  ForEach(text, [&](std::uint32_t character, std::string_view bytes) {
    used += WidthOf(character);
    if (used > width) {
      return false;
    }
    kept += bytes;
    return true;
  });
  return kept + kEllipsis;
}

}  // namespace cli
