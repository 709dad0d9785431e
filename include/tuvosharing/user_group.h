// Account and group names to ids and back, through the platform's user and group database. False
// means that there is no such account or group, or that the database could not be read; the output
// argument is then untouched unless told otherwise.
#ifndef TUVOSHARING_USER_GROUP_H_
#define TUVOSHARING_USER_GROUP_H_

#include <tuvosharing/export.h>

#include <set>
#include <string>

struct TUVOUSER;  // the platform's account record, declared in its headers

namespace TUVO::sharing {

// The account name behind the login name that a person typed: as the platform converts it, else
// `name` itself; the empty text for null.
TUVOSHARING_API std::string GetRealUsername(const char* name);

// Looks an account up by login name (converted as above). The caller frees `user` with
// TUVOUserFree. Only the platform's answer -1 is a failure, it logs one line and leaves `user` as
// the platform does (null on plain Linux); after any other
// answer the result is true, and `user` may then still be null.
TUVOSHARING_API bool UserGet(const char* name, TUVOUSER*& user);

// Adds the gids of the account's groups to `gids`; groups that do not resolve are left out. True
// for an account without groups. False when the platform has no answer; `gids` is untouched.
// Precondition: `user` is not null.
TUVOSHARING_API bool UserGroupsGet(TUVOUSER* user, std::set<unsigned int>& gids);

// Name to id; user names are converted as above, group names are not.
TUVOSHARING_API bool UserToUID(const std::string& name, unsigned int& uid);
TUVOSHARING_API bool GroupToGID(const std::string& name, unsigned int& gid);

// Id to name.
TUVOSHARING_API bool UIDToUser(const unsigned int& uid, std::string& name);
TUVOSHARING_API bool GIDToGroup(const unsigned int& gid, std::string& name);

}  // namespace TUVO::sharing

#endif  // TUVOSHARING_USER_GROUP_H_
