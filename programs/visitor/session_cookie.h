// The visitor's cookie.
#ifndef PROGRAMS_VISITOR_SESSION_COOKIE_H_
#define PROGRAMS_VISITOR_SESSION_COOKIE_H_

#include <tuvoplatform/cgi.h>

#include <optional>
#include <string>

namespace visitor {

// Queues the cookie that carries the session's identifier, for the program's own paths; it lasts as
// long as the browser runs, the session ends by itself. False when it cannot be queued.
bool QueueSessionCookie(TUVOCGI* cgi, const std::string& session_id);

// That cookie's header line, with its end, and no other queued cookie's: the library queues one
// ("id") of whatever a stranger puts into the parameter "_sid". Nothing when memory ran out.
std::optional<std::string> SessionCookieLine(TUVOCGI* cgi);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SESSION_COOKIE_H_
