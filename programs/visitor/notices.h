// The program's pages that say something, other than a link's own.
#ifndef PROGRAMS_VISITOR_NOTICES_H_
#define PROGRAMS_VISITOR_NOTICES_H_

#include <string_view>

namespace visitor {

enum class Notice {
  kNotFound,          // no such link, or not a valid one: a stranger is not told which
  kUsedUp,            // as many visitors as allowed have opened the link
  kBlocked,           // the visitor's address is denied
  kFailure,           // something is wrong here
  kBadRequest,        // the request could not be read
  kMethod,            // a method other than GET, HEAD and POST
  kFromElsewhere,     // a form of another site
  kRange,             // the file has no such bytes
  kPrecondition,      // the file is another one than the request demands
  kFileGone,          // the link's file is not there
  kFileNotReadable,   // the link's file cannot be sent
  kMisconfigured,     // the link's settings make no sense
  kOtherApplication,  // admitted; the link is another application's to serve
  kLoggedOut,
  kLogoutFailed,
};

struct NoticeText {
  int status;
  std::string_view heading;
  std::string_view text;
};

// The status and the words of a notice.
const NoticeText& TextOf(Notice notice);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_NOTICES_H_
