// Writers are killed at random moments, round after round: what they were told is done is there
// afterwards, all that is found is whole, and a limit of uses is kept.
//
//   TUVO_ROUNDS=500 scripts/private-root build/dev/tests/crash/random_kills_test
//
// runs the long form; TUVO_SEED chooses other moments.
#include <gtest/gtest.h>
#include <tuvosharing/entry.h>

#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <map>
#include <memory>
#include <random>
#include <set>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "concurrency/crew.h"
#include "concurrency/tally.h"
#include "concurrency/visitors.h"
#include "crash/stored.h"
#include "crash/writers.h"
#include "db/sqlite_file.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::record::Entry;
using Clock = std::chrono::steady_clock;

constexpr int kRounds = 40;
constexpr int kRoundsOfAFile = 20;
constexpr int kMostCalls = 60;  // of a round, by all writers, before the first is killed

// What the rounds together met.
struct Met {
  long killed_within, links, visits, uses_between;
};

class RandomKills : public testing::Test {
 protected:
  RandomKills() : random_(static_cast<unsigned int>(FromEnvironment("TUVO_SEED", 1))) {}

  void NewFile() {
    ClearSharingFolder();
    record_ = std::make_unique<Shared<Record>>();
    const std::string hash = StoreLink([](Entry& link) { link.set_expire_times(kUseLimit); });
    hash.copy(Rec().limited_link.data(), kIdRoom - 1);
  }

  Record& Rec() { return **record_; }

  int Below(int end) { return static_cast<int>(random_() % static_cast<unsigned int>(end)); }

  // Some rounds are over before the writers have opened the file.
  void WaitForSomeCalls() {
    const int wanted = Rec().calls + Below(kMostCalls);
    const auto end = Clock::now() + std::chrono::seconds(5);
    while (Rec().calls < wanted && Clock::now() < end) {
      std::this_thread::sleep_for(std::chrono::microseconds(200));
    }
    std::this_thread::sleep_for(std::chrono::microseconds(Below(3000)));
  }

  // All at one moment, or one after the other while the rest goes on; or half of them, and the
  // others come to their end by themselves.
  void KillSome(const std::vector<pid_t>& pids) {
    const int way = Below(3);
    const std::size_t killed = way == 2 ? pids.size() / 2 : pids.size();
    for (std::size_t i = 0; i < killed; ++i) {
      if (way == 1) {
        WaitForSomeCalls();
      }
      kill(pids[i], SIGKILL);
    }
    if (way == 2) {
      WaitForSomeCalls();
    }
    Rec().stop = true;
  }

  void Round() {
    Rec().stop = false;
    const int calls = Rec().calls;
    std::vector<pid_t> pids;
    for (int writer = 0; writer < kWriters; ++writer) {
      const auto seed = static_cast<unsigned int>(random_());
      pids.push_back(Start(IdsOf(writer), [this, writer, seed] {
        Write(Rec(), writer, seed);
        return 0;
      }));
    }
    WaitForSomeCalls();
    KillSome(pids);
    for (std::size_t i = 0; i < pids.size(); ++i) {
      const int status = Wait(pids[i]);
      EXPECT_TRUE(status == 0 || status == 256 + SIGKILL) << status;
      tally_.kills += status == 256 + SIGKILL ? 1 : 0;
      tally_.failures += status == 0 || status == 256 + SIGKILL ? 0 : 1;
      met_.killed_within += Rec().writer[i].doing == kNothing ? 0 : 1;
    }
    tally_.requests += Rec().calls - calls;
    tally_.failures += Rec().failed_calls;
    EXPECT_EQ(0, Rec().failed_calls) << Rec().failure.data();
    Rec().failed_calls = 0;
  }

  void Examine() {
    ExpectGood(kSharingFile);
    links_.clear();
    for (Entry& link : StoredLinks(kSharingFile)) {
      const std::string hash = link.get_hash();
      links_.emplace(hash, std::move(link));
    }
    SqliteFile file(kSharingFile);
    inside_.clear();
    for (const TextRow& row : file.Rows("SELECT session.session_id, entry.hash FROM token JOIN "
                                        "session ON session.id = token.session_id JOIN entry ON "
                                        "entry.id = token.entry_id")) {
      inside_.emplace(row.at(0), row.at(1));
    }
    // None is without its session, its link or a value.
    EXPECT_EQ(static_cast<long>(inside_.size()),
              std::stol(file.Value("SELECT COUNT(*) FROM token")));
    EXPECT_EQ("0", file.Value("SELECT COUNT(*) FROM session WHERE session_id IS NULL OR "
                              "length(session_id) = 0 OR ip NOT LIKE '192.0.2.%' OR timeout < 1"));
    ExamineLimitedLink();
    for (int writer = 0; writer < kWriters; ++writer) {
      ExamineWriter(writer, Rec().writer[static_cast<std::size_t>(writer)]);
    }
    for (const auto& [hash, link] : links_) {
      const bool over = link.get_auto_gc() && GenerationOf(link) == 1;
      EXPECT_TRUE(hash == Rec().limited_link.data() || over) << "nobody's link: " << hash;
    }
  }

