// Where a visitor's session comes from.
#ifndef PROGRAMS_VISITOR_SESSION_ADDRESS_H_
#define PROGRAMS_VISITOR_SESSION_ADDRESS_H_

#include <string>

namespace visitor {

// Whether the session exists and its last login came from the address that this request comes from.
bool IsSessionOfThisAddress(const std::string& session_id);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SESSION_ADDRESS_H_
