// The media type of a file, by its name.
#ifndef PROGRAMS_VISITOR_CONTENT_TYPE_H_
#define PROGRAMS_VISITOR_CONTENT_TYPE_H_

#include <istream>
#include <string>
#include <string_view>

namespace visitor {

// The type of a file of that name, from a list in the format of /etc/mime.types (a type, then the
// extensions it is used for; '#' starts a comment): by the last extension, in whatever case.
// "application/octet-stream" when the list has none.
std::string ContentTypeOf(std::string_view file_name, std::istream& list);

// The same from /etc/mime.types itself.
std::string ContentTypeOf(std::string_view file_name);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_CONTENT_TYPE_H_
