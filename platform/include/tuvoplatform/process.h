// Child processes with a pipe, started from an argument vector and never through a shell.
#ifndef TUVOPLATFORM_PROCESS_H_
#define TUVOPLATFORM_PROCESS_H_

#include <stdio.h>
#include <tuvoplatform/export.h>

#ifdef __cplusplus
extern "C" {
#endif

// Starts the program at `path` with the arguments that follow `mode`, ended by a null pointer; the
// child's argument 0 is `path` itself. Mode "r": the stream reads the child's standard output, its
// standard input is /dev/null; mode "w": the stream writes the child's standard input. No other
// descriptor of this process that is marked close-on-exec reaches the child, the pipe's own end
// among them; a standard descriptor that would be closed in the child is /dev/null there instead.
// The child keeps the environment and the ids, real and effective; it starts with no signal blocked
// and with SIGPIPE at its default.
// Returns a stream for TLIBCPclose alone, null with errno set when the program could not be started
// (a missing program included) or the mode is another. Reads and writes through the stream that a
// signal interrupts are taken up again; it has no descriptor for fileno.
TUVOPLATFORM_API FILE* TLIBCPopen(const char* path, const char* mode, ...)
    __attribute__((sentinel));

// The same with a vector that ends in a null pointer and whose element 0 is the child's argument 0.
TUVOPLATFORM_API FILE* TLIBCPopenv(const char* path, const char* mode, const char* const argv[]);

// Closes the stream, waits for the child (interruptions are retried) and returns its status as
// waitpid reports it; -1 for a stream that none of the two functions above returned (it is left
// alone), or when the system kept no status (SIGCHLD is ignored, or somebody else waited).
TUVOPLATFORM_API int TLIBCPclose(FILE* stream);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_PROCESS_H_
