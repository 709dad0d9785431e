// The check of every later request of a visitor.
#include <sys/stat.h>
#include <tuvoplatform/auto_block.h>
#include <unistd.h>

#include <filesystem>

#include "login/platform_spy.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::record::Entry;

constexpr char kExpiredSession[] =
    "session:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n";
constexpr char kExpiredToken[] = "token:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n";

// A visitor who is logged in to a link.
class IsAuthorized : public VisitTest {
 protected:
  void LogInTo(const std::string& hash) { LogIn(Visit(hash).Password("sesame")); }

  void LogInAlice(const std::string& hash) { LogIn(Visit(hash).Account("alice", "alice-secret")); }

  // Sets both ends to a moment that a renewal changes.
  void LogIn(const Visit& login) {
    hash_ = login.Params().sharing_id;
    id_ = LoggedIn(login);
    const std::string soon = std::to_string(std::time(nullptr) + 60);
    Change("UPDATE session SET timeout = " + soon);
    Change("UPDATE token SET timeout = " + soon);
  }

  // The visitor's next request.
  Visit Next() const { return Visit(hash_).Session(id_); }

  Reply CheckWithoutParameters() {
    return Run(Visit(), [](std::string&) { return TUVO::TuvoSharingIsAuthorized(nullptr); });
  }

  // Everything that a check might change.
  std::vector<TextRow> Everything() {
    std::vector<TextRow> rows;
    for (const char* table : {"entry", "session", "token"}) {
      for (const TextRow& row : Rows(std::string("SELECT * FROM ") + table)) {
        rows.push_back(row);
      }
    }
    return rows;
  }

  // Expects that the check refuses with `code` and `log`, and changes nothing.
  void ExpectRefused(int code, const Lines& log, const Visit& visit) {
    const auto before = Everything();
    const Reply reply = Check(visit);
    EXPECT_EQ(code, reply.code);
    EXPECT_EQ(log, reply.log);
    EXPECT_EQ(before, Everything());
    EXPECT_EQ(0, FailedLogins());
  }

  std::string hash_;
  std::string id_;
};

// The library's own lines among others'.
Lines OwnLines(const Lines& lines) {
  Lines own;
  for (const std::string& line : lines) {
    if (line.find("sharinglogin:") == 0) {
      own.push_back(line);
    }
  }
  return own;
}

bool Exists(const char* path) {
  struct stat status {};
  return stat(path, &status) == 0;
}

TEST_F(IsAuthorized, SlidesBothEndsToOneDayAfterTheRequest) {
  LogInTo(MakePasswordLink());
  const auto link = Rows("SELECT * FROM entry");
  const auto session = Rows("SELECT id, session_id, uid, ip FROM session");
  const auto token = Rows("SELECT id, entry_id, session_id FROM token");
  const std::time_t before = std::time(nullptr);
  const Reply reply = Check(Next());
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  ExpectDayAfter(before, Value("SELECT timeout FROM session"));
  ExpectDayAfter(before, Value("SELECT timeout FROM token"));
  EXPECT_EQ(link, Rows("SELECT * FROM entry"));
  EXPECT_EQ(session, Rows("SELECT id, session_id, uid, ip FROM session"));
  EXPECT_EQ(token, Rows("SELECT id, entry_id, session_id FROM token"));
}

TEST_F(IsAuthorized, TheClockIsReadForTheSessionAndAgainForTheToken) {
  LogInTo(MakePasswordLink());
  const Visit visit = Next();
  const std::time_t begin = std::time(nullptr);
  Run(visit, [&](std::string&) {
    Spy().now = begin;
    Spy().step = 1;
    const _tag_sharing_login_params params = visit.Params();
    EXPECT_EQ(1, TUVO::TuvoSharingIsAuthorized(&params));
    return 0;
  });
  const long session = std::stol(Value("SELECT timeout FROM session"));
  EXPECT_GT(session, begin + kDay);  // the checks before it looked at the clock as well
  EXPECT_GT(std::stol(Value("SELECT timeout FROM token")), session);
}

