// Signals that end the command where it can take back what it has begun.
#ifndef PROGRAMS_CLI_INTERRUPT_H_
#define PROGRAMS_CLI_INTERRUPT_H_

#include <exception>

namespace cli {

// From now on the first SIGINT, SIGQUIT, SIGTERM or SIGHUP (one that is ignored stays so) is noted,
// and system calls that wait are ended by it; the second one ends the process. SIGXFSZ, which says
// that a file became too large, is ignored: writing then fails, and what was begun is taken back.
void NoteSignals();

// The signal that came; 0 when none did.
int NotedSignal();

class Interruption : public std::exception {};

// Throws Interruption when a signal came.
void StopIfInterrupted();

// Waits until `fd` can be read, or is at its end, or broken. Throws Interruption when a signal
// came: one that comes right before the waiting is not missed either.
void WaitForInput(int fd);

// The same until a pipe takes PIPE_BUF bytes and anything else some; where that is so already, a
// signal that came before does no harm.
void WaitForOutput(int fd);

// Ends the process by that signal, as it would have ended without NoteSignals.
[[noreturn]] void EndBySignal(int signal);

}  // namespace cli

#endif  // PROGRAMS_CLI_INTERRUPT_H_
