// The person at the terminal.
#ifndef PROGRAMS_CLI_TERMINAL_H_
#define PROGRAMS_CLI_TERMINAL_H_

#include <cstddef>
#include <string>

namespace cli {

// The columns of the terminal behind `fd`; 0 when there is none.
std::size_t TerminalWidth(int fd);

// Whether there is somebody to ask: standard input and standard error are a terminal.
bool CanAsk();

// Shows `question` on standard error and reads a line from standard input; true for "y" and "yes".
// Precondition: CanAsk().
bool Confirm(const std::string& question);

// Reads a password, twice, without showing it. Throws Failure when there is nobody to ask, and when
// the two differ.
std::string AskPassword();

}  // namespace cli

#endif  // PROGRAMS_CLI_TERMINAL_H_
