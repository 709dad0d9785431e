// What whoever starts a program may have left out of order.
#ifndef PROGRAMS_COMMON_PROCESS_START_H_
#define PROGRAMS_COMMON_PROCESS_START_H_

namespace common {

// To be called before anything else is opened. Fills each of the three standard descriptors that is
// closed: otherwise the connection to the system log, or a file, would get its number, and what the
// program prints would go there. What is filled in can be used no more than a closed one: reading
// from standard input fails, and so does writing to the other two. Also lets children be waited
// for, which nobody can whose parent had SIGCHLD ignored. False when there is nothing to fill a
// descriptor with: the program must then end, and say nothing.
bool StartProcess();

}  // namespace common

#endif  // PROGRAMS_COMMON_PROCESS_START_H_
