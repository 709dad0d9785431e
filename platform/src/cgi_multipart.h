// A multipart/form-data body, made fit for cgicc.
#ifndef PLATFORM_SRC_CGI_MULTIPART_H_
#define PLATFORM_SRC_CGI_MULTIPART_H_

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

namespace tuvo_platform {

// The boundary that the content type "multipart/form-data; boundary=..." names, without its
// quotes; nothing when it names none that is well-formed (1 to 70 characters, RFC 2046) and has
// another character than dashes.
std::optional<std::string> MultipartBoundary(std::string_view content_type);

// Rewrites a body so that cgicc cannot misread it. cgicc looks for the boundary anywhere, also
// inside a value; takes the first `name="` of a part's headers, also that of `filename="`; throws
// on a part without headers and reads past the body's structure when its beginning or its end is
// missing. So the body is taken apart here by its exact rules, and written anew with one plain
// header for each field. Parts that carry a file name are left out. Takes one from `*fields_left`
// for each part, files included. The empty text means a body without fields.
// Nothing when the body is malformed, when there is a zero byte in a part's headers or in a field's
// value, or when there are more than `*fields_left` parts.
std::optional<std::string> CleanMultipart(std::string_view body, const std::string& boundary,
                                          size_t* fields_left);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CGI_MULTIPART_H_
