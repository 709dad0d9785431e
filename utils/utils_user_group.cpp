#include <internal/log.h>
#include <tuvoplatform/account.h>
#include <tuvosharing/user_group.h>

#include <memory>

namespace TUVO::sharing {

namespace {

// What the platform's name conversion is given room for.
constexpr unsigned int kRealNameSize = 493;

using User = std::unique_ptr<TUVOUSER, decltype(&TUVOUserFree)>;
using Group = std::unique_ptr<TUVOGROUP, decltype(&TUVOGroupFree)>;
using GroupNames = std::unique_ptr<TLIBSZHASH, decltype(&TLIBCSzHashFree)>;

}  // namespace

std::string GetRealUsername(const char* name) {
  if (name == nullptr) {
    return "";
  }
  char real[kRealNameSize] = {};
  if (TUVOUserLoginNameConvert(name, real, sizeof real) > 0) {
    return real;
  }
  return name;
}

bool UserGet(const char* name, TUVOUSER*& user) {
  const std::string real = GetRealUsername(name);
  if (TUVOUserGet(real.c_str(), &user) == -1) {
    SHARING_LOG("No such user [%s]", real.c_str());
    return false;
  }
  return true;
}

bool UserGroupsGet(TUVOUSER* user, std::set<unsigned int>& gids) {
  const GroupNames names(TLIBGroupInfoHashGet(user->szName, 1, 0), &TLIBCSzHashFree);
  if (!names) {
    return false;
  }
  for (int i = 0; i < names->nItem; ++i) {
    const char* name = names->rgszItem[i];
    unsigned int gid = 0;
    if (name[0] != '\0' && TUVOGroupGetGID(name, &gid) == 0) {
      gids.insert(gid);
    }
  }
  return true;
}

bool UserToUID(const std::string& name, unsigned int& uid) {
  TUVOUSER* found = nullptr;
  const int result = TUVOUserGet(GetRealUsername(name.c_str()).c_str(), &found);
  const User user(found, &TUVOUserFree);
  if (result != 0 || !user) {
    return false;
  }
  uid = user->nUid;
  return true;
}

bool GroupToGID(const std::string& name, unsigned int& gid) {
  return TUVOGroupGetGID(name.c_str(), &gid) == 0;
}

bool UIDToUser(const unsigned int& uid, std::string& name) {
  TUVOUSER* found = nullptr;
  const int result = TUVOUserGetByUID(uid, &found);
  const User user(found, &TUVOUserFree);
  if (result != 0 || !user) {
    return false;
  }
  name = user->szName;
  return true;
}

bool GIDToGroup(const unsigned int& gid, std::string& name) {
  TUVOGROUP* found = nullptr;
  const int result = TUVOGroupGetByGID(gid, &found);
  const Group group(found, &TUVOGroupFree);
  if (result != 0 || !group) {
    return false;
  }
  name = group->szName;
  return true;
}

}  // namespace TUVO::sharing
