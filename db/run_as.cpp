#include <internal/run_as.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>

// NOLINTBEGIN(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)
namespace _________ {

namespace {

constexpr uid_t kUnchangedUid = static_cast<uid_t>(-1);
constexpr gid_t kUnchangedGid = static_cast<gid_t>(-1);

int SetEffectiveUid(uid_t uid) {
  return setresuid(kUnchangedUid, uid, kUnchangedUid);
}
int SetEffectiveGid(gid_t gid) {
  return setresgid(kUnchangedGid, gid, kUnchangedGid);
}

// Root is regained first: only root may take any group, and any user but its own.
bool Take(uid_t current_uid, gid_t current_gid, uid_t uid, gid_t gid) {
  if (current_uid == uid && current_gid == gid) {
    return true;
  }
  if (current_uid != 0 && current_uid != uid && SetEffectiveUid(0) < 0) {
    return false;
  }
  if (current_gid != gid && SetEffectiveGid(gid) != 0) {
    return false;
  }
  return current_uid == uid || SetEffectiveUid(uid) == 0;
}

}  // namespace

__::__(std::string_view source, int line, const char* name)
    : saved_uid_(geteuid()), saved_gid_(getegid()), source_(source), line_(line), name_(name) {}

bool __::SwitchTo(uid_t uid, gid_t gid) const {
  if (Take(saved_uid_, saved_gid_, uid, gid)) {
    return true;
  }
  const int error = errno;
  syslog(LOG_AUTH | LOG_ERR, "%.*s:%d ERROR: %s(%d, %d)", static_cast<int>(source_.size()),
         source_.data(), line_, name_, static_cast<int>(uid), static_cast<int>(gid));
  errno = error;
  return false;
}

__::~__() {
  const int error = errno;
  const uid_t current_uid = geteuid();
  const gid_t current_gid = getegid();
  const bool uid_differs = current_uid != saved_uid_;
  const bool gid_differs = current_gid != saved_gid_;
  // The group goes back while root is still in force, the user last.
  if ((uid_differs && current_uid != 0 && SetEffectiveUid(0) != 0) ||
      (gid_differs && saved_gid_ != kUnchangedGid && SetEffectiveGid(saved_gid_) != 0) ||
      (uid_differs && saved_uid_ != kUnchangedUid && SetEffectiveUid(saved_uid_) != 0)) {
    syslog(LOG_AUTH | LOG_CRIT, "%.*s:%d ERROR: ~%s(%d, %d)", static_cast<int>(source_.size()),
           source_.data(), line_, name_, static_cast<int>(saved_uid_),
           static_cast<int>(saved_gid_));
  }
  errno = error;
}

}  // namespace _________
// NOLINTEND(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)
