#include "common/privileges.h"

#include <grp.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace common {

namespace {

constexpr uid_t kRootUid = 0;
constexpr gid_t kRootGid = 0;
constexpr uid_t kSystemUid = 1;
constexpr gid_t kSystemGid = 1;
constexpr auto kSameUid = static_cast<uid_t>(-1);
constexpr auto kSameGid = static_cast<gid_t>(-1);

bool Failed(int line, const char* what) {
  syslog(LOG_AUTH | LOG_CRIT, "privileges:%d %s failed: %s", line, what, std::strerror(errno));
  return false;
}

// The group first: only root may change it. The outcome is looked at, too.
bool TakeEffectiveIds(uid_t uid, gid_t gid) {
  if (setresgid(kSameGid, gid, kSameGid) != 0 || getegid() != gid) {
    return Failed(__LINE__, "setresgid");
  }
  if (setresuid(kSameUid, uid, kSameUid) != 0 || geteuid() != uid) {
    return Failed(__LINE__, "setresuid");
  }
  return true;
}

bool HasSystemIdsAndSavedRoot() {
  uid_t real = 0;
  uid_t effective = 0;
  uid_t saved = 0;
  return getresuid(&real, &effective, &saved) == 0 && real == kSystemUid &&
         effective == kSystemUid && saved == kRootUid && getgid() == kSystemGid &&
         getegid() == kSystemGid;
}

}  // namespace

bool DropPrivileges() {
  // The caller's mask must not decide who may read what the libraries create.
  umask(S_IRWXG | S_IRWXO);
  if (geteuid() != kRootUid) {
    // Set-group-id root alone serves nothing here.
    return getegid() != kRootGid || getgid() == kRootGid ||
           setresgid(kSameGid, getgid(), kSameGid) == 0 || Failed(__LINE__, "setresgid");
  }
  // Before the group and the user: only root may do it.
  if (setgroups(0, nullptr) != 0) {
    return Failed(__LINE__, "setgroups");
  }
  return getuid() == kRootUid ? TakeEffectiveIds(kSystemUid, kSystemGid)
                              : TakeEffectiveIds(getuid(), getgid());
}

bool HideFromCaller() {
  uid_t real = 0;
  uid_t effective = 0;
  uid_t saved = 0;
  if (getresuid(&real, &effective, &saved) != 0) {
    return Failed(__LINE__, "getresuid");
  }
  if (real == kRootUid || saved != kRootUid) {
    return true;
  }
  // Only root may take the ids of somebody else; the user last, since root is left with it.
  if (setresuid(kSameUid, kRootUid, kSameUid) != 0 ||
      setresgid(kSystemGid, kSystemGid, kSameGid) != 0 ||
      setresuid(kSystemUid, kSystemUid, kSameUid) != 0) {
    return Failed(__LINE__, "taking the system identity");
  }
  return HasSystemIdsAndSavedRoot() || Failed(__LINE__, "the system identity");
}

}  // namespace common
