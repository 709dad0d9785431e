#include "cli/as_caller.h"

#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>

namespace cli {

namespace {

constexpr auto kSameUid = static_cast<uid_t>(-1);
constexpr auto kSameGid = static_cast<gid_t>(-1);

void MustBeDone(bool done) {
  if (!done) {
    syslog(LOG_AUTH | LOG_CRIT, "as_caller:%d cannot change the identity: %s", __LINE__,
           std::strerror(errno));
    std::abort();
  }
}

void TakeUid(uid_t uid) {
  MustBeDone(geteuid() == uid || (setresuid(kSameUid, uid, kSameUid) == 0 && geteuid() == uid));
}

void TakeGid(gid_t gid) {
  MustBeDone(getegid() == gid || (setresgid(kSameGid, gid, kSameGid) == 0 && getegid() == gid));
}

}  // namespace

AsCaller::AsCaller() : uid_(geteuid()), gid_(getegid()) {
  TakeUid(getuid());
  TakeGid(getgid());
}

AsCaller::~AsCaller() {
  const int error = errno;
  TakeGid(gid_);
  TakeUid(uid_);
  errno = error;
}

}  // namespace cli
