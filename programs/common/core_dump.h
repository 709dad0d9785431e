// What the system would keep of this process's memory, or show of it.
#ifndef PROGRAMS_COMMON_CORE_DUMP_H_
#define PROGRAMS_COMMON_CORE_DUMP_H_

namespace common {

// No core from now on, neither a file nor one for the program that the system hands cores to, and
// no look into the memory for other processes of the same account: passwords and sessions'
// identifiers are in it. The first is by a limit, which stays for good and for children. The
// second, "not dumpable", the system decides anew at every change of the effective ids, to what
// /proc/sys/fs/suid_dumpable says (0 by default: closed all the same). So this is for after
// DropPrivileges. A build with the address sanitizer stays open, to its leak check.
void ForbidCore();

}  // namespace common

#endif  // PROGRAMS_COMMON_CORE_DUMP_H_
