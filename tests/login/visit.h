// A visitor's requests to the login API. Each is served by a process of its own, as the appliance's
// web programs are, on the real database and auto-block files, which are fresh in every test.
#ifndef TESTS_LOGIN_VISIT_H_
#define TESTS_LOGIN_VISIT_H_

#include <gtest/gtest.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/login.h>

#include <ctime>
#include <functional>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include "db/sqlite_file.h"
#include "support/child.h"
#include "support/syslog_listener.h"

namespace tuvo_test {

constexpr char kFolder[] = "/usr/tuvo/etc/private/session";
constexpr char kDatabase[] = "/usr/tuvo/etc/private/session/sharing.db";
constexpr char kMovedDatabase[] = "/tmp/sharing.db";
constexpr char kAutoBlock[] = "/usr/tuvo/etc/private/session/autoblock.db";

constexpr char kAddress[] = "192.0.2.1";
constexpr char kOtherAddress[] = "192.0.2.2";
constexpr char kNoUser[] = "4294967295";
constexpr unsigned int kAlice = 2001;
constexpr unsigned int kBob = 2002;
constexpr unsigned int kCarol = 2003;
constexpr unsigned int kDave = 2004;
constexpr unsigned int kFriends = 3001;  // alice is the one member
constexpr std::time_t kDay = 86400;

// What the login's text is before the call.
constexpr char kUntouched[] = "untouched";

// What one request brings. Comes from kAddress to a process that runs as root, unless told
// otherwise; a parameter that is not given is null.
class Visit {
 public:
  Visit() : environment_{{"REMOTE_ADDR", kAddress}} {}
  explicit Visit(const std::string& hash) : Visit() { sharing_id_ = hash; }

  Visit& Password(const std::string& password);
  Visit& Account(const std::string& name, const std::string& password);
  Visit& AccountName(const std::string& name);
  Visit& Session(const std::string& session_id);
  Visit& From(const std::string& address);
  Visit& FromNowhere();
  Visit& Environment(const std::string& name, const std::string& value);
  Visit& Query(const std::string& query);
  Visit& As(const Ids& ids);

  // The parameters; they point into this object.
  _tag_sharing_login_params Params() const;
  // Makes this process's environment the request's, and nothing else.
  void EnterEnvironment() const;
  const Ids& ids() const { return ids_; }

 private:
  std::optional<std::string> sharing_id_;
  std::optional<std::string> password_;
  std::optional<std::string> zor_username_;
  std::optional<std::string> zor_password_;
  std::optional<std::string> sharing_sid_;
  std::map<std::string, std::string> environment_;
  Ids ids_ = kRoot;
};

// What came of one request.
struct Reply {
  int code;                      // as the operation returned it; a bool as 1 and 0
  std::string session_id;        // the login's text after the call
  std::vector<std::string> log;  // what was logged, see VisitTest::TakeLog
};

using Lines = std::vector<std::string>;

class VisitTest : public testing::Test {
 protected:
  VisitTest();

  // Stores a link, open to everybody unless `change` makes it another, and returns its hash.
  std::string MakeLink(const std::function<void(TUVO::sharing::record::Entry&)>& change =
                           [](auto&) {});
  // One whose password is "sesame".
  std::string MakePasswordLink();
  // One for accounts: alice and the members of `gids`.
  std::string MakeAccountLink(const std::vector<unsigned int>& gids = {});

  // Runs one operation in a process of its own. Expects that it ends by itself, with the six ids
  // that it began with.
  Reply Login(const Visit& visit, bool skip_autoblock = false);
  Reply Check(const Visit& visit);
  Reply Logout(const std::string& hash, const std::string& session_id, const Ids& ids = kRoot);
  Reply CountUse(const std::string& hash, const Ids& ids = kRoot);
  Reply Run(const Visit& visit, const std::function<int(std::string& session_id)>& operation);

  // Logs a visitor in, and returns the session identifier.
  std::string LoggedIn(const Visit& visit);

  // The lines since the last call, those that PAM writes about accounts left out. Source lines,
  // process ids and the texts of errno are replaced by LINE, PID and ERRNO; the number in a line of
  // the login API only if it is that of the check that failed. Expects that lines other than those
  // about the identity switch are at LOG_USER and LOG_ERR.
  Lines TakeLog();

  // A look at the database, and changes behind the library's back.
  std::vector<TextRow> Rows(const std::string& sql);
  std::string Value(const std::string& sql);
  void Change(const std::string& sql);
  // Makes every such statement fail; for example Break("UPDATE", "session").
  void Break(const std::string& operation, const std::string& table);

  // How many failed logins count against an address now.
  int FailedLogins(const std::string& address = kAddress);
  // Counts failed logins of an address.
  void FailLogins(int count, const std::string& address = kAddress);

  SyslogListener syslog_;
};

// Runs `body`, whose expectations count, in a process of its own.
void InChild(const std::function<void()>& body);

// Expects that `timeout` is one day after a moment between `before` and now.
void ExpectDayAfter(std::time_t before, const std::string& timeout);

}  // namespace tuvo_test

#endif  // TESTS_LOGIN_VISIT_H_
