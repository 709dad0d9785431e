// The end of a visitor's access to a link, and the counting of a link's uses.
#include <sys/wait.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <chrono>

#include "login/other_writer.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

constexpr char kExpiredSession[] =
    "session:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n";
constexpr char kExpiredToken[] = "token:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n";

bool NamesSharingLogin(const Lines& lines) {
  for (const std::string& line : lines) {
    if (line.find("sharinglogin") != std::string::npos) {
      return true;
    }
  }
  return false;
}

// What another process writes meanwhile.
constexpr char kChange[] = "UPDATE entry SET enabled = 0, use_count = 5";

class LinkLogout : public VisitTest {};
class UseCounting : public VisitTest {
 protected:
  std::string Count() { return Value("SELECT use_count FROM entry"); }
};

TEST_F(LinkLogout, RemovesTheTokenAndLeavesTheSession) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const auto link = Rows("SELECT * FROM entry");
  const auto session = Rows("SELECT * FROM session");
  const Reply reply = Logout(hash, id);
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ("0", Value("SELECT COUNT(*) FROM token"));
  EXPECT_EQ(session, Rows("SELECT * FROM session"));
  EXPECT_EQ(link, Rows("SELECT * FROM entry"));
  EXPECT_EQ(-7, Check(Visit(hash).Session(id)).code);
}

TEST_F(LinkLogout, LeavesTheVisitorsOtherLinksAndTheLinksOtherVisitors) {
  const std::string hash = MakeLink();
  const std::string other_link = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  LoggedIn(Visit(other_link).Session(id));
  const std::string other_visitor = LoggedIn(Visit(hash));
  EXPECT_EQ(1, Logout(hash, id).code);
  EXPECT_EQ(1, Check(Visit(other_link).Session(id)).code);
  EXPECT_EQ(1, Check(Visit(hash).Session(other_visitor)).code);
  EXPECT_EQ(-7, Check(Visit(hash).Session(id)).code);
}

TEST_F(LinkLogout, TheSecondTimeThereIsNoToken) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  EXPECT_EQ(1, Logout(hash, id).code);
  const Reply reply = Logout(hash, id);
  EXPECT_EQ(0, reply.code);
  EXPECT_EQ(Lines{"sharinglogin:LINE get token failed"}, reply.log);
}

TEST_F(LinkLogout, AVisitorCanComeBack) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  EXPECT_EQ(1, Logout(hash, id).code);
  EXPECT_EQ(id, LoggedIn(Visit(hash).Session(id)));
  EXPECT_EQ(1, Check(Visit(hash).Session(id)).code);
}

TEST_F(LinkLogout, OfAnUnknownSessionFails) {
  const std::string hash = MakeLink();
  LoggedIn(Visit(hash));
  for (const char* id : {"unknown", "", "x' OR '1'='1"}) {
    for (const std::string& link : {hash, std::string("unknown")}) {
      const Reply reply = Logout(link, id);
      EXPECT_EQ(0, reply.code);
      EXPECT_EQ(Lines{"sharinglogin:LINE get session failed"}, reply.log);
    }
  }
  EXPECT_EQ("1", Value("SELECT COUNT(*) FROM token"));
}

TEST_F(LinkLogout, FromAnUnknownLinkFails) {
  const std::string id = LoggedIn(Visit(MakeLink()));
  for (const char* hash : {"unknown", "", "x' OR '1'='1"}) {
    const Reply reply = Logout(hash, id);
    EXPECT_EQ(0, reply.code);
    EXPECT_EQ(Lines{"sharinglogin:LINE get entry failed"}, reply.log);
  }
  EXPECT_EQ("1", Value("SELECT COUNT(*) FROM token"));
}

// What has expired is as good as gone: there is nothing left to end.
TEST_F(LinkLogout, WhatHasExpiredIsNotFound) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  Change("UPDATE token SET timeout = 1000");
  Reply reply = Logout(hash, id);
  EXPECT_EQ(0, reply.code);
  EXPECT_EQ((Lines{kExpiredToken, "sharinglogin:LINE get token failed"}), reply.log);
  Change("UPDATE session SET timeout = 1000");
  reply = Logout(hash, id);
  EXPECT_EQ(0, reply.code);
  EXPECT_EQ((Lines{kExpiredSession, "sharinglogin:LINE get session failed"}), reply.log);
}

// A visitor may leave a link that was switched off, is over or is used up.
TEST_F(LinkLogout, FromALinkThatIsNotValidSucceeds) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  Change("UPDATE entry SET enabled = 0, expire_at = 1, expire_times = 1, use_count = 9");
  const Reply reply = Logout(hash, id);
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
}

TEST_F(LinkLogout, FailsWhenTheTokenCannotBeDeleted) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  Break("DELETE", "token");
  const Reply reply = Logout(hash, id);
  EXPECT_EQ(0, reply.code);
  EXPECT_EQ(Lines{"object_db:LINE (PID) delete failed\n"}, reply.log);
  EXPECT_EQ("1", Value("SELECT COUNT(*) FROM token"));
}

