#include "visitor/content_disposition.h"

namespace visitor {

namespace {

constexpr std::string_view kReplacement = "\xEF\xBF\xBD";  // U+FFFD

bool IsAlphaNumeric(unsigned char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

// What may stand for itself in the encoded form.
bool IsPlain(unsigned char c) {
  constexpr std::string_view kMarks = "!#$&+-.^_`|~";
  return IsAlphaNumeric(c) || kMarks.find(static_cast<char>(c)) != std::string_view::npos;
}

void AppendEncoded(std::string_view bytes, std::string* out) {
  constexpr const char* kDigits = "0123456789ABCDEF";
  for (const char c : bytes) {
    const auto byte = static_cast<unsigned char>(c);
    if (IsPlain(byte)) {
      *out += c;
    } else {
      *out += '%';
      *out += kDigits[byte >> 4];
      *out += kDigits[byte & 15];
    }
  }
}

bool IsContinuation(char c) {
  return (static_cast<unsigned char>(c) & 0xC0) == 0x80;
}

// What the lead byte promises: the sequence's length, and the range of the second byte that keeps
// overlong forms, surrogates and values beyond Unicode out.
struct Sequence {
  size_t length = 0;
  unsigned char low = 0x80;
  unsigned char high = 0xBF;
};

Sequence SequenceOf(unsigned char lead) {
  if (lead < 0x80) {
    return {1};
  }
  if (lead >= 0xC2 && lead <= 0xDF) {
    return {2};
  }
  if (lead >= 0xE0 && lead <= 0xEF) {
    const unsigned char low = lead == 0xE0 ? 0xA0 : 0x80;
    const unsigned char high = lead == 0xED ? 0x9F : 0xBF;
    return {3, low, high};
  }
  if (lead >= 0xF0 && lead <= 0xF4) {
    const unsigned char low = lead == 0xF0 ? 0x90 : 0x80;
    const unsigned char high = lead == 0xF4 ? 0x8F : 0xBF;
    return {4, low, high};
  }
  return {};
}

// The length of the UTF-8 sequence that `text` begins with, 0 when it begins with none.
size_t SequenceLength(std::string_view text) {
  const Sequence sequence = SequenceOf(static_cast<unsigned char>(text.front()));
  if (sequence.length == 0 || text.size() < sequence.length) {
    return 0;
  }
  for (size_t at = 1; at < sequence.length; ++at) {
    const auto byte = static_cast<unsigned char>(text[at]);
    if (!IsContinuation(text[at]) || (at == 1 && (byte < sequence.low || byte > sequence.high))) {
      return 0;
    }
  }
  return sequence.length;
}

std::string Utf8Form(std::string_view name) {
  std::string out;
  while (!name.empty()) {
    const size_t length = SequenceLength(name);
    AppendEncoded(length == 0 ? kReplacement : name.substr(0, length), &out);
    name.remove_prefix(length == 0 ? 1 : length);
  }
  return out;
}

// Quotes and backslashes could end or bend the quoted text; a percent sign is decoded by some
// clients although it should not be.
std::string AsciiForm(std::string_view name) {
  constexpr std::string_view kTroublesome = "\"\\%";
  std::string out;
  for (const char c : name) {
    const bool plain = c >= ' ' && c < '\x7f' && kTroublesome.find(c) == std::string_view::npos;
    out += plain ? c : '_';
  }
  return out;
}

}  // namespace

std::string AttachmentNamed(std::string_view file_name) {
  return "attachment; filename=\"" + AsciiForm(file_name) + "\"; filename*=UTF-8''" +
         Utf8Form(file_name);
}

}  // namespace visitor
