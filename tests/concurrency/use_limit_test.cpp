// A limit of uses, and the count behind it, hold whatever comes at the same moment.
//
// The long form: TUVO_ROUNDS=200 (of AdmitsExactlyAsManyAsItSays) and TUVO_CALLS=500 (that each
// process makes in IsTheNumberOfCallsThatAnsweredTrue).
#include <gtest/gtest.h>
#include <tuvosharing/login.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <map>
#include <thread>

#include "concurrency/crew.h"
#include "concurrency/figure.h"
#include "concurrency/tally.h"
#include "concurrency/visitors.h"
#include "db/sqlite_file.h"
#include "support/syslog_listener.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr int kVisitors = 64;
constexpr std::array<int, 3> kLimits{1, 7, 50};
constexpr int kGetsIn = 1;
constexpr int kNotValid = -3;
constexpr int kUsedUp = -11;

// What the link's owner does while the visitors come.
enum Owner { kAbsent, kRenames, kRaisesTheLimit, kSwitchesOff, kOwners };

// How many visitors got which answer.
using Answers = std::map<int, int>;

struct Round {
  int limit;
  Owner owner;
  bool open_before;  // the visitors' processes have the file open before they are let go
};

// Every combination in turn.
Round RoundNumber(int number) {
  return {kLimits[static_cast<std::size_t>(number) % kLimits.size()],
          static_cast<Owner>(number / 3 % kOwners), number / 12 % 2 == 0};
}

void ChangeAsOwner(Entry& link, const Round& round) {
  switch (round.owner) {
    case kRaisesTheLimit:
      link.set_expire_times(round.limit + 3);
      break;
    case kSwitchesOff:
      link.set_enabled(false);
      break;
    default:
      link.set_protect_title("new title");
  }
}

class Limit : public testing::Test {
 protected:
  Limit() { ClearSharingFolder(); }

  static std::string Value(const std::string& sql) { return SqliteFile(kSharingFile).Value(sql); }
  static int Number(const std::string& sql) { return std::stoi(Value(sql)); }

  static std::string LimitedLink(int limit) {
    return StoreLink([&](Entry& link) { link.set_expire_times(limit); });
  }

  // Also when an exception has ended the test.
  void TearDown() override {
    if (tally_.requests > 0) {
      Tell(tally_);
    }
  }

  SyslogListener syslog_;
  Tally tally_{};
};

class UseLimit : public Limit {
 protected:
  // Lets all visitors, and the owner, loose on the link at once.
  Answers Run(const std::string& hash, const Round& round) {
    const Shared<std::array<std::atomic<int>, kVisitors>> answers;
    Gate gate;
    std::vector<pid_t> pids;
    if (round.owner != kAbsent) {
      pids.push_back(Start(kSystem, [&] { return ActAsOwner(hash, round, gate); }));
      owner_ = pids.back();
    }
    for (int visitor = 0; visitor < kVisitors; ++visitor) {
      pids.push_back(Start(IdsOf(visitor), [&, visitor] {
        ServeAddress(AddressOf(visitor));
        if (round.open_before && !SharingDB::Instance().IsGood()) {
          return 1;
        }
        gate.Pass();
        const Measure measure(*logins_);
        std::string session_id;
        (*answers)[static_cast<std::size_t>(visitor)] = Login(hash, "", session_id);
        return 0;
      }));
    }
    gate.Open();
    EXPECT_EQ(0, WaitForAll(pids));
    Answers counted;
    for (const std::atomic<int>& answer : *answers) {
      ++counted[answer];
    }
    return counted;
  }

  // Somewhere in the middle of the logins: now early, now late.
  static int ActAsOwner(const std::string& hash, const Round& round, Gate& gate) {
    const bool good = SharingDB::Instance().IsGood();
    gate.Pass();
    std::this_thread::sleep_for(std::chrono::milliseconds(5 * round.limit));
    const Reading reading = round.open_before ? Reading::kFirst : Reading::kAfterAWrite;
    return good && ChangeLink(hash, reading, [&](Entry& link) { ChangeAsOwner(link, round); }) ? 0
                                                                                               : 1;
  }

  // Nobody gets another answer than these.
  void ExpectOnly(Answers answers, const std::vector<int>& allowed) {
    int sum = 0;
    for (const int answer : allowed) {
      sum += answers[answer];
    }
    EXPECT_EQ(kVisitors, sum);
    tally_.failures += kVisitors - sum;
  }

  void ExpectAdmitted(const Answers& answers, const Round& round) {
    const int admitted = answers.count(kGetsIn) == 0 ? 0 : answers.at(kGetsIn);
    switch (round.owner) {
      case kSwitchesOff:
        ExpectOnly(answers, {kGetsIn, kUsedUp, kNotValid});
        EXPECT_LE(admitted, round.limit);
        break;
      case kRaisesTheLimit:  // who came before was refused by the old one
        ExpectOnly(answers, {kGetsIn, kUsedUp});
        EXPECT_GE(admitted, round.limit);
        EXPECT_LE(admitted, round.limit + 3);
        break;
      default:
        ExpectOnly(answers, {kGetsIn, kUsedUp});
        EXPECT_EQ(std::min(round.limit, kVisitors), admitted);
    }
    tally_.requests += kVisitors;
    tally_.over_admissions += std::max(0, admitted - LimitInTheEnd(round));
  }

