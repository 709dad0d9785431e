// A visitor's login to a link.
#include <sys/stat.h>
#include <sys/wait.h>
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <limits>
#include <set>
#include <vector>

#include "login/other_writer.h"
#include "login/platform_spy.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::record::Entry;

class LinkLogin : public VisitTest {
 protected:
  // A link that admits so many logins.
  std::string MakeLimitedLink(int uses, int used = 0) {
    return MakeLink([=](Entry& entry) { entry.set_expire_times(uses).set_use_count(used); });
  }

  std::string UseCount() { return Value("SELECT use_count FROM entry"); }
  std::string Sessions() { return Value("SELECT COUNT(*) FROM session"); }
  std::string Tokens() { return Value("SELECT COUNT(*) FROM token"); }

  void ExpectNotCounted(int code, const Reply& reply) {
    EXPECT_EQ(code, reply.code);
    EXPECT_EQ(kUntouched, reply.session_id);
    EXPECT_EQ("3", UseCount());
    EXPECT_EQ("0", Tokens());
  }

  // Waits for a process that is to end well.
  static void Join(pid_t process) {
    int status = -1;
    EXPECT_EQ(process, waitpid(process, &status, 0));
    EXPECT_EQ(0, status);
  }

  // Expects that the login was refused with `code` and left no trace in the database; how many
  // failed logins count afterwards is for each test to say.
  void ExpectRefused(int code, const Reply& reply) {
    EXPECT_EQ(code, reply.code);
    EXPECT_EQ(kUntouched, reply.session_id);
    EXPECT_EQ("0", UseCount());
    EXPECT_EQ("0", Sessions());
    EXPECT_EQ("0", Tokens());
  }
};

Visit AliceAt(const std::string& hash) {
  return Visit(hash).Account("alice", "alice-secret");
}

TEST_F(LinkLogin, MakesASessionAndATokenForOneDay) {
  const std::string hash = MakeLink();
  const std::time_t before = std::time(nullptr);
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(32U, reply.session_id.size());
  EXPECT_EQ(Lines{}, reply.log);
  const auto sessions = Rows("SELECT session_id, uid, ip, timeout, id FROM session");
  ASSERT_EQ(1U, sessions.size());
  EXPECT_EQ(reply.session_id, sessions[0][0]);
  EXPECT_EQ(kNoUser, sessions[0][1]);
  EXPECT_EQ(kAddress, sessions[0][2]);
  ExpectDayAfter(before, sessions[0][3]);
  const auto tokens = Rows("SELECT session_id, entry_id, timeout FROM token");
  ASSERT_EQ(1U, tokens.size());
  EXPECT_EQ(sessions[0][4], tokens[0][0]);
  EXPECT_EQ(Value("SELECT id FROM entry"), tokens[0][1]);
  ExpectDayAfter(before, tokens[0][2]);
}

TEST_F(LinkLogin, CountsOneUse) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  EXPECT_EQ("1", UseCount());
  LoggedIn(Visit(hash).Session(id));
  EXPECT_EQ("2", UseCount());
}

TEST_F(LinkLogin, ChangesNothingElseOfTheLink) {
  const std::string hash = MakePasswordLink();
  const std::string columns =
      "SELECT id, hash, project_name, enabled, owner_uid, start_at, expire_at, expire_times, "
      "auto_gc, data FROM entry";
  const auto before = Rows(columns);
  LoggedIn(Visit(hash).Password("sesame"));
  EXPECT_EQ(before, Rows(columns));
}

// An account's login takes its time, in which others may be counted, or the link changed.
TEST_F(LinkLogin, CountsTheUseOfTheLinkAsItIsThen) {
  const Visit visit = AliceAt(MakeAccountLink());
  Run(visit, [&](std::string& session_id) {
    Spy().at_login = [] {
      SqliteFile(kDatabase).Execute("UPDATE entry SET use_count = 5, expire_times = 9");
    };
    _tag_sharing_login_params params = visit.Params();
    EXPECT_EQ(1, TUVO::TuvoSharingLogin(session_id, &params, false));
    return 0;
  });
  EXPECT_EQ("6", UseCount());
  EXPECT_EQ("9", Value("SELECT expire_times FROM entry"));
}

// What a request must bring.

TEST_F(LinkLogin, WithoutParametersFails) {
  MakeLink();
  const Reply reply = Run(Visit(), [](std::string& session_id) {
    return TUVO::TuvoSharingLogin(session_id, nullptr, false);
  });
  ExpectRefused(-4, reply);
  EXPECT_EQ(Lines{}, reply.log);
}

// The first call makes the file, whatever it is given.
TEST_F(LinkLogin, OpensTheDatabaseEvenWithoutParameters) {
  ASSERT_FALSE(std::filesystem::exists(kDatabase));
  const Reply reply = Run(Visit(), [](std::string& session_id) {
    return TUVO::TuvoSharingLogin(session_id, nullptr, false);
  });
  EXPECT_EQ(-4, reply.code);
  EXPECT_TRUE(std::filesystem::exists(kDatabase));
}

TEST_F(LinkLogin, WithoutAHashFails) {
  MakeLink();
  const Visit visit;
  const Reply reply = Run(visit, [&](std::string& session_id) {
    Spy().calls.clear();
    _tag_sharing_login_params params = visit.Params();
    const int code = TUVO::TuvoSharingLogin(session_id, &params, false);
    EXPECT_EQ(Lines{}, Spy().calls);
    return code;
  });
  ExpectRefused(-4, reply);
  EXPECT_EQ(Lines{}, reply.log);
}

