// What whoever runs a command may have prepared for it.
#ifndef PROGRAMS_WEBAPI_CALLER_LIMITS_H_
#define PROGRAMS_WEBAPI_CALLER_LIMITS_H_

namespace webapi {

// Closes the descriptors that the caller left open behind the standard ones, and takes as many as
// the caller's hard limit allows. False (logged as far as that is possible) when they are too few
// for a change and the line in the system log that belongs to it.
bool TakeDescriptors();

// Signals and timers that the caller has in hand do not stop or end this program, and neither does
// what a terminal sends: stopped in the middle of a change, it would hold everybody else up, and
// ended behind one, leave no line of it in the log. What it starts is ended by them as usual.
void OutliveCallersSignals();

// Takes back the caller's limits of time and size, as far as the process may: with the effective
// user root all of them.
void LiftLimits();

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_CALLER_LIMITS_H_