  static int LimitInTheEnd(const Round& round) {
    return round.owner == kRaisesTheLimit ? round.limit + 3 : round.limit;
  }

  // What the link's row says in the end: as many uses as admissions, and what the owner wrote.
  void ExpectRow(const std::string& hash, const Round& round, int admitted) {
    SqliteFile file(kSharingFile);
    const TextRow row =
        file.Rows(
                "SELECT use_count, expire_times, enabled, json_extract(data, '$.protect_title') "
                "FROM entry WHERE hash = '" +
                hash + "'")
            .at(0);
    const TextRow wanted{std::to_string(admitted), std::to_string(LimitInTheEnd(round)),
                         round.owner == kSwitchesOff ? "0" : "1",
                         round.owner == kRenames ? "new title" : ""};
    EXPECT_EQ(wanted, row);
    tally_.lost_rows += wanted == row ? 0 : 1;
    const std::string of_the_link =
        " FROM token, entry WHERE entry_id = entry.id AND hash = '" + hash + "'";
    const int tokens = std::stoi(file.Value("SELECT COUNT(*)" + of_the_link));
    EXPECT_EQ(admitted, tokens);
    tally_.lost_rows += std::max(0, admitted - tokens);
    EXPECT_EQ(std::to_string(admitted),
              file.Value("SELECT COUNT(DISTINCT token.session_id)" + of_the_link));
  }

  // A link that is switched off says so in the log, and an owner who read before a visitor wrote is
  // refused and begins anew; nothing else is worth a line.
  void ExpectLog(const Round& round) {
    for (const std::string& line : syslog_.TakeTexts()) {
      const bool off = round.owner == kSwitchesOff && Names(line, "enabled");
      const bool begun_anew = round.owner != kAbsent && Names(line, "update failed") &&
                              Names(line, "(" + std::to_string(owner_) + ")");
      EXPECT_TRUE(off || begun_anew) << line;
    }
  }

 private:
  static bool Names(const std::string& line, const std::string& what) {
    return line.find(what) != std::string::npos;
  }

  pid_t owner_ = 0;

 protected:
  Shared<Figure> logins_;
};

class UseCount : public Limit {};

TEST_F(UseLimit, AdmitsExactlyAsManyAsItSays) {
  const long rounds = FromEnvironment("TUVO_ROUNDS", 24);
  int all_admitted = 0;
  for (int number = 0; number < rounds && !HasFailure(); ++number) {
    const Round round = RoundNumber(number);
    SCOPED_TRACE("round " + std::to_string(number));
    const std::string hash = LimitedLink(round.limit);
    Answers answers = Run(hash, round);
    const int admitted = answers[kGetsIn];
    ExpectAdmitted(answers, round);
    ExpectRow(hash, round, admitted);
    ExpectLog(round);
    all_admitted += admitted;
  }
  const int sessions = Number("SELECT COUNT(*) FROM session");
  EXPECT_EQ(all_admitted, sessions);  // none for who was refused
  tally_.lost_rows += std::max(0, all_admitted - sessions);
  std::printf("%ld rounds, %d admitted\n", rounds, all_admitted);
  Tell("login", *logins_);
}

// The same visitors one after another: what is decided twice must not be counted twice.
TEST_F(UseLimit, HoldsForLoginsOneAtATimeAsWell) {
  const std::string hash = LimitedLink(3);
  const std::string others =
      "SELECT id, hash, project_name, enabled, owner_uid, start_at, "
      "expire_at, expire_times, auto_gc, data FROM entry";
  const std::vector<TextRow> before = SqliteFile(kSharingFile).Rows(others);
  std::vector<int> answers;
  for (int visitor = 0; visitor < 5; ++visitor) {
    const Shared<int> answer;
    EXPECT_EQ(0, Wait(Start(kRoot, [&] {
                ServeAddress(AddressOf(visitor));
                std::string session_id;
                *answer = Login(hash, "", session_id);
                return 0;
              })));
    answers.push_back(*answer);
  }
  EXPECT_EQ((std::vector<int>{1, 1, 1, -11, -11}), answers);
  EXPECT_EQ("3", Value("SELECT use_count FROM entry"));
  EXPECT_EQ(before, SqliteFile(kSharingFile).Rows(others));
  EXPECT_EQ(std::vector<std::string>{}, syslog_.TakeTexts());
}