TEST_F(IsAuthorized, RenewsNobodyElse) {
  const std::string hash = MakePasswordLink();
  LogInTo(hash);
  const std::string other = id_;
  const std::string other_id = Value("SELECT id FROM session");
  LogInTo(hash);
  const std::string of_other =
      "SELECT s.timeout, t.timeout FROM session s JOIN token t ON "
      "t.session_id = s.id WHERE s.id = " +
      other_id;
  const auto before = Rows(of_other);
  ASSERT_NE(other, id_);
  EXPECT_EQ(1, Check(Next()).code);
  EXPECT_EQ(before, Rows(of_other));
}

TEST_F(IsAuthorized, AsksForNoPassword) {
  LogInTo(MakePasswordLink());
  EXPECT_EQ(1, Check(Next().Password("wrong")).code);
  EXPECT_EQ(1, Check(Next().Account("nobody-such", "wrong")).code);
}

// Only the login asks the auto-block service.
TEST_F(IsAuthorized, ADeniedAddressKeepsWhatItHas) {
  LogInTo(MakePasswordLink());
  FailLogins(10);
  EXPECT_EQ(1, Check(Next()).code);
  EXPECT_EQ(1, TuvoCgiIsDeniedIP(kAddress));
}

TEST_F(IsAuthorized, FailedLoginsAreNotClearedByACheckThatPasses) {
  LogInTo(MakePasswordLink());
  FailLogins(9);
  EXPECT_EQ(1, Check(Next()).code);
  EXPECT_EQ(9, FailedLogins());
}

// What a request must bring.

TEST_F(IsAuthorized, FailsWithoutParameters) {
  LogInTo(MakePasswordLink());
  const Reply reply = CheckWithoutParameters();
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
}

TEST_F(IsAuthorized, FailsWithoutSessionOrHash) {
  LogInTo(MakePasswordLink());
  ExpectRefused(-4, {}, Visit(hash_));
  ExpectRefused(-4, {}, Visit().Session(id_));
  ExpectRefused(-4, {}, Visit().FromNowhere());
}

TEST_F(IsAuthorized, FailsWithoutAnAddress) {
  LogInTo(MakePasswordLink());
  const Lines log{"sharinglogin:LINE invalid ip"};
  ExpectRefused(-4, log, Next().FromNowhere());
  ExpectRefused(-4, log, Next().From("unknown"));
  ExpectRefused(-4, log, Next().FromNowhere().Environment("HTTP_X_FORWARDED_FOR", kAddress));
  ExpectRefused(-4, log, Visit("unknown").Session("unknown").FromNowhere());
}

// What is not there.

TEST_F(IsAuthorized, RefusesAnUnknownSession) {
  LogInTo(MakePasswordLink());
  for (const char* id : {"unknown", "", "x' OR '1'='1", "'; DELETE FROM session; --"}) {
    ExpectRefused(-5, {}, Visit(hash_).Session(id));
    ExpectRefused(-5, {}, Visit("unknown").Session(id));
  }
}

TEST_F(IsAuthorized, RefusesAnUnknownLink) {
  LogInTo(MakePasswordLink());
  for (const char* hash : {"unknown", "", "x' OR '1'='1", "'; DELETE FROM entry; --"}) {
    ExpectRefused(-7, {}, Visit(hash).Session(id_));
  }
}

TEST_F(IsAuthorized, RefusesASessionThatDidNotLogInToTheLink) {
  LogInTo(MakePasswordLink());
  const std::string other = MakeLink();
  ExpectRefused(-7, {}, Visit(other).Session(id_));
  // Nor does anybody else's login help.
  LoggedIn(Visit(other));
  ExpectRefused(-7, {}, Visit(other).Session(id_));
}

