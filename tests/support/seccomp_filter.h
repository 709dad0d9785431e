// Makes chosen system calls of this process fail, or end it: the way to see what the library does
// when the system refuses something that it never refuses root.
#ifndef TESTS_SUPPORT_SECCOMP_FILTER_H_
#define TESTS_SUPPORT_SECCOMP_FILTER_H_

#include <linux/audit.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <sys/prctl.h>
#include <sys/syscall.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <vector>

#include "support/child.h"

namespace tuvo_test {

#ifdef __NR_setresuid32
constexpr long kSetresuid = __NR_setresuid32;
constexpr long kSetresgid = __NR_setresgid32;
#else
constexpr long kSetresuid = __NR_setresuid;
constexpr long kSetresgid = __NR_setresgid;
#endif
#ifdef __NR_chmod
constexpr long kChmod = __NR_chmod;
#else
constexpr long kChmod = __NR_fchmodat;
#endif
constexpr long kGetrandom = __NR_getrandom;

// Every call that changes an id, or the groups, of a process. 32-bit x86 has each of them twice:
// for ids of 16 bits and of 32.
constexpr long kIdChanges[] = {
    __NR_setuid,      __NR_setgid,      __NR_setreuid,   __NR_setregid,   __NR_setresuid,
    __NR_setresgid,   __NR_setgroups,   __NR_setfsuid,   __NR_setfsgid,
#ifdef __NR_setresuid32
    __NR_setuid32,    __NR_setgid32,    __NR_setreuid32, __NR_setregid32, __NR_setresuid32,
    __NR_setresgid32, __NR_setgroups32, __NR_setfsuid32, __NR_setfsgid32,
#endif
};

// The kind of system calls that this program makes; call numbers mean nothing without it.
#if defined(__x86_64__)
constexpr std::uint32_t kCallKind = AUDIT_ARCH_X86_64;
#elif defined(__i386__)
constexpr std::uint32_t kCallKind = AUDIT_ARCH_I386;
#elif defined(__aarch64__)
constexpr std::uint32_t kCallKind = AUDIT_ARCH_AARCH64;
#else
#error "which AUDIT_ARCH_ is this machine's?"
#endif

constexpr int kAnyArgument = -1;
constexpr int kKill = -1;

// One refused call: by number and, when `argument` is given, by the low 32 bits of that argument.
struct Refusal {
  long call;
  int error;  // what the call fails with; kKill ends the process with SIGSYS
  int argument = kAnyArgument;
  std::uint32_t value = 0;
};

// Refuses these calls from now on; there is no way back, so use it in a child. False when this
// system has no such filters.
inline bool RefuseCalls(const std::vector<Refusal>& refusals) {
  std::vector<sock_filter> program;
  const auto load = [&](std::size_t offset) {
    program.push_back(BPF_STMT(BPF_LD | BPF_W | BPF_ABS, static_cast<std::uint32_t>(offset)));
  };
  const auto skip_unless = [&](std::uint32_t value, std::uint8_t count) {
    program.push_back(BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, value, 0, count));
  };
  // Calls of another kind, which only a program for another machine could make, have other numbers.
  load(offsetof(seccomp_data, arch));
  program.push_back(BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, kCallKind, 1, 0));
  program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_KILL_PROCESS));
  for (const Refusal& refusal : refusals) {
    const bool any = refusal.argument == kAnyArgument;
    load(offsetof(seccomp_data, nr));
    skip_unless(static_cast<std::uint32_t>(refusal.call), any ? 1 : 3);
    if (!any) {
      // The low half of the argument on a little-endian machine.
      load(offsetof(seccomp_data, args) +
           sizeof(std::uint64_t) * static_cast<std::size_t>(refusal.argument));
      skip_unless(refusal.value, 1);
    }
    const std::uint32_t answer =
        refusal.error == kKill
            ? SECCOMP_RET_KILL_PROCESS
            : SECCOMP_RET_ERRNO | (static_cast<std::uint32_t>(refusal.error) & SECCOMP_RET_DATA);
    program.push_back(BPF_STMT(BPF_RET | BPF_K, answer));
  }
  program.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
  sock_fprog filter{};
  filter.len = static_cast<unsigned short>(program.size());
  filter.filter = program.data();
  const int error = errno;
  const bool installed = prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
                         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &filter, 0, 0) == 0;
  errno = error;
  return installed;
}

// From now on every call that changes an id ends this process, with SIGSYS.
inline bool EndAtIdChanges() {
  std::vector<Refusal> refusals;
  for (const long call : kIdChanges) {
    refusals.push_back({call, kKill});
  }
  return RefuseCalls(refusals);
}

// Whether RefuseCalls works on this system; asked in a child.
inline bool CanRefuseCalls() {
  static const bool can = RunInChild([] {
                            return RefuseCalls({{kGetrandom, EPERM}}) ? 0 : 1;
                          }) == 0;
  return can;
}

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_SECCOMP_FILTER_H_