TEST_F(LinkLogin, WithoutAnAddressFails) {
  const std::string hash = MakeLink();
  for (const Visit& visit : {Visit(hash).FromNowhere(), Visit(hash).From("unknown"),
                             Visit("unknown-link").FromNowhere()}) {
    const Reply reply = Login(visit);
    ExpectRefused(-4, reply);
    EXPECT_EQ(Lines{}, reply.log);
  }
}

// Its name is for callers, who may read it.
TEST_F(LinkLogin, TheSharingHeaderIsNotRead) {
  const std::string hash = MakeLink();
  EXPECT_EQ(-4, Login(Visit().Environment("HTTP_X_TUVO_SHARING", hash)).code);
  EXPECT_EQ(-3, Login(Visit("unknown").Environment("HTTP_X_TUVO_SHARING", hash)).code);
}

TEST_F(LinkLogin, DoesNotBelieveForwardingHeaders) {
  const std::string hash = MakeLink();
  Visit visit(hash);
  visit.Environment("HTTP_X_FORWARDED_FOR", "203.0.113.9");
  LoggedIn(visit);
  EXPECT_EQ(kAddress, Value("SELECT ip FROM session"));
  EXPECT_EQ(-4, Login(visit.FromNowhere()).code);
}

TEST_F(LinkLogin, WithoutAUsableDatabaseFailsAndMovesNothing) {
  const std::string hash = MakeLink();
  Change("PRAGMA user_version = -1");  // no script leads on from there
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0666));
  const Reply reply = Login(Visit(hash));
  ExpectRefused(-4, reply);
  for (const std::string& line : reply.log) {
    EXPECT_NE(0U, line.find("sharinglogin")) << line;
  }
  struct stat status {};
  EXPECT_NE(0, stat(kMovedDatabase, &status));
}

// The address.

TEST_F(LinkLogin, RefusesADeniedAddress) {
  const std::string hash = MakeLink();
  FailLogins(10);
  for (const Visit& visit : {Visit(hash), Visit("unknown-link")}) {
    const Reply reply = Login(visit);
    ExpectRefused(-8, reply);
    EXPECT_EQ(Lines{"sharinglogin:LINE TuvoAutoBlockIsDeniedIP 192.0.2.1"}, reply.log);
  }
  EXPECT_EQ(-8, Login(Visit(hash), true).code);
  EXPECT_EQ(-4, Login(Visit()).code);
  EXPECT_EQ(1, Login(Visit(hash).From(kOtherAddress)).code);
}

TEST_F(LinkLogin, TenWrongPasswordsDenyTheAddress) {
  const std::string hash = MakePasswordLink();
  for (int i = 0; i < 10; ++i) {
    EXPECT_EQ(0, TuvoCgiIsDeniedIP(kAddress));
    EXPECT_EQ(-9, Login(Visit(hash).Password("wrong")).code);
  }
  EXPECT_EQ(1, TuvoCgiIsDeniedIP(kAddress));
  EXPECT_EQ(-8, Login(Visit(hash).Password("sesame")).code);
  EXPECT_EQ(1, Login(Visit(hash).Password("sesame").From(kOtherAddress)).code);
}

TEST_F(LinkLogin, OnlyTheAnswerOneDeniesTheAddress) {
  const std::string hash = MakeLink();
  const Visit visit(hash);
  for (const auto& [answer, code] : {std::pair{1, -8}, {0, 1}, {2, 1}, {-1, 1}}) {
    const Reply reply = Run(visit, [&, denied = answer](std::string& session_id) {
      Spy().failing = "TuvoCgiIsDeniedIP";
      Spy().answer = denied;
      _tag_sharing_login_params params = visit.Params();
      return TUVO::TuvoSharingLogin(session_id, &params, false);
    });
    EXPECT_EQ(code, reply.code) << answer;
  }
}

TEST_F(LinkLogin, ADeniedAddressIsCountedNoFurther) {
  FailLogins(3);
  const Visit visit(MakeLink());
  const Reply reply = Run(visit, [&](std::string& session_id) {
    Spy().failing = "TuvoCgiIsDeniedIP";  // the service itself counts no address that it denies
    Spy().answer = 1;
    _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingLogin(session_id, &params, false);
  });
  EXPECT_EQ(-8, reply.code);
  EXPECT_EQ(3, FailedLogins());
}

TEST_F(LinkLogin, AsksForTheAddressItself) {
  const Visit visit = Visit(MakeLink()).From("2001:DB8:0::1");
  Run(visit, [&](std::string& session_id) {
    Spy().calls.clear();
    _tag_sharing_login_params params = visit.Params();
    EXPECT_EQ(1, TUVO::TuvoSharingLogin(session_id, &params, false));
    // Once for the deny list, and once more for the session.
    EXPECT_EQ((Lines{"TuvoCgiGetRemoteIP", "TuvoCgiIsDeniedIP 2001:db8::1", "TuvoCgiGetRemoteIP"}),
              Spy().calls);
    return 0;
  });
}

// Nobody is kept out because the service that could tell is broken.
TEST_F(LinkLogin, GoesOnWhenItCannotBeToldWhetherTheAddressIsDenied) {
  const std::string hash = MakeLink();
  std::ofstream(kAutoBlock) << std::string(4096, 'x');
  ASSERT_EQ(0, chown(kAutoBlock, 1, 1));
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(2U, reply.log.size());  // asking and clearing
  for (const std::string& line : reply.log) {
    EXPECT_EQ(0U, line.find("auto_block:LINE ")) << line;
  }
}

