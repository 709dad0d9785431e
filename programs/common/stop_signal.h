// The signal that asks a long-lived program to end.
#ifndef PROGRAMS_COMMON_STOP_SIGNAL_H_
#define PROGRAMS_COMMON_STOP_SIGNAL_H_

namespace common {

// From now on SIGTERM lets the request that is being served come to its end, and no other begin: it
// takes the socket `listening` away from under this process and puts nothing in its place, so that
// the accept that waits, or is just about to, fails. No system call of a running request is cut
// short. May be called once. Throws std::system_error.
void EndByStopSignal(int listening);

// Whether the signal came.
bool StopSignalCame();

}  // namespace common

#endif  // PROGRAMS_COMMON_STOP_SIGNAL_H_
