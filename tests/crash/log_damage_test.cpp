// The end of the write-ahead log is cut off or damaged, as a power loss can leave it: the file
// opens, and is as it was after the last transaction before the damage.
//
// TUVO_STRIDE=1 tries every byte; every 2003rd and those where frames begin are tried otherwise.
#include <gtest/gtest.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <cstddef>
#include <cstdio>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "concurrency/crew.h"
#include "concurrency/tally.h"
#include "concurrency/visitors.h"
#include "crash/disk.h"
#include "crash/stored.h"
#include "db/test_files.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr char kDamaged[] = "/usr/tuvo/etc/private/session/damaged.db";
constexpr std::size_t kHeader = 32;
constexpr std::size_t kFrameHeader = 24;
constexpr std::size_t kPage = 4096;
constexpr std::size_t kFrame = kFrameHeader + kPage;
constexpr int kTransactions = 6;

class LogDamage : public testing::Test {
 protected:
  LogDamage() {
    ClearSharingFolder();
    SharingDB db(kSharingFile);
    Entry link = BigLink(1);
    EXPECT_TRUE(EntryDB(db).CreateWithHash(link));  // with a checkpoint
    states_.push_back(ContentsOf(Read(kSharingFile)));
    for (int i = 0; i < kTransactions; ++i) {
      const std::string number = std::to_string(i);
      EXPECT_TRUE(db.Execute("BEGIN; UPDATE entry SET data = replace(data, ' ', ' " + number +
                                 "'), use_count = " + number +
                                 "; INSERT INTO session VALUES (NULL, 's" + number +
                                 "', 0, '192.0.2.1', 9999999999); COMMIT",
                             nullptr));
      files_ = Read(kSharingFile);
      states_.push_back(ContentsOf(files_));
    }
    FindCommits();
  }

  static std::string ContentsOf(const Files& files) {
    Lay(files, kDamaged);
    ExpectGood(kDamaged);
    return Contents(kDamaged);
  }

  const std::string& Log() const { return files_.at("-wal"); }

  // Where the frames end that end a transaction of this log: what stands behind the last may be
  // left from the log before.
  void FindCommits() {
    const std::string salt = Log().substr(16, 8);
    for (std::size_t at = kHeader; at + kFrame <= Log().size(); at += kFrame) {
      if (Log().compare(at + 8, 8, salt) == 0) {
        frames_.push_back(at);
        if (Log().compare(at + 4, 4, std::string(4, '\0')) != 0) {
          commits_.push_back(at + kFrame);
        }
      }
    }
    ASSERT_EQ(static_cast<std::size_t>(kTransactions), commits_.size());
  }

  // The state when only what stands before `end` is good.
  const std::string& StateBefore(std::size_t end) const {
    const auto whole = std::count_if(commits_.begin(), commits_.end(),
                                     [&](std::size_t commit) { return commit <= end; });
    return states_.at(static_cast<std::size_t>(whole));
  }

  // Where the frame begins that holds this byte; 0: the log's own header.
  static std::size_t PieceOf(std::size_t at) {
    return at < kHeader ? 0 : kHeader + (at - kHeader) / kFrame * kFrame;
  }

  // The places to try.
  std::set<std::size_t> Places() const {
    const auto stride = static_cast<std::size_t>(FromEnvironment("TUVO_STRIDE", 2003));
    std::set<std::size_t> places;
    for (std::size_t at = 0; at < commits_.back(); at += stride) {
      places.insert(at);
    }
    for (const std::size_t frame : frames_) {
      for (const std::size_t within : {0, 4, 8, 23}) {
        places.insert(frame + within);
      }
      places.insert(frame + kFrame - 1);
    }
    for (std::size_t at = 0; at < kHeader; at += 4) {
      places.insert(at);
    }
    return places;
  }

  // Does `damage` to the log at each place.
  void TryAll(const std::function<void(std::string& log, std::size_t at)>& damage,
              const std::function<std::size_t(std::size_t at)>& good_until) {
    const std::set<std::size_t> places = Places();
    for (const std::size_t at : places) {
      SCOPED_TRACE("byte " + std::to_string(at));
      Files files = files_;
      damage(files["-wal"], at);
      const std::string found = ContentsOf(files);
      tally_.lost_rows += found == StateBefore(good_until(at)) ? 0 : 1;
      ASSERT_EQ(StateBefore(good_until(at)), found);
    }
    std::printf("%zu places in a log of %zu frames\n", places.size(), frames_.size());
  }

  void TearDown() override { Tell(tally_); }

  Tally tally_{};
  Files files_;
  std::vector<std::string> states_;
  std::vector<std::size_t> frames_;
  std::vector<std::size_t> commits_;
};

TEST_F(LogDamage, ALogCutOffAnywhereLosesTheTransactionsBehind) {
  TryAll([](std::string& log, std::size_t at) { log.resize(at); },
         [](std::size_t at) { return at; });
}

TEST_F(LogDamage, AFlippedByteLosesItsTransactionAndThoseBehind) {
  TryAll([](std::string& log, std::size_t at) { log[at] = static_cast<char>(log[at] ^ 0x20); },
         PieceOf);
}

// Room that the file system had given the log, but nothing written there yet. A piece whose end was
// zero is still whole.
TEST_F(LogDamage, ALogOfZerosFromAnywhereLosesTheTransactionsBehind) {
  TryAll(
      [](std::string& log, std::size_t at) {
        std::fill(log.begin() + static_cast<std::ptrdiff_t>(at), log.end(), '\0');
      },
      [&](std::size_t at) {
        std::size_t good = at;
        while (good < Log().size() && Log()[good] == '\0') {
          ++good;
        }
        return good;
      });
}

}  // namespace
}  // namespace tuvo_test
