#include "scoped_identity.h"

#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace tuvo_platform {

namespace {

constexpr uid_t kRootUid = 0;
constexpr auto kSameUid = static_cast<uid_t>(-1);
constexpr auto kSameGid = static_cast<gid_t>(-1);

bool HasEffectiveIds(uid_t uid, gid_t gid) {
  return geteuid() == uid && getegid() == gid;
}

bool SetEffectiveUid(uid_t uid) {
  return setresuid(kSameUid, uid, kSameUid) == 0;
}

// Root must stay among the real and saved ids, or there would be no way back.
bool CanSwitchTo(uid_t uid) {
  uid_t real = 0;
  uid_t effective = 0;
  uid_t saved = 0;
  if (getresuid(&real, &effective, &saved) != 0) {
    return false;
  }
  if (real == kRootUid || saved == kRootUid || (effective == kRootUid && uid == kRootUid)) {
    return true;
  }
  errno = EPERM;
  return false;
}

// Root first, since only root may take any gid; the uid last, since root is lost with it. The
// outcome is looked at as well: a call that answers 0 and does nothing must not go unnoticed.
bool TakeEffectiveIds(uid_t uid, gid_t gid) {
  if (HasEffectiveIds(uid, gid)) {
    return true;
  }
  if (geteuid() != kRootUid && !SetEffectiveUid(kRootUid)) {
    return false;
  }
  return setresgid(kSameGid, gid, kSameGid) == 0 && SetEffectiveUid(uid) &&
         HasEffectiveIds(uid, gid);
}

}  // namespace

ScopedIdentity::ScopedIdentity(uid_t uid, gid_t gid)
    : former_uid_(geteuid()), former_gid_(getegid()) {
  if (HasEffectiveIds(uid, gid)) {
    ok_ = true;
    return;
  }
  if (!CanSwitchTo(uid)) {
    return;
  }
  ok_ = TakeEffectiveIds(uid, gid);
  if (!ok_) {
    const int error = errno;
    Restore();
    errno = error;
  }
}

ScopedIdentity::~ScopedIdentity() {
  const int error = errno;
  Restore();
  errno = error;
}

void ScopedIdentity::Restore() const {
  if (!TakeEffectiveIds(former_uid_, former_gid_)) {
    syslog(LOG_AUTH | LOG_CRIT, "scoped_identity:%d cannot return to uid %u gid %u: %s", __LINE__,
           former_uid_, former_gid_, std::strerror(errno));
    std::abort();
  }
}

}  // namespace tuvo_platform
