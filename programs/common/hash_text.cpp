#include "common/hash_text.h"

#include <algorithm>

namespace common {

namespace {

constexpr size_t kMinHash = 3;
constexpr size_t kMaxText = 64;

bool IsUrlFriendly(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_';
}

bool IsUrlFriendlyText(std::string_view text, size_t min) {
  return text.size() >= min && text.size() <= kMaxText &&
         std::all_of(text.begin(), text.end(), IsUrlFriendly);
}

}  // namespace

bool IsHashText(std::string_view text) {
  return IsUrlFriendlyText(text, kMinHash);
}

bool IsSessionIdText(std::string_view text) {
  return IsUrlFriendlyText(text, 1);
}

}  // namespace common