TEST_F(LinkLogout, NeedsNoAddress) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const Reply reply = Run(Visit().FromNowhere(),
                          [&](std::string&) { return TUVO::TuvoSharingLogout(hash, id) ? 1 : 0; });
  EXPECT_EQ(1, reply.code);
}

TEST_F(LinkLogout, WithoutAUsableDatabaseFailsSilently) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  Change("PRAGMA user_version = -1");  // no script leads on from there
  const Reply reply = Logout(hash, id);
  EXPECT_EQ(0, reply.code);
  EXPECT_FALSE(NamesSharingLogin(reply.log));
  EXPECT_EQ("1", Value("SELECT COUNT(*) FROM token"));
}

TEST_F(UseCounting, GrowsByOne) {
  const std::string hash = MakeLink();
  MakeLink();
  const Reply reply = CountUse(hash);
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(1, CountUse(hash).code);
  EXPECT_EQ((std::vector<TextRow>{{"2"}, {"0"}}), Rows("SELECT use_count FROM entry ORDER BY id"));
}

// The count waits for the other writer, and so must have read nothing before.
TEST_F(UseCounting, UndoesNothingThatIsWrittenMeanwhile) {
  const std::string hash = MakeLink();
  const pid_t writer = StartWriter(kChange);
  const Reply reply = CountUse(hash);
  int status = -1;
  EXPECT_EQ(writer, waitpid(writer, &status, 0));
  EXPECT_EQ(0, status);
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ((std::vector<TextRow>{{"0", "6"}}), Rows("SELECT enabled, use_count FROM entry"));
}

// Which waits ten seconds, and must not go on without it then.
TEST_F(UseCounting, FailsWhenTheFileStaysLocked) {
  const std::string hash = MakeLink();
  const pid_t writer = StartWriter(kChange, std::chrono::milliseconds(17000));
  EXPECT_EQ(0, CountUse(hash).code);
  int status = -1;
  EXPECT_EQ(writer, waitpid(writer, &status, 0));
  EXPECT_EQ("5", Count());
}

TEST_F(UseCounting, WithinATransactionOfTheCallersLeavesItOpen) {
  const std::string hash = MakeLink();
  const Reply reply = Run(Visit(), [&](std::string&) {
    TUVO::sharing::db::SharingDB& db = TUVO::sharing::db::SharingDB::Instance();
    const bool counted = db.Begin() && TUVO::TuvoSharingIncreaseUseCount(hash);
    return counted && db.Execute("ROLLBACK") ? 1 : 0;
  });
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ("0", Count());
}

TEST_F(UseCounting, OfAnUnknownLinkChangesNothing) {
  MakeLink();
  const auto before = Rows("SELECT * FROM entry");
  for (const char* hash : {"unknown", "", "x' OR '1'='1"}) {
    const Reply reply = CountUse(hash);
    EXPECT_EQ(0, reply.code);
    EXPECT_EQ(Lines{}, reply.log);
  }
  EXPECT_EQ(before, Rows("SELECT * FROM entry"));
}

// Refusing is the login's business.
TEST_F(UseCounting, KnowsNoLimit) {
  const std::string hash = MakeLink();
  Change("UPDATE entry SET enabled = 0, expire_at = 1, expire_times = 3, use_count = 3");
  EXPECT_EQ(1, CountUse(hash).code);
  EXPECT_EQ("4", Count());
}

TEST_F(UseCounting, StopsAtTheLargestNumber) {
  const std::string hash = MakeLink();
  Change("UPDATE entry SET use_count = 2147483646");
  EXPECT_EQ(1, CountUse(hash).code);
  EXPECT_EQ(1, CountUse(hash).code);
  EXPECT_EQ("2147483647", Count());
}

TEST_F(UseCounting, OfALinkThatIsNotLegalFails) {
  const std::string hash = MakeLink();
  Change("UPDATE entry SET project_name = ''");
  EXPECT_EQ(0, CountUse(hash).code);
  EXPECT_EQ("0", Count());
}

TEST_F(UseCounting, FailsWhenItCannotBeWritten) {
  const std::string hash = MakeLink();
  Break("UPDATE", "entry");
  const Reply reply = CountUse(hash);
  EXPECT_EQ(0, reply.code);
  EXPECT_EQ(Lines{"object_db:LINE (PID) update failed\n"}, reply.log);
  EXPECT_EQ("0", Count());
}

TEST_F(UseCounting, WithoutAUsableDatabaseFailsSilently) {
  const std::string hash = MakeLink();
  Change("PRAGMA user_version = -1");  // no script leads on from there
  const Reply reply = CountUse(hash);
  EXPECT_EQ(0, reply.code);
  EXPECT_FALSE(NamesSharingLogin(reply.log));
  EXPECT_EQ("0", Count());
}

}  // namespace
}  // namespace tuvo_test