// A link that is not valid any more has no token either: that is told first.
TEST_F(IsAuthorized, WithoutATokenTheLinksStateIsNotTold) {
  LogInTo(MakePasswordLink());
  const std::string other = MakeLink([](Entry& entry) { entry.set_enabled(false); });
  ExpectRefused(-7, {}, Visit(other).Session(id_));
}

// The link.

TEST_F(IsAuthorized, RefusesALinkThatIsNotValid) {
  LogInTo(MakePasswordLink());
  const std::pair<const char*, const char*> broken[] = {
      {"enabled = 0", "! enabled_"},
      {"enabled = 1, start_at = 2147483647", "0 < start_at_ && start_at_ > timeNow"},
      {"start_at = 0, expire_at = 1", "0 < expire_at_ && timeNow > expire_at_"},
      {"expire_at = 0, expire_times = 3, use_count = 4",
       "0 < expire_times_ && use_count_ > expire_times_"},
  };
  for (const auto& [change, reason] : broken) {
    Change(std::string("UPDATE entry SET ") + change);
    ExpectRefused(-6,
                  {std::string("entry:LINE (PID) Failed [") + reason + "], err=ERRNO\n\n",
                   "sharinglogin:LINE entry is not valid"},
                  Next());
  }
}

TEST_F(IsAuthorized, AVisitorMayStayWhoseLoginWasTheLastOne) {
  LogInTo(MakePasswordLink());
  Change("UPDATE entry SET expire_times = 3, use_count = 3");
  EXPECT_EQ(1, Check(Next()).code);
}

// A row that cannot be a link is there all the same.
TEST_F(IsAuthorized, RefusesALinkThatIsNotLegalAsNotValid) {
  LogInTo(MakePasswordLink());
  const std::string reason = "entry:LINE (PID) Failed [\"\" == project_name_], err=ERRNO\n\n";
  Change("UPDATE entry SET project_name = ''");
  ExpectRefused(-6,
                {reason, reason, "entry:LINE (PID) Failed [! IsLegal()], err=ERRNO\n\n",
                 "sharinglogin:LINE entry is not valid"},
                Next());
}

TEST_F(IsAuthorized, RefusesALinkWhoseDocumentCannotBeReadAsNotValid) {
  LogInTo(MakePasswordLink());
  Change("UPDATE entry SET data = 'no document'");
  ExpectRefused(-6,
                {"entry:LINE (PID) Failed [! app_.isObject()], err=ERRNO\n\n",
                 "entry:LINE (PID) Failed [! IsLegal()], err=ERRNO\n\n",
                 "sharinglogin:LINE entry is not valid"},
                Next());
}

TEST_F(IsAuthorized, TheLinksStateComesBeforeTheSessions) {
  LogInTo(MakePasswordLink());
  Change("UPDATE entry SET enabled = 0");
  Change("UPDATE session SET timeout = 1000");
  Change("UPDATE token SET timeout = 1000");
  ExpectRefused(
      -6,
      {kExpiredSession, kExpiredToken, "entry:LINE (PID) Failed [! enabled_], err=ERRNO\n\n",
       "sharinglogin:LINE entry is not valid"},
      Next());
}

// Session and token.

TEST_F(IsAuthorized, RefusesAnExpiredSession) {
  LogInTo(MakePasswordLink());
  Change("UPDATE session SET timeout = 1000");
  ExpectRefused(-1, {kExpiredSession, kExpiredSession, "sharinglogin:LINE session is not valid"},
                Next());
}

TEST_F(IsAuthorized, RefusesASessionWithoutAnAddress) {
  LogInTo(MakePasswordLink());
  Change("UPDATE session SET ip = ''");
  const std::string reason = "session:LINE (PID) Failed [\"\" == ip_], err=ERRNO\n\n";
  ExpectRefused(-1, {reason, reason, "sharinglogin:LINE session is not valid"}, Next());
}

