// What texts may hold that are stored, shown and logged.
#ifndef PROGRAMS_OWNER_TEXT_CHECK_H_
#define PROGRAMS_OWNER_TEXT_CHECK_H_

#include <string>
#include <string_view>

namespace owner {

// Whether `text` is well-formed UTF-8: no overlong forms, no surrogates, nothing beyond U+10FFFF.
bool IsUtf8(std::string_view text);

// Whether `text` is UTF-8 without control characters (U+0000 to U+001F and U+007F to U+009F).
bool IsPlainText(std::string_view text);

// `text` with each byte that is no part of well-formed UTF-8 replaced by U+FFFD.
std::string RepairedUtf8(std::string_view text);

}  // namespace owner

#endif  // PROGRAMS_OWNER_TEXT_CHECK_H_