TEST_F(LinkLogin, AFailureThatCannotBeCountedIsToldAllTheSame) {
  const std::string hash = MakePasswordLink();
  std::ofstream(kAutoBlock) << std::string(4096, 'x');
  ASSERT_EQ(0, chown(kAutoBlock, 1, 1));
  ExpectRefused(-9, Login(Visit(hash).Password("wrong")));
}

// The link.

TEST_F(LinkLogin, RefusesAnUnknownLink) {
  MakeLink();
  const std::string unknown[] = {"unknown", "", "x' OR '1'='1", "'; DELETE FROM entry; --", "%"};
  for (const std::string& hash : unknown) {
    const Reply reply = Login(Visit(hash).Password("p").Account("alice", "alice-secret"));
    ExpectRefused(-3, reply);
    EXPECT_EQ(Lines{}, reply.log);
  }
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(LinkLogin, RefusesALinkThatIsNotValid) {
  const std::string hash = MakeLink();
  const std::pair<const char*, const char*> broken[] = {
      {"enabled = 0", "! enabled_"},
      {"enabled = 1, start_at = 2147483647", "0 < start_at_ && start_at_ > timeNow"},
      {"start_at = 0, expire_at = 1", "0 < expire_at_ && timeNow > expire_at_"},
      {"expire_at = 0, expire_times = -1, project_name = ''", "\"\" == project_name_"},
  };
  for (const auto& [change, reason] : broken) {
    Change(std::string("UPDATE entry SET ") + change);
    const Reply reply = Login(Visit(hash));
    ExpectRefused(-3, reply);
    EXPECT_EQ(Lines{std::string("entry:LINE (PID) Failed [") + reason + "], err=ERRNO\n\n"},
              reply.log);
  }
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(LinkLogin, RefusesALinkThatIsUsedUpWithoutCountingAFailure) {
  const std::string hash = MakeLimitedLink(3, 3);
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(-11, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ("3", UseCount());
  EXPECT_EQ("0", Sessions());
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(LinkLogin, ALinkUsedMoreThanItsLimitIsNotEvenValid) {
  const std::string hash = MakeLimitedLink(3, 4);
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(-3, reply.code);
  EXPECT_EQ(Lines{"entry:LINE (PID) Failed [0 < expire_times_ && use_count_ > expire_times_], "
                  "err=ERRNO\n\n"},
            reply.log);
}

TEST_F(LinkLogin, ALimitOfThreeAdmitsExactlyThreeLogins) {
  const std::string hash = MakeLimitedLink(3);
  const std::string id = LoggedIn(Visit(hash));
  EXPECT_EQ(1, Login(Visit(hash).Session(id)).code);
  EXPECT_EQ(1, Login(Visit(hash)).code);
  EXPECT_EQ(-11, Login(Visit(hash)).code);
  EXPECT_EQ(-11, Login(Visit(hash).Session(id)).code);
  EXPECT_EQ("3", UseCount());
}

// The link is read before the other visitor's use is there; the login then waits for the file, and
// must see it when it counts.
TEST_F(LinkLogin, WhoLosesTheLastUseToAnotherIsToldAsIfHeCameAfterwards) {
  const std::string hash = MakeLimitedLink(3, 2);
  const pid_t other = StartWriter("UPDATE entry SET use_count = 3");
  const Reply reply = Login(Visit(hash));
  Join(other);
  EXPECT_EQ(-11, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ("3", UseCount());
  EXPECT_EQ("0", Sessions());
  EXPECT_EQ("0", Tokens());
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(LinkLogin, TheLimitIsTheOneOfTheMomentOfCounting) {
  const std::string hash = MakeLimitedLink(3, 2);
  const pid_t owner = StartWriter("UPDATE entry SET use_count = 3, expire_times = 4");
  EXPECT_EQ(1, Login(Visit(hash)).code);
  Join(owner);
  EXPECT_EQ((std::vector<TextRow>{{"4", "4"}}), Rows("SELECT use_count, expire_times FROM entry"));
}

TEST_F(LinkLogin, ALinkThatIsUsedMoreThanItsNewLimitIsNotEvenValidWhenTheUseIsCounted) {
  const std::string hash = MakeLimitedLink(4, 3);
  const pid_t owner = StartWriter("UPDATE entry SET expire_times = 2");
  const Reply reply = Login(Visit(hash));
  Join(owner);
  ExpectNotCounted(-3, reply);
  EXPECT_EQ(Lines{"entry:LINE (PID) Failed [0 < expire_times_ && use_count_ > expire_times_], "
                  "err=ERRNO\n\n"},
            reply.log);
}

// The owner's change is written while the login has the link's former protection behind it.
TEST_F(LinkLogin, WhoIsLetInByALinkThatIsChangedMeanwhileIsJudgedByTheNewOne) {
  const std::pair<const char*, int> changes[] = {
      {"UPDATE entry SET enabled = 0", -3},
      {"UPDATE entry SET start_at = 2147483647", -3},
      {"UPDATE entry SET expire_at = 1", -3},
      {"UPDATE entry SET data = replace(data, '\"protect_password\":\"', "
       "'\"protect_password\":\"f')",
       -9},
      {"DELETE FROM entry", -3},
      {"UPDATE entry SET project_name = ''", -3},
      {"UPDATE entry SET data = '{'", -3},
      {"UPDATE entry SET id = id + 100", 1},
      {"UPDATE entry SET auto_gc = 1, owner_uid = 2002", 1},
  };
  for (const auto& [change, code] : changes) {
    const std::string hash = MakePasswordLink();
    const pid_t owner = StartWriter(change);
    const Reply reply = Login(Visit(hash).Password("sesame"), true);
    Join(owner);
    EXPECT_EQ(code, reply.code) << change;
    EXPECT_EQ(std::to_string(code == 1 ? 1 : 0), Tokens()) << change;
    Change("DELETE FROM token");
    Change("DELETE FROM entry");
  }
}

TEST_F(LinkLogin, WhoIsListedNoMoreWhenTheUseIsCountedIsRefused) {
  for (const char* const list : {"uids", "gids"}) {
    const Visit visit = AliceAt(MakeLink([list](Entry& entry) {
      entry.set_protect_type(Entry::PROTECT_USER);
      if (list == std::string("uids")) {
        entry.set_protect_uids({kAlice, kBob});
      } else {
        entry.set_protect_gids({kFriends});
      }
    }));
    Run(visit, [&](std::string& session_id) {
      Spy().at_login = [list] {
        SqliteFile(kDatabase).Execute("UPDATE entry SET data = json_set(data, '$.protect_" +
                                      std::string(list) + "', json('[2002]'))");
      };
      _tag_sharing_login_params params = visit.Params();
      EXPECT_EQ(-10, TUVO::TuvoSharingLogin(session_id, &params, true)) << list;
      return 0;
    });
    EXPECT_EQ("0", UseCount());
    EXPECT_EQ("0", Tokens());
    Change("DELETE FROM entry");
  }
}

// The counting gives up after ten seconds, and what is decided then is decided behind the other.
TEST_F(LinkLogin, ALimitHoldsWhenTheFileStaysLocked) {
  const std::string hash = MakeLimitedLink(3, 1);
  const pid_t other =
      StartWriter("UPDATE entry SET use_count = 2", std::chrono::milliseconds(11000));
  const Reply reply = Login(Visit(hash));
  Join(other);
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ("3", UseCount());
}

TEST_F(LinkLogin, ALimitHoldsForLoginsWithinTransactionsOfTheCallers) {
  const std::string hash = MakeLimitedLink(5);
  std::vector<pid_t> visitors;
  for (int visitor = 0; visitor < 8; ++visitor) {
    visitors.push_back(fork());
    if (visitors.back() == 0) {
      const Visit visit(hash);
      visit.EnterEnvironment();
      TUVO::sharing::db::SharingDB& db = TUVO::sharing::db::SharingDB::Instance();
      bool as_wanted = true;
      for (int login = 0; login < 5; ++login) {
        _tag_sharing_login_params params = visit.Params();
        std::string session_id;
        as_wanted = db.Begin() && as_wanted;
        const int code = TUVO::TuvoSharingLogin(session_id, &params, true);
        as_wanted = (code == 1 || code == -11) && db.Commit() && as_wanted;
      }
      _exit(as_wanted ? 0 : 1);
    }
  }
  for (const pid_t visitor : visitors) {
    Join(visitor);
  }
  EXPECT_EQ("5", UseCount());
  EXPECT_EQ("5", Tokens());
}

// Another link may have taken the hash of one that was deleted.
TEST_F(LinkLogin, ALinkWithAnotherProtectionIsAskedAboutAnew) {
  const std::string hash = MakeLink();
  const std::string other = MakePasswordLink();
  const pid_t owner =
      StartWriter("DELETE FROM entry WHERE hash = '" + hash + "'; UPDATE entry SET hash = '" +
                  hash + "' WHERE hash = '" + other + "'");
  const Reply reply = Login(Visit(hash).Password("wrong"));
  Join(owner);
  EXPECT_EQ(-9, reply.code);
  EXPECT_EQ("0", Value("SELECT SUM(use_count) FROM entry"));
  EXPECT_EQ(1, FailedLogins());
}

// Two programs may log one session in at the same time.
TEST_F(LinkLogin, OneSessionHasOneTokenHoweverManyOfItsLoginsGoOnAtOnce) {
  const std::string id = LoggedIn(Visit(MakeLink()));
  const std::string hash = MakeLink();
  std::vector<pid_t> visitors;
  for (int visitor = 0; visitor < 8; ++visitor) {
    visitors.push_back(fork());
    if (visitors.back() == 0) {
      const Visit visit = Visit(hash).Session(id);
      visit.EnterEnvironment();
      _tag_sharing_login_params params = visit.Params();
      std::string session_id;
      _exit(TUVO::TuvoSharingLogin(session_id, &params, true) == 1 ? 0 : 1);
    }
  }
  for (const pid_t visitor : visitors) {
    Join(visitor);
  }
  EXPECT_EQ("2", Tokens());
  EXPECT_EQ(1, Check(Visit(hash).Session(id)).code);
  EXPECT_EQ(1, Logout(hash, id).code);
  EXPECT_EQ(-7, Check(Visit(hash).Session(id)).code);
}

TEST_F(LinkLogin, WithoutALimitUsesDoNotMatter) {
  for (const int none : {0, -1}) {
    EXPECT_EQ(1, Login(Visit(MakeLimitedLink(none, 1000))).code);
  }
}

// A visitor learns nothing about the password of a link that is used up, nor whether a link that is
// not valid is used up.
TEST_F(LinkLogin, TheLimitComesBeforeTheProtectionAndAfterTheValidity) {
  const std::string hash = MakePasswordLink();
  Change("UPDATE entry SET expire_times = 3, use_count = 3");
  EXPECT_EQ(-11, Login(Visit(hash).Password("wrong")).code);
  EXPECT_EQ(-11, Login(Visit(hash)).code);
  EXPECT_EQ(0, FailedLogins());
  Change("UPDATE entry SET enabled = 0");
  EXPECT_EQ(-3, Login(Visit(hash).Password("wrong")).code);
}

// The link's password.

TEST_F(LinkLogin, AdmitsWithTheLinksPassword) {
  const std::string hash = MakePasswordLink();
  EXPECT_EQ(1, Login(Visit(hash).Password("sesame")).code);
  EXPECT_EQ(kNoUser, Value("SELECT uid FROM session"));
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(LinkLogin, AWrongPasswordIsRefusedAndCounted) {
  const std::string hash = MakePasswordLink();
  int failures = 0;
  for (const char* password : {"wrong", "", "Sesame", "sesame ", "sesam"}) {
    const Reply reply = Login(Visit(hash).Password(password));
    ExpectRefused(-9, reply);
    EXPECT_EQ(Lines{}, reply.log);
    EXPECT_EQ(++failures, FailedLogins());
  }
}

TEST_F(LinkLogin, AMissingPasswordIsRefusedAndCounted) {
  const std::string hash = MakePasswordLink();
  const Reply reply = Login(AliceAt(hash));
  ExpectRefused(-3, reply);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(1, FailedLogins());
}

TEST_F(LinkLogin, KnowsBothWaysOfKeepingAPassword) {
  const std::string hash = MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_PASSWORD);
    entry.set_protect_password("sesame", true, Entry::ENCRYPT_ALGO_MD5);
  });
  EXPECT_EQ(-9, Login(Visit(hash).Password("wrong")).code);
  EXPECT_EQ(-9, Login(Visit(hash).Password("")).code);
  EXPECT_EQ(1, Login(Visit(hash).Password("sesame")).code);
}

TEST_F(LinkLogin, AnOpenLinkAsksForNothing) {
  const std::string hash = MakeLink();
  EXPECT_EQ(1, Login(Visit(hash).Password("any").Account("nobody-such", "any")).code);
  EXPECT_EQ(kNoUser, Value("SELECT uid FROM session"));
}

// The account.

TEST_F(LinkLogin, AdmitsAListedAccountAndNotesIt) {
  const std::string hash = MakeAccountLink();
  const Reply reply = Login(AliceAt(hash));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(std::to_string(kAlice), Value("SELECT uid FROM session"));
}

TEST_F(LinkLogin, AdmitsAMemberOfAListedGroup) {
  const std::string hash = MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_USER).set_protect_groups({"administrators"});
  });
  EXPECT_EQ(1, Login(Visit(hash).Account("carol", "carol-secret")).code);
  EXPECT_EQ(std::to_string(kCarol), Value("SELECT uid FROM session"));
  EXPECT_EQ(-10, Login(AliceAt(hash)).code);
}

TEST_F(LinkLogin, AnAccountThatCannotLogInIsRefusedAndCounted) {
  const std::string hash = MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_USER).set_protect_users({"alice", "dave"});
  });
  const Visit refused[] = {
      Visit(hash).Account("alice", "wrong"),
      Visit(hash).AccountName("alice"),
      Visit(hash).Password("alice-secret").AccountName("alice"),
      Visit(hash).Account("nobody-such", "alice-secret"),
      Visit(hash).Account("dave", "dave-secret"),
      Visit(hash).Account("", ""),
  };
  int failures = 0;
  for (const Visit& visit : refused) {
    const Reply reply = Login(visit);
    ExpectRefused(-2, reply);
    EXPECT_EQ(Lines{}, reply.log);
    EXPECT_EQ(++failures, FailedLogins());
  }
}

