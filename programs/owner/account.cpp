#include "owner/account.h"

#include <tuvoplatform/account.h>
#include <tuvosharing/user_group.h>

#include <memory>
#include <set>

#include "owner/text_check.h"

namespace owner {

namespace {

constexpr unsigned int kRootUid = 0;
constexpr unsigned int kSystemUid = 1;
constexpr const char* kAdministrators = "administrators";

struct FreeUser {
  void operator()(TUVOUSER* user) const { TUVOUserFree(user); }
};

bool IsIn(const std::set<unsigned int>& gids, const char* group) {
  unsigned int gid = 0;
  return TUVO::sharing::GroupToGID(group, gid) && gids.count(gid) != 0;
}

}  // namespace

std::optional<Account> AccountOfName(const std::string& name) {
  TUVOUSER* found = nullptr;
  // The library logs names that it does not find: one with a line feed would begin a line of its
  // own there.
  if (!IsPlainText(name) || !TUVO::sharing::UserGet(name.c_str(), found) || found == nullptr) {
    return std::nullopt;
  }
  const std::unique_ptr<TUVOUSER, FreeUser> user(found);
  Account account;
  account.uid = user->nUid;
  account.name = user->szName;
  account.administrator = account.uid == kRootUid || account.uid == kSystemUid;
  if (!account.administrator) {
    std::set<unsigned int> gids;
    if (!TUVO::sharing::UserGroupsGet(user.get(), gids)) {
      return std::nullopt;
    }
    account.administrator = IsIn(gids, kAdministrators);
  }
  return account;
}

std::optional<Account> AccountOfUid(unsigned int uid) {
  std::string name;
  if (!TUVO::sharing::UIDToUser(uid, name)) {
    return std::nullopt;
  }
  std::optional<Account> account = AccountOfName(name);
  return account && account->uid == uid ? account : std::nullopt;
}

}  // namespace owner
