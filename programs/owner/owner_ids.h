// Taking on an owner's identity, for good: for child processes.
#ifndef PROGRAMS_OWNER_OWNER_IDS_H_
#define PROGRAMS_OWNER_OWNER_IDS_H_

#include <sys/types.h>

#include <optional>
#include <string>
#include <vector>

#include "owner/account.h"

namespace owner {

struct OwnerIds {
  uid_t uid;
  gid_t gid;
  std::vector<gid_t> groups;
};

// The account's ids and all of its groups; nothing when the system's user database has no answer.
std::optional<OwnerIds> IdsOf(const Account& owner);

// Makes all ids of this process, and its groups, those of `ids`, without a way back. A process that
// has root among its ids only can; one whose user, real and effective, is that user already keeps
// its groups. False, with errno set, when that is not to be: the process must then end. Nothing
// here allocates: it may be called in the child of a fork.
bool Become(const OwnerIds& ids);

}  // namespace owner

#endif  // PROGRAMS_OWNER_OWNER_IDS_H_
