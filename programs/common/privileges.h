// The identity that the program runs under.
#ifndef PROGRAMS_COMMON_PRIVILEGES_H_
#define PROGRAMS_COMMON_PRIVILEGES_H_

namespace common {

// Gives up effective root for as long as nobody asks for it: started set-user-id root, the
// effective ids become the real ones, so that whatever a stranger sends is read without privilege;
// the saved ids stay, and the libraries return to them for the moments that need it. Started by
// root itself, where the real ids are no help, the system identity (uid 1, gid 1) is taken. Either
// way the supplementary groups go: a web server that checks passwords through PAM may be in the
// group "shadow", and what a stranger sends must not be read by somebody who can read that file.
// Started as anybody else nothing is changed. False when an id could not be changed (logged): the
// program must then end.
bool DropPrivileges();

// Leaves the caller of a set-user-id root program, real ids included, for the system identity (uid
// 1, gid 1), with root kept as the saved id: whoever has the real uid of a process may stop it with
// a signal, and one that is stopped while it holds the database's lock stops everybody else's
// programs with it. For after DropPrivileges, and after getuid() has been asked. Nothing is changed
// without root as the saved id, and for root, whom nothing can be hidden from. False when an id
// could not be changed (logged): the program must then end.
bool HideFromCaller();

}  // namespace common

#endif  // PROGRAMS_COMMON_PRIVILEGES_H_