TEST_F(LinkLogin, AnAccountThatIsNotListedIsRefusedAndCounted) {
  const std::string hash = MakeAccountLink();
  const Reply reply = Login(Visit(hash).Account("bob", "bob-secret"));
  ExpectRefused(-10, reply);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(1, FailedLogins());
}

TEST_F(LinkLogin, WithoutAnAccountIsRefusedAndCounted) {
  const std::string hash = MakeAccountLink();
  ExpectRefused(-3, Login(Visit(hash)));
  ExpectRefused(-3, Login(Visit(hash).Password("alice-secret")));
  EXPECT_EQ(2, FailedLogins());
}

// A login is a proof of its own; who a session belonged to is none.
TEST_F(LinkLogin, ASessionOfAnAccountDoesNotReplaceTheLogin) {
  const std::string hash = MakeAccountLink();
  const std::string id = LoggedIn(AliceAt(hash));
  EXPECT_EQ(-3, Login(Visit(hash).Session(id)).code);
}

TEST_F(LinkLogin, ARequestThatCannotBeReadIsRefusedAndCounted) {
  const std::string hash = MakeAccountLink();
  ExpectRefused(-3, Login(AliceAt(hash)
                              .Environment("REQUEST_METHOD", "POST")
                              .Environment("CONTENT_LENGTH", "no number")));
  ExpectRefused(-3, Login(AliceAt(hash).Query("_sid=a%3Bb")));
  EXPECT_EQ(2, FailedLogins());
}

