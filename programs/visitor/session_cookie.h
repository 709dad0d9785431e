// The visitor's cookie.
#ifndef PROGRAMS_VISITOR_SESSION_COOKIE_H_
#define PROGRAMS_VISITOR_SESSION_COOKIE_H_

#include <tuvoplatform/cgi.h>

#include <cstdio>
#include <string>

namespace visitor {

// Queues the cookie that carries the session's identifier, for the program's own paths; it lasts as
// long as the browser runs, the session ends by itself. False when it cannot be queued.
bool QueueSessionCookie(TUVOCGI* cgi, const std::string& session_id);

// Writes that cookie's header line and no other queued cookie's: the library queues one ("id") of
// whatever a stranger puts into the parameter "_sid". False on a write error.
bool WriteSessionCookie(TUVOCGI* cgi, std::FILE* out);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SESSION_COOKIE_H_