TEST_F(IsAuthorized, AnExpiredSessionsTokenStays) {
  LogInTo(MakePasswordLink());
  Change("UPDATE session SET timeout = 1000");
  Change("UPDATE token SET timeout = 1000");
  ExpectRefused(
      -1,
      {kExpiredSession, kExpiredToken, kExpiredSession, "sharinglogin:LINE session is not valid"},
      Next());
}

TEST_F(IsAuthorized, AnExpiredTokenIsDeleted) {
  LogInTo(MakePasswordLink());
  Change("UPDATE token SET timeout = 1000");
  const auto session = Rows("SELECT * FROM session");
  const Reply reply = Check(Next());
  EXPECT_EQ(-1, reply.code);
  EXPECT_EQ((Lines{kExpiredToken, kExpiredToken, "sharinglogin:LINE token is not valid"}),
            reply.log);
  EXPECT_EQ("0", Value("SELECT COUNT(*) FROM token"));
  EXPECT_EQ(session, Rows("SELECT * FROM session"));
  ExpectRefused(-7, {}, Next());
}

TEST_F(IsAuthorized, NoOtherTokenIsDeletedWithIt) {
  const std::string hash = MakePasswordLink();
  LogInTo(hash);
  LoggedIn(Visit(MakeLink()).Session(id_));
  LoggedIn(Visit(hash).Password("sesame"));
  Change("UPDATE token SET timeout = 1000 WHERE id = 1");
  EXPECT_EQ(-1, Check(Next()).code);
  EXPECT_EQ((std::vector<TextRow>{{"2"}, {"3"}}), Rows("SELECT id FROM token ORDER BY id"));
}

TEST_F(IsAuthorized, FailsWhenTheExpiredTokenCannotBeDeleted) {
  LogInTo(MakePasswordLink());
  Change("UPDATE token SET timeout = 1000");
  Break("DELETE", "token");
  ExpectRefused(-4,
                {kExpiredToken, kExpiredToken, "sharinglogin:LINE token is not valid",
                 "object_db:LINE (PID) delete failed\n", "sharinglogin:LINE delete token failed"},
                Next());
}

TEST_F(IsAuthorized, TheTokensAgeComesBeforeAccountAndAddress) {
  LogInAlice(MakeAccountLink());
  Change("UPDATE session SET uid = 2002");
  Change("UPDATE token SET timeout = 1000");
  EXPECT_EQ(-1, Check(Next().From(kOtherAddress)).code);
}

// The account.

TEST_F(IsAuthorized, ChecksTheSessionsAccount) {
  LogInAlice(MakeAccountLink());
  const Reply reply = Check(Next());
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  Change("UPDATE session SET uid = 2002");
  ExpectRefused(-2, {"sharinglogin:LINE user login error"}, Next());
}

TEST_F(IsAuthorized, ChecksTheSessionsAccountsGroups) {
  const std::string hash = MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_USER).set_protect_gids({kFriends});
  });
  LogInAlice(hash);
  EXPECT_EQ(1, Check(Next()).code);
  Change("UPDATE session SET uid = 2003");
  ExpectRefused(-2, {"sharinglogin:LINE user login error"}, Next());
}

TEST_F(IsAuthorized, RefusesASessionWithoutAnAccount) {
  LogInAlice(MakeAccountLink());
  for (const char* uid : {kNoUser, "54321", "NULL"}) {
    Change(std::string("UPDATE session SET uid = ") + uid);
    ExpectRefused(-2, {"sharinglogin:LINE user login error"}, Next());
  }
}

TEST_F(IsAuthorized, LogsANamedAccountInAgain) {
  LogInAlice(MakeAccountLink());
  EXPECT_EQ(1, Check(Next().Account("alice", "alice-secret")).code);
  const Lines log{"sharinglogin:LINE user login error"};
  ExpectRefused(-2, log, Next().Account("alice", "wrong"));
  ExpectRefused(-2, log, Next().AccountName("alice"));
  ExpectRefused(-2, log, Next().Account("bob", "bob-secret"));
  ExpectRefused(-2, log, Next().Account("", ""));
}