// The count of failed logins.

TEST_F(LinkLogin, ASuccessClearsTheCount) {
  const std::string hash = MakeLink();
  FailLogins(9);
  FailLogins(2, kOtherAddress);
  EXPECT_EQ(1, Login(Visit(hash)).code);
  EXPECT_EQ(0, FailedLogins());
  EXPECT_EQ(2, FailedLogins(kOtherAddress));
}

TEST_F(LinkLogin, ASuccessThatSkipsTheAutoBlockLeavesTheCount) {
  const std::string hash = MakeLink();
  FailLogins(9);
  EXPECT_EQ(1, Login(Visit(hash), true).code);
  EXPECT_EQ(9, FailedLogins());
}

TEST_F(LinkLogin, SkippingTheAutoBlockSparesOnlyAnAccountThatIsNotListed) {
  const std::string accounts = MakeAccountLink();
  const std::string password = MakePasswordLink();
  EXPECT_EQ(-10, Login(Visit(accounts).Account("bob", "bob-secret"), true).code);
  EXPECT_EQ(0, FailedLogins());
  EXPECT_EQ(-2, Login(Visit(accounts).Account("bob", "wrong"), true).code);
  EXPECT_EQ(1, FailedLogins());
  EXPECT_EQ(-3, Login(Visit(accounts), true).code);
  EXPECT_EQ(2, FailedLogins());
  EXPECT_EQ(-9, Login(Visit(password).Password("wrong"), true).code);
  EXPECT_EQ(3, FailedLogins());
  EXPECT_EQ(-3, Login(Visit(password), true).code);
  EXPECT_EQ(4, FailedLogins());
}

