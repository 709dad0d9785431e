// What the system would show of this process.
#ifndef PROGRAMS_CLI_SECRECY_H_
#define PROGRAMS_CLI_SECRECY_H_

namespace cli {

// Overwrites the words of the command line, which everybody on the machine can read in /proc for as
// long as the process lives: the hash of a link opens it.
void WipeArguments(int argc, char** argv);

}  // namespace cli

#endif  // PROGRAMS_CLI_SECRECY_H_
