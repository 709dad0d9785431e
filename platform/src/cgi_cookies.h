// The Cookie header of a request.
#ifndef PLATFORM_SRC_CGI_COOKIES_H_
#define PLATFORM_SRC_CGI_COOKIES_H_

#include <string_view>
#include <vector>

#include "cgi_request.h"

namespace tuvo_platform {

// The cookies of a Cookie header in their order (RFC 6265): ';' separates them, the first '=' ends
// the name, blanks around both are trimmed, double quotes around the value taken off, and nothing
// is decoded. Pieces without '=' or without a name are passed over.
std::vector<CgiField> ParseCookies(std::string_view header);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CGI_COOKIES_H_
