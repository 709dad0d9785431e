// Dates as HTTP writes them.
#ifndef PROGRAMS_VISITOR_HTTP_DATE_H_
#define PROGRAMS_VISITOR_HTTP_DATE_H_

#include <ctime>
#include <optional>
#include <string>

namespace visitor {

// "Sun, 06 Nov 1994 08:49:37 GMT"; empty when the time has no such form.
std::string HttpDate(std::time_t time);

// Reads that form and the two obsolete ones that must still be understood; nothing when `text` is
// neither.
std::optional<std::time_t> ParseHttpDate(const std::string& text);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_HTTP_DATE_H_
