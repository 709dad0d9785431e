// The power goes at any moment of a day's work: what the disk has kept by then makes a good file,
// in a state that it once was in, and not before the last one that was promised to be on the disk.
//
// TUVO_ROUNDS is how many disks are drawn for each moment, 1 unless given.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <optional>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include "concurrency/crew.h"
#include "concurrency/tally.h"
#include "concurrency/visitors.h"
#include "crash/disk.h"
#include "crash/stored.h"
#include "db/sqlite_file.h"
#include "db/test_files.h"
#include "support/child.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

constexpr char kLost[] = "/usr/tuvo/etc/private/session/lost.db";
constexpr int kEnoughFailures = 5;

// A call has returned, and its checkpoint has run.
struct Promise {
  std::size_t event;  // how many there had been
  std::string call;
};

struct Work {
  Disk disk;
  std::vector<Promise> promises;
};

class Recorder {
 public:
  Recorder() {
    ClearSharingFolder();
    Disk::Record(kSharingFile);
  }

  void Call(const std::string& name, bool done) {
    EXPECT_TRUE(done) << name;
    work_.promises.push_back({Disk::Now(), name});
  }

  Work Done() {
    work_.disk = Disk::Recorded();
    return work_;
  }

 private:
  Work work_;
};

// What follows ends its store before it returns: that is when the checkpoint runs.
bool Create(SharingDB& db, int generation, std::string* hash) {
  Entry link = BigLink(generation);
  const bool done = EntryDB(db).CreateWithHash(link);
  *hash = link.get_hash();
  return done;
}

bool Purge(SharingDB& db) {
  return SessionDB(db).PurgeExpired(1);
}

bool Delete(SharingDB& db, const std::string& hash) {
  EntryDB links(db);
  Entry link;
  return links.GetByHash(hash, link) && links.Delete(link);
}

// First open, last close, and what visitors and an owner do.
Work DoADaysWork() {
  Recorder recorder;
  std::string hash;
  std::string other;
  {
    SharingDB first(kSharingFile);
    recorder.Call("create", Create(first, 1, &hash));
  }
  SharingDB& db = SharingDB::Instance();
  ServeAddress(AddressOf(0));
  std::string session;
  recorder.Call("login", Login(hash, "", session) == 1);
  recorder.Call("check", Check(hash, session) == 1);
  recorder.Call("create", Create(db, 2, &other));
  const auto grow = [](Entry& link) { SetGeneration(link, GenerationOf(link) + 10); };
  recorder.Call("change", ChangeLink(other, Reading::kAfterAWrite, grow));
  recorder.Call("login", Login(other, session, session) == 1);
  recorder.Call("count", TUVO::TuvoSharingIncreaseUseCount(other));
  // Without a store there is no checkpoint: the log grows by several transactions.
  for (int i = 0; i < 4; ++i) {
    EXPECT_TRUE(db.Insert("session", {"s" + std::to_string(i), "0", "192.0.2.7", "1"}));
  }
  recorder.Call("purge", Purge(db));
  recorder.Call("logout", TUVO::TuvoSharingLogout(hash, session));
  recorder.Call("delete", Delete(db, hash));
  recorder.Call("login", Login(other, "", session) == 1);
  return recorder.Done();
}

// What the library and SQLite find in those files.
std::string Opened(const Files& files, const std::string& shared_memory = "") {
  Lay(files, kLost);
  NewPath(std::string(kLost) + "-shm");
  if (!shared_memory.empty()) {
    WriteFile(std::string(kLost) + "-shm", shared_memory);
    EXPECT_EQ(0, chown((std::string(kLost) + "-shm").c_str(), 1, 1));
  }
  ExpectGood(kLost);
  return Contents(kLost);
}

// The states of the file, in their order: after every transaction that was committed.
class States {
 public:
  explicit States(const Disk& disk) {
    Files before;
    std::string state = Opened(before);
    for (std::size_t end = 0; end <= disk.Size(); ++end) {
      const Files files = disk.AfterDeath(end);
      if (files != before) {
        state = Opened(files);
        before = files;
      }
      if (states_.empty() || state != states_.back()) {
        EXPECT_EQ(states_.end(), std::find(states_.begin(), states_.end(), state));
        states_.push_back(state);
      }
      at_.push_back(states_.size() - 1);
    }
  }

