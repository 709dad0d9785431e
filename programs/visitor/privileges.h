// The identity that the program runs under.
#ifndef PROGRAMS_VISITOR_PRIVILEGES_H_
#define PROGRAMS_VISITOR_PRIVILEGES_H_

namespace visitor {

// Gives up effective root for as long as nobody asks for it: started set-user-id root, the
// effective ids become the real ones, so that whatever a stranger sends is read without privilege;
// the saved ids stay, and the libraries return to them for the moments that need it. Started by
// root itself, where the real ids are no help, the system identity (uid 1, gid 1) is taken.
// Started as anybody else nothing is changed. False when an id could not be changed (logged): the
// program must then end.
bool DropPrivileges();

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_PRIVILEGES_H_
