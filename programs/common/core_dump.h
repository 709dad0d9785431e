// What the system would keep of this process's memory, or show of it.
#ifndef PROGRAMS_COMMON_CORE_DUMP_H_
#define PROGRAMS_COMMON_CORE_DUMP_H_

namespace common {

// No core file from now on, neither by a limit nor by a program that the system hands cores to, and
// no look into the memory for other processes of the same account: passwords and sessions'
// identifiers are in it. For after DropPrivileges: with a change of ids the system decides anew
// about the second. A build with the address sanitizer stays open, to its leak check.
void ForbidCore();

}  // namespace common

#endif  // PROGRAMS_COMMON_CORE_DUMP_H_