  std::size_t Count() const { return states_.size(); }
  // The number of the state in which a process that dies behind `end` events leaves the file.
  std::size_t At(std::size_t end) const { return at_.at(end); }
  std::optional<std::size_t> Number(const std::string& state) const {
    const auto found = std::find(states_.begin(), states_.end(), state);
    return found == states_.end()
               ? std::nullopt
               : std::optional(static_cast<std::size_t>(found - states_.begin()));
  }

 private:
  std::vector<std::string> states_;
  std::vector<std::size_t> at_;
};

// The last state that is promised to be on the disk behind `end` events.
std::size_t Promised(const Work& work, const States& states, std::size_t end) {
  std::size_t number = 0;
  for (const Promise& promise : work.promises) {
    if (promise.event <= end) {
      number = states.At(promise.event);
    }
  }
  return number;
}

struct Losses {
  long disks, lost;  // how many of the disks had lost a transaction
  long wrong;        // were in a state that must not be
  std::size_t most;
};

// Whether the state is one that may be found behind `end` events.
bool Allowed(const Work& work, const States& states, std::size_t end, const std::string& state,
             Losses* losses) {
  const std::optional<std::size_t> number = states.Number(state);
  if (!number || *number > states.At(end) || *number < Promised(work, states, end)) {
    ++losses->wrong;
    return false;
  }
  const std::size_t lost = states.At(end) - *number;
  ++losses->disks;
  losses->lost += lost > 0 ? 1 : 0;
  losses->most = std::max(losses->most, lost);
  return true;
}

std::string Garbage(std::mt19937& random) {
  std::string bytes(32768, '\0');
  std::generate(bytes.begin(), bytes.end(), [&] { return static_cast<char>(random()); });
  return bytes;
}

// In a process of its own, as the login API's file stays open for as long as the process lives.
void InOwnProcess(const std::function<void()>& body) {
  EXPECT_EQ(0, RunInChild([&] {
              body();
              return 0;
            }));
}

bool EnoughFailures() {
  return testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count() >=
         kEnoughFailures;
}

TEST(PowerLoss, AtAnyMomentLeavesAStateThatWasCommittedAndNotBeforeWhatWasPromised) {
  const long rounds = FromEnvironment("TUVO_ROUNDS", 1);
  std::mt19937 random(static_cast<unsigned int>(FromEnvironment("TUVO_SEED", 1)));
  InOwnProcess([&] {
    const Work work = DoADaysWork();  // without the environment from here on
    const States states(work.disk);
    Losses losses{};
    Files certain_before{{"no", "such"}};
    for (std::size_t end = 0; end <= work.disk.Size() && !EnoughFailures(); ++end) {
      SCOPED_TRACE("behind event " + std::to_string(end));
      const Files certain = work.disk.Certain(end);
      if (certain != certain_before) {
        EXPECT_TRUE(Allowed(work, states, end, Opened(certain), &losses));
        certain_before = certain;
      }
      for (long round = 0; round < rounds; ++round) {
        const Files files = work.disk.AfterPowerLoss(end, random);
        const bool with_memory = (end + static_cast<std::size_t>(round)) % 2 == 1;
        const std::string memory = with_memory ? Garbage(random) : "";
        EXPECT_TRUE(Allowed(work, states, end, Opened(files, memory), &losses));
      }
    }
    std::printf(
        "%zu moments, %zu states; %ld disks, %ld without the last transactions, %zu at most\n",
        work.disk.Size() + 1, states.Count(), losses.disks, losses.lost, losses.most);
    Tell(Tally{0, 0, losses.wrong, 0, 0});
    EXPECT_LT(0, losses.lost);
  });
}

TEST(PowerLoss, TakesNothingFromTheSyncedMainFileOnceACallHasReturned) {
  InOwnProcess([] {
    const Work work = DoADaysWork();
    for (const Promise& promise : work.promises) {
      SCOPED_TRACE(promise.call);
      Files main = work.disk.Certain(promise.event);
      const std::string all = Opened(work.disk.AfterDeath(promise.event));
      main.erase("-wal");
      main.erase("-journal");
      EXPECT_EQ(all, Opened(main));
    }
  });
}

