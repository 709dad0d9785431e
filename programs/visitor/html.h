// Text in HTML.
#ifndef PROGRAMS_VISITOR_HTML_H_
#define PROGRAMS_VISITOR_HTML_H_

#include <string>
#include <string_view>

namespace visitor {

// `text` as it stands in an element or between the double quotes of an attribute: the five
// characters that mean something there as character references, control characters as blanks.
std::string HtmlEscape(std::string_view text);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_HTML_H_
