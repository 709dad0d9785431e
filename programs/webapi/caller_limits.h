// What whoever runs a command may have prepared for it.
#ifndef PROGRAMS_WEBAPI_CALLER_LIMITS_H_
#define PROGRAMS_WEBAPI_CALLER_LIMITS_H_

namespace webapi {

// Closes the descriptors that the caller left open behind the standard ones, and takes as many as
// the caller's hard limit allows. False (logged as far as that is possible) when they are too few
// for a change and the line in the system log that belongs to it.
bool TakeDescriptors();

// The keys and the reads and writes of a terminal that stop a program do not stop this one: stopped
// in the middle of a change, it would hold everybody else up.
void IgnoreTerminalStops();

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_CALLER_LIMITS_H_
