// The process environment of a program that may be installed set-user-id.
#ifndef PROGRAMS_VISITOR_ENVIRONMENT_H_
#define PROGRAMS_VISITOR_ENVIRONMENT_H_

namespace visitor {

// Empties the environment but for the variables that describe the request and that something here
// reads: a local user who starts the program by hand must not steer the libraries' time zone,
// temporary folders and the like while they run as somebody else.
// Of a POST the query string goes as well: what is typed into a form travels in the body, and a
// password in an address, where logs and histories keep it, is not taken.
// Call before the request is parsed. False when memory ran out.
bool KeepOnlyRequestVariables();

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_ENVIRONMENT_H_
