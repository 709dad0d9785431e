// Small helpers for the texts of a CGI request.
#ifndef PLATFORM_SRC_CGI_TEXT_H_
#define PLATFORM_SRC_CGI_TEXT_H_

#include <string_view>

namespace tuvo_platform {

// Returns what precedes the first `separator` in `*rest` and leaves in `*rest` what follows it; all
// of it and nothing, when there is no separator.
std::string_view TakeUntil(char separator, std::string_view* rest);

// `text` without spaces and tabs at its ends.
std::string_view TrimBlanks(std::string_view text);

// Compares with ASCII letters of either case taken as equal.
bool EqualsIgnoringCase(std::string_view a, std::string_view b);

// Whether a zero byte is in `text`: C callers would see it cut short there.
bool HoldsZeroByte(std::string_view text);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CGI_TEXT_H_
