// Every call that changes the process's ids fails once.
#include <json/value.h>
#include <sys/stat.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <csignal>
#include <cstdio>
#include <functional>
#include <set>
#include <string>

#include "db/test_files.h"
#include "faults/every_call.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

// The ids of the process: what fails on the way there is a failure of the call, what fails on the
// way back is logged and leaves the process with the ids that it got stuck with.
class EveryIdentityCall : public EveryCall {
 protected:
  // Each in a process of its own, since ids may not come back.
  void SweepIdentity(const Visit& visit, const std::function<int()>& operation,
                     const std::set<int>& answers) {
    int outcome = kMore;
    int there = 0;
    int back = 0;
    int ended = 0;
    for (long number = 1; outcome != kDone && outcome != 253 && number < 1000; ++number) {
      outcome = RunInChild([&] {
        visit.EnterEnvironment();
        EXPECT_TRUE(SharingDB::Instance().IsGood());
        return OneFault(operation, answers, number);
      });
      there += outcome == kFailedThere ? 1 : 0;
      back += outcome == kFailedBack ? 1 : 0;
      ended += outcome == 256 + SIGABRT ? 1 : 0;
      EXPECT_TRUE(outcome == kFailedThere || outcome == kFailedBack || outcome == kDone ||
                  outcome == 256 + SIGABRT)
          << "call " << number << ": " << outcome;
    }
    EXPECT_LT(0, there);
    EXPECT_LT(0, back);
    ended_ = ended;
    std::printf("identity: %d on the way there, %d on the way back, %d ended the process\n", there,
                back, ended);
  }

  int ended_ = 0;

 private:
  enum Outcome { kMore = 20, kDone, kFailedThere, kFailedBack };

  static int OneFault(const std::function<int()>& operation, const std::set<int>& answers,
                      long number) {
    FailAt(kIdentity, number);
    const int answer = operation();
    const FaultKind fault = StopFailing();
    const Step step{number, fault, answer, TakeLogged()};
    EXPECT_EQ(1U, answers.count(answer)) << answer;
    const bool lost = step.Logged("ERROR: ~IF_RUN_AS(0, 0)");
    if (fault == kNoFault) {
      EXPECT_EQ(ToText(kRoot), ToText(CurrentIds()));
      return testing::Test::HasFailure() ? 253 : kDone;
    }
    if (!lost) {
      EXPECT_EQ(ToText(kRoot), ToText(CurrentIds()));
      const bool switch_logged =
          step.Logged("ERROR: IF_RUN_AS(1, 1)") && step.Logged("failed to run as system");
      // A connection is closed without it, and has nothing to say about that.
      EXPECT_TRUE(switch_logged || step.Logged("cannot become the system's user") || answer == 1);
    }
    EXPECT_EQ(1, operation()) << "the next one";
    return testing::Test::HasFailure() ? 253 : lost ? kFailedBack : kFailedThere;
  }
};

TEST_F(EveryIdentityCall, OfALogin) {
  const Visit visit = Visit(MakePasswordLink()).Password("sesame");
  SweepIdentity(visit,
                [&] {
                  std::string session_id;
                  return LogIn(visit, session_id);
                },
                {1, -3, -4});
  EXPECT_LT(0, ended_) << "auto-block ends a process that it cannot bring back";
}

// A file of root's would be closed to all other programs.
TEST_F(EveryIdentityCall, OfALoginMakesNoAutoBlockFileOfRoots) {
  const Visit visit = Visit(MakePasswordLink()).Password("wrong");
  SweepIdentity(visit,
                [&] {
                  std::remove(kAutoBlock);
                  std::string session_id;
                  const int answer = LogIn(visit, session_id);
                  struct stat st {};
                  if (stat(kAutoBlock, &st) == 0) {
                    EXPECT_EQ(1U, st.st_uid);
                  }
                  return answer == -9 ? 1 : answer;
                },
                {1, -3, -4});
}

TEST_F(EveryIdentityCall, OfACheck) {
  const std::string hash = MakeLink();
  const Visit visit = Visit(hash).Session(LoggedIn(Visit(hash)));
  SweepIdentity(visit, [&] { return Check(visit); }, {1, -4, -5, -7});
  EXPECT_EQ(0, ended_);
}

TEST_F(EveryIdentityCall, OfCountingAUse) {
  const std::string hash = MakeLink();
  SweepIdentity(Visit(), [&] { return TUVO::TuvoSharingIncreaseUseCount(hash) ? 1 : 0; }, {0, 1});
  EXPECT_EQ(0, ended_);
}

// There is nothing to commit; what gives the file back may fail as well, once: the test's own too.
TEST_F(EveryIdentityCall, OfCountingAUseOfALinkThatIsNotThere) {
  const std::string hash = MakeLink();
  SweepIdentity(Visit(),
                [&] {
                  const bool counted = TUVO::TuvoSharingIncreaseUseCount("nobodys");
                  SharingDB& db = SharingDB::Instance();
                  if (!db.Begin()) {
                    // Refused by a fault, which is fair, or because one is open still.
                    return db.GetLastError().find("within") == std::string::npos ? 1 : 2;
                  }
                  const bool ended = db.Execute("ROLLBACK") || db.Execute("ROLLBACK");
                  return !counted && ended ? 1 : 0;
                },
                {0, 1});
  EXPECT_EQ(0, ended_);
}

// What the connection said about a transaction that is over must not pass for what it says now.
TEST_F(EveryIdentityCall, OfCountingAfterATransactionOfTheCallers) {
  const std::string hash = MakeLink();
  InChild([&] {
    SharingDB& db = SharingDB::Instance();
    ASSERT_TRUE(db.Begin());
    ASSERT_TRUE(TUVO::TuvoSharingIncreaseUseCount(hash));
    ASSERT_FALSE(db.Begin());  // tells so, and nothing that succeeds takes that back
    ASSERT_TRUE(db.Commit());
    FailAt(kIdentity, 1);
    const bool counted = TUVO::TuvoSharingIncreaseUseCount(hash);
    EXPECT_NE(kNoFault, StopFailing());
    EXPECT_FALSE(counted);
  });
  EXPECT_EQ("1", Value("SELECT use_count FROM entry"));
}

TEST_F(EveryIdentityCall, OfCreatingALink) {
  SweepIdentity(Visit(),
                [&] {
                  Entry entry;
                  entry.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::objectValue);
                  return EntryDB(SharingDB::Instance()).CreateWithHash(entry) ? 1 : 0;
                },
                {1});
  EXPECT_EQ(0, ended_);
}

TEST_F(EveryIdentityCall, OfThePurges) {
  SweepIdentity(Visit(),
                [&] {
                  SharingDB& db = SharingDB::Instance();
                  return EntryDB(db).PurgeExpired(1) && SessionDB(db).PurgeExpired(1) &&
                                 TokenDB(db).PurgeExpired(1)
                             ? 1
                             : 0;
                },
                {0, 1});
  EXPECT_EQ(0, ended_);
}

TEST_F(EveryIdentityCall, OfAFirstOpen) {
  const std::string path = kPrivateFolder + std::string("first.db");
  SweepIdentity(Visit(),
                [&] {
                  NewPath(path);
                  return SharingDB(path).IsGood() ? 1 : 0;
                },
                {0, 1});
  EXPECT_EQ(0, ended_);
}

}  // namespace
}  // namespace tuvo_test
