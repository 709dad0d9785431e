#include "owner/text_check.h"

#include <cstddef>
#include <cstdint>
#include <optional>

namespace owner {

namespace {

constexpr std::uint32_t kContinuationBits = 6;
constexpr std::uint32_t kLastCharacter = 0x10FFFF;
constexpr std::uint32_t kFirstSurrogate = 0xD800;
constexpr std::uint32_t kLastSurrogate = 0xDFFF;

struct Lead {
  std::size_t length;  // cppcheck-suppress unusedStructMember  ; read through an optional
  std::uint32_t bits;
  std::uint32_t smallest;  // what a shorter form could not have said
};

std::optional<Lead> LeadOf(unsigned char byte) {
  if (byte < 0x80U) {
    return Lead{1, byte, 0};
  }
  if ((byte & 0xE0U) == 0xC0U) {
    return Lead{2, byte & 0x1FU, 0x80};
  }
  if ((byte & 0xF0U) == 0xE0U) {
    return Lead{3, byte & 0x0FU, 0x800};
  }
  if ((byte & 0xF8U) == 0xF0U) {
    return Lead{4, byte & 0x07U, 0x10000};
  }
  return std::nullopt;
}

// Takes one character from the front of `text`; nothing when there is no well-formed one.
std::optional<std::uint32_t> TakeCharacter(std::string_view* text) {
  const std::optional<Lead> lead = LeadOf(static_cast<unsigned char>(text->front()));
  if (!lead || text->size() < lead->length) {
    return std::nullopt;
  }
  std::uint32_t character = lead->bits;
  for (std::size_t i = 1; i < lead->length; ++i) {
    const auto byte = static_cast<unsigned char>((*text)[i]);
    if ((byte & 0xC0U) != 0x80U) {
      return std::nullopt;
    }
    character = (character << kContinuationBits) | (byte & 0x3FU);
  }
  if (character < lead->smallest || character > kLastCharacter ||
      (character >= kFirstSurrogate && character <= kLastSurrogate)) {
    return std::nullopt;
  }
  text->remove_prefix(lead->length);
  return character;
}

bool IsControl(std::uint32_t character) {
  return character < 0x20 || (character >= 0x7F && character < 0xA0);
}

}  // namespace

bool IsUtf8(std::string_view text) {
  while (!text.empty()) {
    if (!TakeCharacter(&text)) {
      return false;
    }
  }
  return true;
}

bool IsPlainText(std::string_view text) {
  while (!text.empty()) {
    const std::optional<std::uint32_t> character = TakeCharacter(&text);
    if (!character || IsControl(*character)) {
      return false;
    }
  }
  return true;
}

std::string RepairedUtf8(std::string_view text) {
  std::string repaired;
  while (!text.empty()) {
    const std::string_view before = text;
    if (TakeCharacter(&text)) {
      repaired.append(before.substr(0, before.size() - text.size()));
    } else {
      repaired.append("\xEF\xBF\xBD");
      text.remove_prefix(1);
    }
  }
  return repaired;
}

}  // namespace owner
