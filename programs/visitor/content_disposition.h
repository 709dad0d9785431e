// The Content-Disposition header.
#ifndef PROGRAMS_VISITOR_CONTENT_DISPOSITION_H_
#define PROGRAMS_VISITOR_CONTENT_DISPOSITION_H_

#include <string>
#include <string_view>

namespace visitor {

// "attachment" with the file's name twice: in ASCII, with '_' for every other byte, for old
// clients, and percent-encoded UTF-8. Whatever bytes the name holds, the value has visible ASCII
// and blanks only; bytes that are no UTF-8 become U+FFFD in the second form.
std::string AttachmentNamed(std::string_view file_name);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_CONTENT_DISPOSITION_H_
