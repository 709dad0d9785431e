// Url-encoded fields (a query string, or a form's body), made fit for cgicc.
#ifndef PLATFORM_SRC_CGI_URLENCODED_H_
#define PLATFORM_SRC_CGI_URLENCODED_H_

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace tuvo_platform {

// Rewrites `text` so that cgicc reads from it what browsers mean by it: only '&' separates fields
// (cgicc would end a value at ';'), and a field without '=' has the empty value (cgicc would lose
// the last such field). Takes one from `*fields_left` for each field.
// Nothing when a '%' does not begin an escape of two hexadecimal digits, when there is a zero byte,
// escaped or not, or when there are more than `*fields_left` fields.
std::optional<std::string> CleanUrlEncoded(std::string_view text, size_t* fields_left);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CGI_URLENCODED_H_