// The session.

TEST_F(LinkLogin, ASessionThatIsNotKnownIsReplaced) {
  const std::string hash = MakeLink();
  std::set<std::string> ids;
  for (const char* unknown : {"unknown", "", "x' OR '1'='1"}) {
    const Reply reply = Login(Visit(hash).Session(unknown));
    EXPECT_EQ(1, reply.code);
    EXPECT_EQ(32U, reply.session_id.size());
    EXPECT_EQ(Lines{}, reply.log);
    ids.insert(reply.session_id);
  }
  EXPECT_EQ(3U, ids.size());
  EXPECT_EQ("3", Sessions());
}

TEST_F(LinkLogin, AKnownSessionIsRenewedAndTakesTheNewAddress) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const std::string soon = std::to_string(std::time(nullptr) + 60);
  Change("UPDATE session SET timeout = " + soon);
  Change("UPDATE token SET timeout = " + soon);
  const auto before = Rows("SELECT session.id, uid, token.id FROM session, token");
  const std::time_t now = std::time(nullptr);
  const Reply reply = Login(Visit(hash).Session(id).From(kOtherAddress));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(id, reply.session_id);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ(before, Rows("SELECT session.id, uid, token.id FROM session, token"));
  EXPECT_EQ(kOtherAddress, Value("SELECT ip FROM session"));
  ExpectDayAfter(now, Value("SELECT timeout FROM session"));
  ExpectDayAfter(now, Value("SELECT timeout FROM token"));
}

TEST_F(LinkLogin, OneSessionServesManyLinks) {
  const std::string first = MakeLink();
  const std::string second = MakeLink();
  const std::string id = LoggedIn(Visit(first));
  EXPECT_EQ(id, LoggedIn(Visit(second).Session(id)));
  EXPECT_EQ("1", Sessions());
  EXPECT_EQ("2", Value("SELECT COUNT(DISTINCT entry_id) FROM token"));
}

TEST_F(LinkLogin, ASessionKeepsItsAccountUntilAnotherLogsIn) {
  const std::string accounts = MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_USER).set_protect_users({"alice", "bob"});
  });
  const std::string id = LoggedIn(AliceAt(accounts));
  LoggedIn(Visit(MakeLink()).Session(id));
  LoggedIn(Visit(MakePasswordLink()).Session(id).Password("sesame"));
  EXPECT_EQ(std::to_string(kAlice), Value("SELECT uid FROM session"));
  LoggedIn(Visit(accounts).Account("bob", "bob-secret").Session(id));
  EXPECT_EQ(std::to_string(kBob), Value("SELECT uid FROM session"));
  EXPECT_EQ("1", Sessions());
}

// Its identifier may have leaked since.
TEST_F(LinkLogin, AnExpiredSessionIsReplacedByOneThatTakesNothingOver) {
  const std::string id = LoggedIn(AliceAt(MakeAccountLink()).From(kOtherAddress));
  Change("UPDATE session SET timeout = 1000");
  const auto old_session = Rows("SELECT * FROM session");
  const auto old_token = Rows("SELECT * FROM token");
  const Reply reply = Login(Visit(MakeLink()).Session(id));
  EXPECT_EQ(1, reply.code);
  EXPECT_NE(id, reply.session_id);
  EXPECT_EQ(Lines{"session:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n"}, reply.log);
  EXPECT_EQ(old_session, Rows("SELECT * FROM session WHERE session_id = '" + id + "'"));
  EXPECT_EQ(old_token, Rows("SELECT * FROM token WHERE session_id = " + old_session[0][0]));
  EXPECT_EQ((std::vector<TextRow>{{kNoUser, kAddress}}),
            Rows("SELECT uid, ip FROM session WHERE session_id = '" + reply.session_id + "'"));
}