// The check of one request does not change whose session it is.
TEST_F(IsAuthorized, ANamedAccountStandsInForTheSessionsOnlyOnce) {
  LogInAlice(MakeAccountLink());
  Change("UPDATE session SET uid = 2002");
  EXPECT_EQ(1, Check(Next().Account("alice", "alice-secret")).code);
  EXPECT_EQ(std::to_string(kBob), Value("SELECT uid FROM session"));
  EXPECT_EQ(-2, Check(Next()).code);
}

TEST_F(IsAuthorized, TheAccountComesBeforeTheAddress) {
  LogInAlice(MakeAccountLink());
  Change("UPDATE session SET uid = 2002");
  ExpectRefused(-2, {"sharinglogin:LINE user login error"}, Next().From(kOtherAddress));
}

// The address.

TEST_F(IsAuthorized, RefusesAnotherAddress) {
  LogInTo(MakePasswordLink());
  const Lines log{"sharinglogin:LINE ip not match, 192.0.2.2, 192.0.2.1"};
  ExpectRefused(-8, log, Next().From(kOtherAddress));
  ExpectRefused(-8, log, Next().From(kOtherAddress).Environment("HTTP_X_FORWARDED_FOR", kAddress));
  EXPECT_EQ(1, Check(Next()).code);
}

// A session's address was spelled by whoever wrote it; what is spelled otherwise is another.
TEST_F(IsAuthorized, AddressesAreComparedByteByByte) {
  LogInTo(MakePasswordLink());
  for (const char* ip : {"192.0.2.1 ", "192.0.2.10", "192.0.2.", "::ffff:192.0.2.1"}) {
    Change(std::string("UPDATE session SET ip = '") + ip + "'");
    ExpectRefused(-8, {std::string("sharinglogin:LINE ip not match, 192.0.2.1, ") + ip}, Next());
  }
  Change("UPDATE session SET ip = '2001:DB8::1'");
  ExpectRefused(-8, {"sharinglogin:LINE ip not match, 2001:db8::1, 2001:DB8::1"},
                Next().From("2001:db8::1"));
}

TEST_F(IsAuthorized, OneAddressMayBeSpelledInManyWays) {
  LogIn(Visit(MakeLink()).From("2001:DB8::1"));
  EXPECT_EQ(1, Check(Next().From("2001:db8:0:0::1")).code);
  EXPECT_EQ(-8, Check(Next().From("2001:db8::2")).code);
}

TEST_F(IsAuthorized, ALinkMayLetItsVisitorsMove) {
  LogIn(Visit(MakeLink([](Entry& entry) { entry.set_enable_match_ip(false); })));
  const Reply reply = Check(Next().From(kOtherAddress));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(kAddress, Value("SELECT ip FROM session"));
}

// What cannot be written.

TEST_F(IsAuthorized, FailsWhenTheSessionCannotBeRenewed) {
  LogInTo(MakePasswordLink());
  Break("UPDATE", "session");
  ExpectRefused(-4,
                {"object_db:LINE (PID) update failed\n", "sharinglogin:LINE update session failed"},
                Next());
}

TEST_F(IsAuthorized, FailsWhenTheTokenCannotBeRenewed) {
  LogInTo(MakePasswordLink());
  Break("UPDATE", "token");
  const auto token = Rows("SELECT * FROM token");
  const std::time_t before = std::time(nullptr);
  const Reply reply = Check(Next());
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(
      (Lines{"object_db:LINE (PID) update failed\n", "sharinglogin:LINE update token failed"}),
      reply.log);
  EXPECT_EQ(token, Rows("SELECT * FROM token"));
  ExpectDayAfter(before, Value("SELECT timeout FROM session"));  // that was written before
}