// The checkpoint of a call does not wait for who still reads an older state, a copy in the making
// for one. Until the next, only what had been promised before is certain.
TEST(PowerLoss, MayTakeWhatWasWrittenBesideAReaderUntilTheNextCheckpoint) {
  InOwnProcess([] {
    Recorder recorder;
    SharingDB db(kSharingFile);
    std::string hash;
    recorder.Call("create", Create(db, 1, &hash));
    SqliteFile reader(kSharingFile);
    reader.Execute("BEGIN");
    EXPECT_EQ("1", reader.Value("SELECT COUNT(*) FROM entry"));
    recorder.Call("create beside a reader", Create(db, 2, &hash));
    reader.Execute("COMMIT");
    recorder.Call("create behind it", Create(db, 3, &hash));
    const Work work = recorder.Done();
    const auto links = [&](std::size_t call) {
      Lay(work.disk.Certain(work.promises.at(call).event), kLost);
      return StoredLinks(kLost).size();
    };
    EXPECT_EQ(1U, links(0));
    EXPECT_LE(1U, links(1));
    EXPECT_EQ(3U, links(2));
  });
}

// The recording is what was written.
TEST(PowerLoss, RecordedFilesAreTheRealOnes) {
  InOwnProcess([] {
    const Work work = DoADaysWork();
    EXPECT_EQ(Read(kSharingFile), work.disk.AfterDeath(work.disk.Size()));
  });
}

// A disk to which nobody says what is to be on it does not keep the promise, and the tests above
// would see it.
TEST(PowerLoss, IsNoticedWhereNothingIsSynced) {
  InOwnProcess([] {
    const Work work = DoADaysWork();
    const std::string last = Opened(work.disk.AfterDeath(work.disk.Size()));
    const Disk unsynced = work.disk.WithoutSyncs();
    std::mt19937 random(1);
    int wrong = 0;
    for (int i = 0; i < 20; ++i) {
      Lay(unsynced.AfterPowerLoss(unsynced.Size(), random), kLost);
      const SharingDB db(kLost);
      std::string found = "no good file";
      try {
        found = db.IsGood() ? Contents(kLost) : found;
      } catch (const std::exception& error) {
        found = error.what();
      }
      wrong += found == last ? 0 : 1;
    }
    EXPECT_LT(0, wrong);
  });
}

// What was synced is read back from the disk itself once the machine has forgotten what it keeps of
// it in memory. Slows down the whole machine for a moment, so only when it is asked for.
TEST(PowerLoss, TakesNothingThatTheMachineHasToReadAnew) {
  if (std::getenv("TUVO_DROP_CACHES") == nullptr) {
    GTEST_SKIP() << "drops the whole machine's cache: only with TUVO_DROP_CACHES=1";
  }
  std::string folder = std::string(TUVO_BUILD_FOLDER) + "/disk.XXXXXX";
  ASSERT_NE(nullptr, mkdtemp(folder.data()));
  ASSERT_EQ(0, chown(folder.c_str(), 1, 1));
  const std::string path = folder + "/sharing.db";
  std::string hash;
  std::string before;
  {
    SharingDB db(path);
    const bool made = db.IsGood() && Create(db, 1, &hash);
    std::FILE* caches = std::fopen("/proc/sys/vm/drop_caches", "w");
    if (!made || caches == nullptr) {
      NewPath(path);
      rmdir(folder.c_str());
      GTEST_SKIP() << (made ? "/proc/sys/vm/drop_caches cannot be written"
                            : "the system account cannot get to the build folder");
    }
    std::fputs("3\n", caches);
    EXPECT_EQ(0, std::fclose(caches));
    Entry link;
    EXPECT_TRUE(EntryDB(db).GetByHash(hash, link));
    EXPECT_EQ(1, GenerationOf(link));
  }
  ExpectGood(path);
  EXPECT_EQ(1U, StoredLinks(path).size());
  NewPath(path);
  rmdir(folder.c_str());
}

}  // namespace
}  // namespace tuvo_test