TEST_F(LinkLogin, AnExpiredTokenIsRenewedNotDoubled) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const std::string token = Value("SELECT id FROM token");
  Change("UPDATE token SET timeout = 1000");
  const std::time_t before = std::time(nullptr);
  const Reply reply = Login(Visit(hash).Session(id));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(id, reply.session_id);
  EXPECT_EQ(Lines{"token:LINE (PID) Failed [time(NULL) >= timeout_], err=ERRNO\n\n"}, reply.log);
  EXPECT_EQ("1", Tokens());
  EXPECT_EQ(token, Value("SELECT id FROM token"));
  ExpectDayAfter(before, Value("SELECT timeout FROM token"));
  EXPECT_EQ(1, Check(Visit(hash).Session(id)).code);
}

// Both lives begin when they are written down, not when the request came.
TEST_F(LinkLogin, TheClockIsReadForTheSessionAndAgainForTheToken) {
  const std::string hash = MakeLink();
  const auto log_in = [&](const Visit& visit) {
    const std::time_t begin = std::time(nullptr);
    const Reply reply = Run(visit, [&](std::string& session_id) {
      Spy().now = begin;
      Spy().step = 10;
      _tag_sharing_login_params params = visit.Params();
      EXPECT_EQ(1, TUVO::TuvoSharingLogin(session_id, &params, false));
      return 0;
    });
    const long session = std::stol(Value("SELECT timeout FROM session"));
    const long token = std::stol(Value("SELECT timeout FROM token"));
    EXPECT_GE(session, begin + kDay);
    EXPECT_GT(token, session);
    EXPECT_EQ(0, (session - begin - kDay) % 10);
    EXPECT_EQ(0, (token - begin - kDay) % 10);
    return reply.session_id;
  };
  const std::string id = log_in(Visit(hash));
  EXPECT_EQ(id, log_in(Visit(hash).Session(id)));  // renews both
  EXPECT_EQ("1", Tokens());
}

// Times end in 2038 where they have 32 bits; a day that would begin anew at the other end would
// let nobody in.
TEST_F(LinkLogin, TheLastDayOfAllEndsWithTheTimes) {
  const std::string hash = MakeLink();
  constexpr long kLast = std::numeric_limits<long>::max();
  const Visit visit(hash);
  Run(visit, [&](std::string& session_id) {
    Spy().now = kLast - kDay + 1;
    _tag_sharing_login_params params = visit.Params();
    EXPECT_EQ(1, TUVO::TuvoSharingLogin(session_id, &params, true));
    return 0;
  });
  EXPECT_EQ(std::to_string(kLast), Value("SELECT timeout FROM session"));
  EXPECT_EQ(std::to_string(kLast), Value("SELECT timeout FROM token"));
}

// What cannot be written.

TEST_F(LinkLogin, GoesOnWhenTheUseCannotBeCounted) {
  const std::string hash = MakeLink();
  Break("UPDATE", "entry");
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ((Lines{"object_db:LINE (PID) update failed\n",
                   "sharinglogin:LINE update entry use count fail"}),
            reply.log);
  EXPECT_EQ("0", UseCount());
}

TEST_F(LinkLogin, FailsWithoutANewSessionAndKeepsTheCountedUse) {
  const std::string hash = MakeLink();
  Break("INSERT", "session");
  FailLogins(3);
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines(51, "object_db:LINE (PID) insert failed\n"), reply.log);
  EXPECT_EQ("1", UseCount());
  EXPECT_EQ("0", Sessions());
  EXPECT_EQ("0", Tokens());
  EXPECT_EQ(3, FailedLogins());  // neither cleared nor counted
}

TEST_F(LinkLogin, FailsWithoutANewToken) {
  const std::string hash = MakeLink();
  Break("INSERT", "token");
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{"object_db:LINE (PID) insert failed\n"}, reply.log);
  EXPECT_EQ("1", UseCount());
  EXPECT_EQ("0", Tokens());
}

TEST_F(LinkLogin, TakesATokenBackThatCannotBeRenewed) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const std::string other = LoggedIn(Visit(hash));
  Break("UPDATE", "token");
  const auto sessions = Rows("SELECT * FROM session");
  const Reply reply = Login(Visit(hash).Session(id).From(kOtherAddress));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{"object_db:LINE (PID) update failed\n"}, reply.log);
  EXPECT_EQ("3", UseCount());
  EXPECT_EQ(sessions, Rows("SELECT * FROM session")) << "it is written after the token";
  EXPECT_EQ(Rows("SELECT id FROM session WHERE session_id = '" + other + "'"),
            Rows("SELECT session_id FROM token"));
}

TEST_F(LinkLogin, TakesTheTokenBackWhenTheSessionCannotBeWritten) {
  const std::string hash = MakeAccountLink();
  Break("UPDATE", "session");
  FailLogins(3);
  const Reply reply = Login(AliceAt(hash));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{"object_db:LINE (PID) update failed\n"}, reply.log);
  EXPECT_EQ("1", UseCount());
  EXPECT_EQ("0", Tokens());
  EXPECT_EQ("1", Sessions());
  EXPECT_EQ(kNoUser, Value("SELECT uid FROM session"));
  EXPECT_EQ(3, FailedLogins());
}

TEST_F(LinkLogin, TakesTheTokenBackWhenAKnownSessionCannotBeWritten) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const auto sessions = Rows("SELECT * FROM session");
  Break("UPDATE", "session");
  const Reply reply = Login(Visit(hash).Session(id).From(kOtherAddress));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{"object_db:LINE (PID) update failed\n"}, reply.log);
  EXPECT_EQ("0", Tokens());
  EXPECT_EQ(sessions, Rows("SELECT * FROM session"));
}

