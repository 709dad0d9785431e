// The words of the command line.
#ifndef PROGRAMS_COMMON_ARGUMENTS_H_
#define PROGRAMS_COMMON_ARGUMENTS_H_

namespace common {

// Overwrites the words of the command line, which everybody on the machine can read in /proc for as
// long as the process lives: the hash of a link opens it, and a password is one.
void WipeArguments(int argc, char** argv);

}  // namespace common

#endif  // PROGRAMS_COMMON_ARGUMENTS_H_