TEST_F(UseCount, IsTheNumberOfCallsThatAnsweredTrue) {
  const int calls = static_cast<int>(FromEnvironment("TUVO_CALLS", 10));
  const std::string hash = LimitedLink(5);  // whoever counts by itself has decided already
  const Shared<std::atomic<int>> counted;
  const Shared<Figure> figure;
  Gate gate;
  std::vector<pid_t> pids;
  for (int process = 0; process < kVisitors; ++process) {
    pids.push_back(Start(IdsOf(process), [&] {
      gate.Pass();
      for (int call = 0; call < calls; ++call) {
        const Measure measure(*figure);
        *counted += TUVO::TuvoSharingIncreaseUseCount(hash) ? 1 : 0;
      }
      return 0;
    }));
  }
  gate.Open();
  EXPECT_EQ(0, WaitForAll(pids));
  Tell("count", *figure);
  const int uses = Number("SELECT use_count FROM entry");
  EXPECT_EQ(kVisitors * calls, *counted);
  EXPECT_EQ(kVisitors * calls, uses);
  tally_ = {kVisitors * calls, kVisitors * calls - *counted, std::max(0, *counted - uses), 0, 0};
  EXPECT_EQ(std::vector<std::string>{}, syslog_.TakeTexts());
}

// A program that counts, or logs a visitor in, within a transaction of its own.
class UseWithinATransaction : public Limit {
 protected:
  enum State { kBegun, kCounted, kMayEnd };

  // Starts that program. It has counted when this returns, and ends by `statement` when it is let.
  pid_t StartCaller(const std::function<bool()>& count, const std::string& statement) {
    const pid_t caller = Start(kRoot, [this, count, statement] {
      ServeAddress(AddressOf(0));
      SharingDB& db = SharingDB::Instance();
      const bool good = db.Begin() && count();
      *state_ = kCounted;
      while (*state_ != kMayEnd) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
      }
      return good && db.Execute(statement) ? 0 : 1;
    });
    while (*state_ != kCounted) {
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return caller;
  }

  void ExpectEnd(pid_t caller) {
    *state_ = kMayEnd;
    EXPECT_EQ(0, Wait(caller));
  }

  // What a visitor is told who comes while the caller's transaction is open, which then ends.
  int AnswerToAVisitorMeanwhile(const std::string& hash, pid_t caller) {
    const Shared<std::atomic<int>> answer;
    const pid_t visitor = Start(kSystem, [&] {
      ServeAddress(AddressOf(1));
      std::string session_id;
      *answer = Login(hash, "", session_id);
      return 0;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    EXPECT_EQ(0, *answer) << "it did not wait";
    ExpectEnd(caller);
    EXPECT_EQ(0, Wait(visitor));
    return *answer;
  }

  Shared<std::atomic<State>> state_;
};

TEST_F(UseWithinATransaction, IsSeenByNobodyUntilTheCommit) {
  const std::string hash = LimitedLink(0);
  const pid_t caller =
      StartCaller([&] { return TUVO::TuvoSharingIncreaseUseCount(hash); }, "COMMIT");
  EXPECT_EQ("0", Value("SELECT use_count FROM entry"));
  ExpectEnd(caller);
  EXPECT_EQ("1", Value("SELECT use_count FROM entry"));
}

TEST_F(UseWithinATransaction, IsGoneWhenItIsTakenBack) {
  const std::string hash = LimitedLink(0);
  ExpectEnd(StartCaller([&] { return TUVO::TuvoSharingIncreaseUseCount(hash); }, "ROLLBACK"));
  EXPECT_EQ("0", Value("SELECT use_count FROM entry"));
}

TEST_F(UseWithinATransaction, TakesTheLastOneFromWhoComesMeanwhile) {
  const std::string hash = LimitedLink(1);
  const pid_t caller =
      StartCaller([&] { return TUVO::TuvoSharingIncreaseUseCount(hash); }, "COMMIT");
  EXPECT_EQ(kUsedUp, AnswerToAVisitorMeanwhile(hash, caller));
  EXPECT_EQ("1", Value("SELECT use_count FROM entry"));
}

TEST_F(UseWithinATransaction, LeavesTheLastOneToWhoComesMeanwhileWhenItIsTakenBack) {
  const std::string hash = LimitedLink(1);
  const pid_t caller =
      StartCaller([&] { return TUVO::TuvoSharingIncreaseUseCount(hash); }, "ROLLBACK");
  EXPECT_EQ(kGetsIn, AnswerToAVisitorMeanwhile(hash, caller));
  EXPECT_EQ("1", Value("SELECT use_count FROM entry"));
}

// The visitor's session and token belong to the transaction as well.
TEST_F(UseWithinATransaction, OfAWholeLoginIsKeptOrTakenBackWithTheRest) {
  for (const std::string statement : {"ROLLBACK", "COMMIT"}) {
    const std::string hash = LimitedLink(1);
    const auto log_in = [&] {
      std::string session_id;
      return Login(hash, "", session_id) == kGetsIn;
    };
    const pid_t caller = StartCaller(log_in, statement);
    EXPECT_EQ("0|0|0", Value("SELECT (SELECT SUM(use_count) FROM entry) || '|' || "
                             "(SELECT COUNT(*) FROM session) || '|' || "
                             "(SELECT COUNT(*) FROM token)"));
    ExpectEnd(caller);
    EXPECT_EQ(statement == "COMMIT" ? "1|1|1" : "0|0|0",
              Value("SELECT (SELECT SUM(use_count) FROM entry) || '|' || "
                    "(SELECT COUNT(*) FROM session) || '|' || (SELECT COUNT(*) FROM token)"));
    *state_ = kBegun;
  }
}

}  // namespace
}  // namespace tuvo_test
