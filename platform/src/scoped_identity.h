// Other effective ids for a scope.
#ifndef PLATFORM_SRC_SCOPED_IDENTITY_H_
#define PLATFORM_SRC_SCOPED_IDENTITY_H_

#include <sys/types.h>

namespace tuvo_platform {

// Takes effective ids in the constructor and puts the former ones back in the destructor. Real and
// saved ids and the supplementary groups are never changed. Effective ids belong to the whole
// process: one object at a time, or properly nested, on one thread.
class ScopedIdentity {
 public:
  // Takes `uid` and `gid`, by way of root when the process keeps root as its real or saved id. A
  // process that could not come back from there, or that has no root at all, changes nothing
  // unless it has these ids already.
  ScopedIdentity(uid_t uid, gid_t gid);

  // Puts the former effective ids back; errno is kept. Ends the process (abort) when that fails:
  // going on with wrong ids is worse than stopping.
  ~ScopedIdentity();

  ScopedIdentity(const ScopedIdentity&) = delete;
  ScopedIdentity& operator=(const ScopedIdentity&) = delete;

  // Whether the ids asked for are now the effective ones. When not, the former ones still are.
  bool ok() const { return ok_; }

 private:
  void Restore() const;

  const uid_t former_uid_;
  const gid_t former_gid_;
  bool ok_ = false;
};

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_SCOPED_IDENTITY_H_
