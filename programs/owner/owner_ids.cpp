#include "owner/owner_ids.h"

#include <grp.h>
#include <pwd.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace owner {

namespace {

constexpr uid_t kRootUid = 0;
constexpr auto kSameUid = static_cast<uid_t>(-1);

bool ReadGroups(const std::string& name, gid_t gid, std::vector<gid_t>* groups) {
  int count = 32;
  groups->resize(static_cast<size_t>(count));
  while (getgrouplist(name.c_str(), gid, groups->data(), &count) < 0) {
    constexpr int kMostGroups = 65536;
    if (count > kMostGroups || static_cast<size_t>(count) <= groups->size()) {
      return false;
    }
    groups->resize(static_cast<size_t>(count));
  }
  groups->resize(static_cast<size_t>(count));
  return true;
}

bool IsWholly(uid_t uid, gid_t gid) {
  uid_t real_uid = 0;
  uid_t effective_uid = 0;
  uid_t saved_uid = 0;
  gid_t real_gid = 0;
  gid_t effective_gid = 0;
  gid_t saved_gid = 0;
  return getresuid(&real_uid, &effective_uid, &saved_uid) == 0 &&
         getresgid(&real_gid, &effective_gid, &saved_gid) == 0 && real_uid == uid &&
         effective_uid == uid && saved_uid == uid && real_gid == gid && effective_gid == gid &&
         saved_gid == gid;
}

}  // namespace

std::optional<OwnerIds> IdsOf(const Account& owner) {
  std::array<char, 16384> room{};
  passwd entry{};
  passwd* found = nullptr;
  if (getpwuid_r(static_cast<uid_t>(owner.uid), &entry, room.data(), room.size(), &found) != 0 ||
      found == nullptr) {
    return std::nullopt;
  }
  OwnerIds ids{entry.pw_uid, entry.pw_gid, {}};
  if (!ReadGroups(entry.pw_name, ids.gid, &ids.groups)) {
    return std::nullopt;
  }
  return ids;
}

bool Become(const OwnerIds& ids) {
  if (getuid() == ids.uid && geteuid() == ids.uid) {
    // Without a way to root this is all there is: the groups stay those of the process.
    if (setresuid(kSameUid, kRootUid, kSameUid) != 0) {
      return setresuid(ids.uid, ids.uid, ids.uid) == 0;
    }
  } else if (geteuid() != kRootUid && setresuid(kSameUid, kRootUid, kSameUid) != 0) {
    return false;
  }
  // The user last: without root the groups can no longer be changed.
  if (setgroups(ids.groups.size(), ids.groups.data()) != 0 ||
      setresgid(ids.gid, ids.gid, ids.gid) != 0 || setresuid(ids.uid, ids.uid, ids.uid) != 0) {
    return false;
  }
  if (!IsWholly(ids.uid, ids.gid)) {
    errno = EPERM;
    return false;
  }
  return true;
}

}  // namespace owner