TEST_F(LinkLogin, FailsAlsoWhenTheTokenCannotBeTakenBack) {
  const std::string hash = MakeLink();
  Break("UPDATE", "session");
  Break("DELETE", "token");
  const Reply reply = Login(Visit(hash));
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ((Lines{"object_db:LINE (PID) update failed\n", "object_db:LINE (PID) delete failed\n"}),
            reply.log);
}

// The address is asked for a second time once the use is counted.
TEST_F(LinkLogin, FailsWhenTheAddressIsLostOnTheWay) {
  const std::string hash = MakeLink();
  const Visit visit(hash);
  const Reply reply = Run(visit, [&](std::string& session_id) {
    Spy().failing = "TuvoCgiGetRemoteIP";
    Spy().successes = 1;
    _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingLogin(session_id, &params, false);
  });
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ(kUntouched, reply.session_id);
  EXPECT_EQ(Lines{}, reply.log);
  EXPECT_EQ("1", UseCount());
  EXPECT_EQ("0", Sessions());
}

TEST_F(LinkLogin, AnExceptionEndsInsideTheLibrary) {
  const Visit visit(MakeLink());
  for (const int successes : {0, 1}) {
    const Reply reply = Run(visit, [&](std::string& session_id) {
      Spy().failing = "TuvoCgiGetRemoteIP";
      Spy().successes = successes;
      Spy().throws = true;
      _tag_sharing_login_params params = visit.Params();
      return TUVO::TuvoSharingLogin(session_id, &params, false);
    });
    EXPECT_EQ(-4, reply.code);
    EXPECT_EQ(kUntouched, reply.session_id);
  }
}

TEST_F(LinkLogin, AVisitStartsNoThread) {
  const Visit visit(MakeLink());
  Run(visit, [&](std::string& session_id) {
    _tag_sharing_login_params params = visit.Params();
    EXPECT_EQ(1, TUVO::TuvoSharingLogin(session_id, &params, false));
    params.sharing_sid = session_id.c_str();
    EXPECT_EQ(1, TUVO::TuvoSharingIsAuthorized(&params));
    EXPECT_TRUE(TUVO::TuvoSharingLogout(params.sharing_id, session_id));
    const std::filesystem::directory_iterator threads("/proc/self/task");
    EXPECT_EQ(1, std::distance(begin(threads), end(threads)));
    EXPECT_EQ(0, Spy().threads);  // nor one that ended again
    return 0;
  });
}

TEST_F(LinkLogin, LeavesTheParametersAsTheyWere) {
  const Visit visit = AliceAt(MakeAccountLink()).Password("sesame").Session("unknown");
  const auto expect_only_read = [](const Visit& brought, const auto& operation) {
    const Visit copy = brought;
    _tag_sharing_login_params params = brought.Params();
    const _tag_sharing_login_params pointers = params;
    EXPECT_EQ(1, operation(params));
    EXPECT_EQ(0, std::memcmp(&pointers, &params, sizeof params));
    EXPECT_STREQ(copy.Params().sharing_id, params.sharing_id);
    EXPECT_STREQ(copy.Params().password, params.password);
    EXPECT_STREQ(copy.Params().zor_username, params.zor_username);
    EXPECT_STREQ(copy.Params().zor_password, params.zor_password);
    EXPECT_STREQ(copy.Params().sharing_sid, params.sharing_sid);
  };
  Run(visit, [&](std::string& session_id) {
    expect_only_read(visit, [&](_tag_sharing_login_params& params) {
      return TUVO::TuvoSharingLogin(session_id, &params, false);
    });
    expect_only_read(Visit(visit).Session(session_id), [](const _tag_sharing_login_params& params) {
      return TUVO::TuvoSharingIsAuthorized(&params);
    });
    return 0;
  });
}

TEST_F(LinkLogin, TextsOfAnyLengthAreTaken) {
  const std::string hash = MakePasswordLink();
  const std::string longest(900000, '\'');
  EXPECT_EQ(-3, Login(Visit(longest)).code);
  EXPECT_EQ(-9, Login(Visit(hash).Password(longest)).code);
  EXPECT_EQ(1, Login(Visit(hash).Password("sesame").Session(longest)).code);
}

// Logs in again and again; how often it succeeded.
int SuccessfulLogins(const Visit& visit, int logins) {
  visit.EnterEnvironment();
  int successes = 0;
  for (int i = 0; i < logins; ++i) {
    std::string session_id;
    _tag_sharing_login_params params = visit.Params();
    successes += TUVO::TuvoSharingLogin(session_id, &params, false) == 1 ? 1 : 0;
  }
  return successes;
}

TEST_F(LinkLogin, ManyVisitorsAtTheSameMomentAllGetIn) {
  const Visit visit(MakeLink());
  constexpr int kVisitors = 6;
  constexpr int kLogins = 5;
  for (int i = 0; i < kVisitors; ++i) {
    if (fork() == 0) {
      std::exit(SuccessfulLogins(visit, kLogins));
    }
  }
  for (int i = 0; i < kVisitors; ++i) {
    int status = 0;
    ASSERT_LT(0, wait(&status));
    EXPECT_TRUE(WIFEXITED(status));
    EXPECT_EQ(kLogins, WEXITSTATUS(status));
  }
  EXPECT_EQ(std::to_string(kVisitors * kLogins), Sessions());
  EXPECT_EQ(std::to_string(kVisitors * kLogins), Tokens());
  EXPECT_EQ(Lines{}, TakeLog());
}

}  // namespace
}  // namespace tuvo_test