  void ExamineLimitedLink() {
    int admitted = 0;
    int under_way = 0;
    for (WriterRecord& writer : Rec().writer) {
      admitted += writer.admitted;
      under_way += writer.doing == kVisiting && writer.link < 0 ? 1 : 0;
    }
    const auto found = links_.find(Rec().limited_link.data());
    tally_.lost_rows += found == links_.end() ? 1 : 0;
    ASSERT_NE(links_.end(), found);
    const int uses = found->second.get_use_count();
    EXPECT_LE(admitted + lost_uses_, uses);
    EXPECT_GE(admitted + lost_uses_ + under_way, uses);
    EXPECT_GE(kUseLimit, uses);
    tally_.lost_rows += std::max(0, admitted + lost_uses_ - uses);
    tally_.over_admissions += std::max(0, std::max(uses, admitted) - kUseLimit);
    met_.uses_between += uses - admitted - lost_uses_;
    lost_uses_ = uses - admitted;
  }

  void ExamineWriter(int number, WriterRecord& writer) {
    for (int i = 0; i < writer.links; ++i) {
      WrittenLink& link = writer.link_at[static_cast<std::size_t>(i)];
      ExamineLink(link, writer.link == i ? writer.doing : kNothing);
    }
    if (writer.doing == kCreating) {
      TakeUnacknowledged(number, writer);
    }
    for (int i = 0; i < writer.visits; ++i) {
      Visit& visit = writer.visit_at[static_cast<std::size_t>(i)];
      ExamineVisit(visit, writer, writer.doing == kLoggingOut && writer.visit == i);
    }
    // What is left was nobody's.
    for (int i = 0; i < writer.links; ++i) {
      links_.erase(writer.link_at[static_cast<std::size_t>(i)].hash.data());
    }
    writer.doing = kNothing;
  }

  // As it was told, or as it would be after what was under way; what it is now counts from here on.
  void ExamineLink(WrittenLink& link, Doing doing) {
    const auto found = links_.find(link.hash.data());
    const bool there = found != links_.end();
    if (doing != kDeleting) {
      EXPECT_EQ(link.there, there) << link.hash.data();
      tally_.lost_rows += link.there == there ? 0 : 1;
    } else {
      EXPECT_TRUE(link.there || !there);
      tally_.lost_rows += !link.there && there ? 1 : 0;
    }
    link.there = there;
    if (!there) {
      return;
    }
    ++met_.links;
    const int generation = GenerationOf(found->second);
    EXPECT_LE(link.generation, generation);
    EXPECT_GE(link.generation + (doing == kChanging ? 1 : 0), generation);
    const int uses = found->second.get_use_count();
    EXPECT_LE(link.uses, uses);
    tally_.lost_rows += link.generation > generation || link.uses > uses ? 1 : 0;
    EXPECT_GE(link.uses + (doing == kCounting || doing == kVisiting ? 1 : 0), uses);
    link.generation = generation;
    link.uses = uses;
  }

  // A link whose making was under way may be there, but only as a whole; once.
  void TakeUnacknowledged(int number, WriterRecord& writer) {
    std::set<std::string> known;
    for (int i = 0; i < writer.links; ++i) {
      known.insert(writer.link_at[static_cast<std::size_t>(i)].hash.data());
    }
    int found = 0;
    for (const auto& [hash, link] : links_) {
      if (link.get_owner_uid() == OwnerOf(number) && known.count(hash) == 0) {
        ++found;
        EXPECT_EQ(1, GenerationOf(link));
        EXPECT_EQ(0, link.get_use_count());
        WrittenLink& written = writer.link_at.at(static_cast<std::size_t>(writer.links++));
        hash.copy(written.hash.data(), kIdRoom - 1);
        written.generation = 1;
        written.there = true;
      }
    }
    EXPECT_GE(1, found);
  }

  void ExamineVisit(Visit& visit, const WriterRecord& writer, bool logging_out) {
    const bool own = visit.link >= 0;
    const Id& hash =
        own ? writer.link_at[static_cast<std::size_t>(visit.link)].hash : Rec().limited_link;
    const bool link_is_there = !own || writer.link_at[static_cast<std::size_t>(visit.link)].there;
    const bool inside = inside_.count({visit.session.data(), hash.data()}) != 0;
    const bool may_be_gone =
        logging_out || !link_is_there || (writer.doing == kAllOut && writer.link == visit.link);
    if (may_be_gone) {
      EXPECT_TRUE(visit.inside || !inside);
      tally_.lost_rows += !visit.inside && inside ? 1 : 0;
    } else {
      EXPECT_EQ(visit.inside, inside) << visit.session.data();
      tally_.lost_rows += visit.inside == inside ? 0 : 1;
    }
    met_.visits += inside ? 1 : 0;
    visit.inside = inside;
  }

  // Also when an exception has ended the test.
  void TearDown() override { Tell(tally_); }

  std::mt19937 random_;
  std::unique_ptr<Shared<Record>> record_;
  std::map<std::string, Entry> links_;
  std::set<std::pair<std::string, std::string>> inside_;
  int lost_uses_ = 0;  // counted for visitors who were never told that they are in
  Tally tally_{};
  Met met_{};
};

TEST_F(RandomKills, LoseNothingThatWasAcknowledged) {
  const long rounds = FromEnvironment("TUVO_ROUNDS", kRounds);
  long round = 0;
  for (; round < rounds && !HasFailure(); ++round) {
    SCOPED_TRACE("round " + std::to_string(round));
    if (round % kRoundsOfAFile == 0) {
      NewFile();
      lost_uses_ = 0;
    }
    Round();
    Examine();
  }
  std::printf(
      "%ld rounds: %ld calls; %ld writers killed, %ld of them within a call; seen again after a "
      "round: %ld links, %ld visitors inside; %ld uses counted for visitors who were not told\n",
      round, tally_.requests, tally_.kills, met_.killed_within, met_.links, met_.visits,
      met_.uses_between);
  EXPECT_LT(0, met_.killed_within);
}

}  // namespace
}  // namespace tuvo_test
