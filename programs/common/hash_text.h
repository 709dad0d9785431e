// The texts that name links and sessions, as they come from outside.
#ifndef PROGRAMS_COMMON_HASH_TEXT_H_
#define PROGRAMS_COMMON_HASH_TEXT_H_

#include <string_view>

namespace common {

// Whether `text` can be a link's hash: 3 to 64 ASCII letters, digits, '-' and '_'.
bool IsHashText(std::string_view text);

// Whether `text` can be a session's identifier: 1 to 64 of the same characters.
bool IsSessionIdText(std::string_view text);

}  // namespace common

#endif  // PROGRAMS_COMMON_HASH_TEXT_H_
