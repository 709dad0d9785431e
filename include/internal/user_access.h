// Who a visitor is and whether a link for accounts admits it.
#ifndef INTERNAL_USER_ACCESS_H_
#define INTERNAL_USER_ACCESS_H_

#include <tuvosharing/login.h>

#include <string>

namespace TUVO::sharing {
namespace record {
class Entry;
}

// The client's address, from the CGI environment. False, `ip` untouched, when there is none.
bool GetRemoteIP(std::string& ip);

// Decides whether an account may open a link for accounts. With `zor_username` that account is
// logged in and its uid stored in `*uid`; else the account is the one of `*uid`. Returns 1 when the
// account or one of its groups is listed, -2 when the account login was refused, -6 when neither
// is listed, -4 on any other failure. Logs nothing itself.
int CheckUserAccess(const record::Entry& entry, const _tag_sharing_login_params* params,
                    unsigned int* uid);

}  // namespace TUVO::sharing

#endif  // INTERNAL_USER_ACCESS_H_