TEST_F(IsAuthorized, AnExceptionEndsInsideTheLibrary) {
  LogInTo(MakePasswordLink());
  const Visit visit = Next();
  const Reply reply = Run(visit, [&](std::string&) {
    Spy().failing = "TuvoCgiGetRemoteIP";
    Spy().throws = true;
    const _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingIsAuthorized(&params);
  });
  EXPECT_EQ(-4, reply.code);
}

// The database file.

TEST_F(IsAuthorized, FailsWithoutAUsableDatabase) {
  LogInTo(MakePasswordLink());
  Change("PRAGMA user_version = -1");  // no script leads on from there
  for (const Reply& reply : {Check(Next()), Check(Visit()), CheckWithoutParameters()}) {
    EXPECT_EQ(-4, reply.code);
    EXPECT_EQ(Lines{"sharinglogin:LINE db is not good"}, OwnLines(reply.log));
  }
  EXPECT_TRUE(Exists(kDatabase));
  EXPECT_FALSE(Exists(kMovedDatabase));
}

// As it is when a program of root's made it.
TEST_F(IsAuthorized, MovesAFileOfRootsAsideAndFindsNoSession) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  const Reply reply = Check(Next());
  EXPECT_EQ(-5, reply.code);
  EXPECT_EQ((Lines{"sharinglogin:LINE db is not good", "sharinglogin:LINE db ownner is root"}),
            OwnLines(reply.log));
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_EQ(id_, SqliteFile(kMovedDatabase).Value("SELECT session_id FROM session"));

  // The next process makes a file as it should be.
  const Reply next = Check(Next());
  EXPECT_EQ(-5, next.code);
  EXPECT_EQ(Lines{}, next.log);
  struct stat status {};
  ASSERT_EQ(0, stat(kDatabase, &status));
  EXPECT_EQ(1U, status.st_uid);
  EXPECT_EQ(1U, status.st_gid);
  EXPECT_EQ(0660U, status.st_mode & 07777U);
}

// A file that could be opened is only not current: its connection goes on with the moved file.
TEST_F(IsAuthorized, ProceedsWithAFileOfRootsThatCouldBeOpened) {
  LogInTo(MakePasswordLink());
  Change("PRAGMA user_version = -1");
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0666));
  const Reply reply = Check(Next());
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ((Lines{"sharinglogin:LINE db is not good", "sharinglogin:LINE db ownner is root"}),
            OwnLines(reply.log));
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_TRUE(Exists(kMovedDatabase));
}

TEST_F(IsAuthorized, MovesTheFileWhateverTheRequestBrings) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  EXPECT_EQ(-4, Check(Visit()).code);
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_TRUE(Exists(kMovedDatabase));
}

TEST_F(IsAuthorized, MovesTheFileEvenWithoutParameters) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  EXPECT_EQ(-4, CheckWithoutParameters().code);
  EXPECT_FALSE(Exists(kDatabase));
  EXPECT_TRUE(Exists(kMovedDatabase));
}

TEST_F(IsAuthorized, LeavesAFileOfRootInAnotherGroup) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 2));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  const Reply reply = Check(Next());
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(Lines{"sharinglogin:LINE db is not good"}, OwnLines(reply.log));
  EXPECT_TRUE(Exists(kDatabase));
}

// A file of root's that works is nobody's business.
TEST_F(IsAuthorized, LeavesAFileOfRootsThatWorks) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0666));
  const Reply reply = Check(Next());
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_TRUE(Exists(kDatabase));
}

TEST_F(IsAuthorized, WithoutRootTheFileStaysAndTheCheckProceeds) {
  LogInTo(MakePasswordLink());
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  const Reply reply = Check(Next().As(kSystem));
  EXPECT_EQ(-5, reply.code);
  EXPECT_EQ((Lines{"sharinglogin:LINE db is not good", "sharinglogin:LINE db ownner is root"}),
            OwnLines(reply.log));
  EXPECT_TRUE(Exists(kDatabase));
  EXPECT_FALSE(Exists(kMovedDatabase));
}

}  // namespace
}  // namespace tuvo_test
