// What a visitor's browser was admitted to before a login.
#ifndef PROGRAMS_VISITOR_FORMER_SESSION_H_
#define PROGRAMS_VISITOR_FORMER_SESSION_H_

#include <string>

namespace visitor {

// Lets the session `session_id`, which a login has just begun, go on with what the former session
// was admitted to, and with its account unless the login has brought one; ends the former session.
// Does nothing unless the former session is in force and its last login came from the address that
// this request comes from. A failure is logged: its visitor has to open his other links again.
void TakeOver(const std::string& former_id, const std::string& session_id);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_FORMER_SESSION_H_
