#include <internal/user_access.h>
#include <tuvoplatform/account.h>
#include <tuvoplatform/cgi.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/user_group.h>

#include <set>

namespace TUVO::sharing {

namespace {

constexpr int kAllowed = 1;
constexpr int kLoginRefused = -2;
constexpr int kFailed = -4;
constexpr int kNotListed = -6;

constexpr int kCgiSuccess = 1;

// Room for any address as text.
constexpr unsigned int kAddressSize = 65;
// What the platform's login is given to write its reply into; nobody reads it.
constexpr unsigned int kReplySize = 123;

// A context of the request; freed also when it could not be made.
class CgiContext {
 public:
  CgiContext() : good_(TuvoCgiInit("", &cgi_) == kCgiSuccess) {}
  CgiContext(const CgiContext&) = delete;
  CgiContext& operator=(const CgiContext&) = delete;
  ~CgiContext() { TuvoCgiFree(&cgi_); }

  bool IsGood() const { return good_; }
  TUVOCGI* Get() { return &cgi_; }

 private:
  TUVOCGI cgi_{};
  bool good_;
};

// An account record that is freed whichever way the check ends.
struct Account {
  Account() = default;
  Account(const Account&) = delete;
  Account& operator=(const Account&) = delete;
  ~Account() {
    if (user != nullptr) {
      TUVOUserFree(user);
    }
  }

  TUVOUSER* user = nullptr;
  std::set<unsigned int> gids;
};

// A request that names a session of the appliance carries it on as the cookie "id".
bool CarrySession(TUVOCGI* cgi) {
  TuvoCgiLoadInCookies(cgi);
  const char* session = TuvoCgiGetRequestParam(cgi, "_sid");
  return session == nullptr || session[0] == '\0' ||
         TuvoCgiSetCookies(cgi, "id", session, "/") == kCgiSuccess;
}

int LogIn(TUVOCGI* cgi, const _tag_sharing_login_params* params, Account& account) {
  const std::string name = GetRealUsername(params->zor_username);
  const LoginInfo login = {name.c_str(), params->zor_password, "webui", 15, 1};
  char reply[kReplySize] = {};
  if (TuvoCgiLogin(cgi, reply, sizeof reply, &login) != kCgiSuccess) {
    return kLoginRefused;
  }
  if (!UserGet(params->zor_username, account.user)) {
    return kFailed;
  }
  return kAllowed;
}

int FindAccount(TUVOCGI* cgi, const _tag_sharing_login_params* params, unsigned int* uid,
                Account& account) {
  if (params->zor_username != nullptr) {
    const int result = LogIn(cgi, params, account);
    if (result != kAllowed) {
      return result;
    }
  } else if (TUVOUserGetByUID(*uid, &account.user) != 0) {
    return kFailed;
  }
  if (account.user == nullptr || !UserGroupsGet(account.user, account.gids)) {
    return kFailed;
  }
  if (params->zor_username != nullptr) {
    *uid = account.user->nUid;
  }
  return kAllowed;
}

bool IsListed(const record::Entry& entry, const Account& account) {
  for (const unsigned int uid : entry.get_protect_uids()) {
    if (uid == account.user->nUid) {
      return true;
    }
  }
  for (const unsigned int gid : entry.get_protect_gids()) {
    if (account.gids.count(gid) != 0) {
      return true;
    }
  }
  return false;
}

}  // namespace

bool GetRemoteIP(std::string& ip) {
  char text[kAddressSize] = {};
  if (TuvoCgiGetRemoteIP(text, sizeof text) == -1) {
    return false;
  }
  ip = text;
  return true;
}

int CheckUserAccess(const record::Entry& entry, const _tag_sharing_login_params* params,
                    unsigned int* uid) {
  CgiContext cgi;
  if (!cgi.IsGood() || !CarrySession(cgi.Get())) {
    return kFailed;
  }
  Account account;
  const int result = FindAccount(cgi.Get(), params, uid, account);
  if (result != kAllowed) {
    return result;
  }
  return IsListed(entry, account) ? kAllowed : kNotListed;
}

}  // namespace TUVO::sharing
