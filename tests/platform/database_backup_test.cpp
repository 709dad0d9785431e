#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <tuvoplatform/database.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <new>
#include <string>

#include "platform/database_handles.h"
#include "platform/failing_allocations.h"
#include "platform/temp_folder.h"
#include "support/child.h"

namespace {

using tuvo_test::allocations_left;
using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Error;
using tuvo_test::Execute;
using tuvo_test::TempFolder;
using tuvo_test::Value;

// About 4 MB in small pages: many steps.
constexpr char kFill[] =
    "PRAGMA journal_mode = WAL; CREATE TABLE t (id INTEGER PRIMARY KEY, a INTEGER, b TEXT);"
    "WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 4000)"
    "INSERT INTO t SELECT i, 0, hex(randomblob(500)) FROM n";

int Backup(const Db& from, const std::string& to, TUVODBBackupProgress progress = nullptr,
           void* context = nullptr) {
  return TUVODBBackup(from.get(), to.c_str(), progress, context);
}

class DatabaseBackup : public testing::Test {
 protected:
  DatabaseBackup() : from_(Connect(folder_ / "from.db")), to_(folder_ / "to.db") {
    EXPECT_EQ(Execute(from_, kFill), 0) << Error(from_);
  }

  // The names in the folder that begin like the copy's.
  size_t FilesOfTheCopy() const {
    size_t count = 0;
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      count += entry.path().filename().string().compare(0, 5, "to.db") == 0 ? 1U : 0U;
    }
    return count;
  }

  TempFolder folder_;
  Db from_;
  std::string to_;
};

TEST_F(DatabaseBackup, CopyHoldsEverything) {
  ASSERT_EQ(Backup(from_, to_), 0) << Error(from_);
  const Db copy = Connect(to_);
  const char* sum = "SELECT count(*) || ' ' || sum(length(b)) || ' ' || min(b) AS value FROM t";
  EXPECT_EQ(Value(copy, sum), Value(from_, sum));
  EXPECT_EQ(Value(copy, "SELECT integrity_check AS value FROM pragma_integrity_check"), "ok");
}

TEST_F(DatabaseBackup, CopyHasTheJournalModeOfTheOriginal) {
  ASSERT_EQ(Backup(from_, to_), 0);
  EXPECT_EQ(Value(Connect(to_), "SELECT journal_mode AS value FROM pragma_journal_mode"), "wal");
}

TEST_F(DatabaseBackup, CopyIsOneFileOfItsOwnersAlone) {
  ASSERT_EQ(Backup(from_, to_), 0);
  EXPECT_EQ(FilesOfTheCopy(), 1U);
  struct stat st {};
  ASSERT_EQ(stat(to_.c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 07777U, 0600U);
  EXPECT_EQ(st.st_uid, geteuid());
}

TEST_F(DatabaseBackup, WhatStandsInTheWriteAheadLogIsCopied) {
  ASSERT_EQ(Execute(from_, "PRAGMA wal_autocheckpoint = 0; UPDATE t SET a = 7"), 0);
  ASSERT_EQ(Backup(from_, to_), 0);
  EXPECT_EQ(Value(Connect(to_), "SELECT count(*) AS value FROM t WHERE a = 7"), "4000");
}

TEST_F(DatabaseBackup, FileThatIsThereIsLeftAlone) {
  std::ofstream(to_) << "precious";
  EXPECT_EQ(Backup(from_, to_), -1);
  EXPECT_EQ(Error(from_), "File exists");
  std::string text;
  std::ifstream(to_) >> text;
  EXPECT_EQ(text, "precious");
}

TEST_F(DatabaseBackup, SymbolicLinkIsNotFollowed) {
  std::filesystem::create_symlink(folder_ / "elsewhere", to_);
  EXPECT_EQ(Backup(from_, to_), -1);
  EXPECT_FALSE(std::filesystem::exists(folder_ / "elsewhere"));
}

TEST_F(DatabaseBackup, PlaceThatCannotBeWrittenFails) {
  EXPECT_EQ(Backup(from_, "/nowhere/to.db"), -1);
  EXPECT_EQ(Error(from_), "No such file or directory");
}

TEST_F(DatabaseBackup, NullAndEmptyPathsFail) {
  EXPECT_EQ(TUVODBBackup(nullptr, to_.c_str(), nullptr, nullptr), -1);
  EXPECT_EQ(TUVODBBackup(from_.get(), nullptr, nullptr, nullptr), -1);
  EXPECT_EQ(Error(from_), "no path");
  EXPECT_EQ(Backup(from_, ""), -1);
  EXPECT_EQ(FilesOfTheCopy(), 0U);
}

TEST_F(DatabaseBackup, OpenTransactionOfTheCallerIsRefusedAndStaysOpen) {
  ASSERT_EQ(Execute(from_, "BEGIN; UPDATE t SET a = 1 WHERE id = 1"), 0);
  EXPECT_EQ(Backup(from_, to_), -1);
  EXPECT_EQ(Error(from_), "a transaction is open");
  EXPECT_EQ(Execute(from_, "COMMIT"), 0);
  EXPECT_EQ(Value(from_, "SELECT a AS value FROM t WHERE id = 1"), "1");
}

TEST_F(DatabaseBackup, ConnectionIsFreeAfterwards) {
  ASSERT_EQ(Backup(from_, to_), 0);
  EXPECT_EQ(Execute(from_, "BEGIN IMMEDIATE; UPDATE t SET a = 2; COMMIT"), 0) << Error(from_);
  EXPECT_EQ(Backup(from_, folder_ / "to.db.second"), 0) << Error(from_);
}

TEST_F(DatabaseBackup, FileThatIsNoDatabaseFailsAndLeavesNothing) {
  std::ofstream(folder_ / "text") << std::string(5000, 'x');
  EXPECT_EQ(Backup(Connect(folder_ / "text"), to_), -1);
  EXPECT_EQ(FilesOfTheCopy(), 0U);
}

struct Steps {
  unsigned int calls = 0;
  unsigned int last_left = 0;
  unsigned int total = 0;
  bool falls = true;
  unsigned int stop_at = 0;  // 0: never
};

int Note(void* context, unsigned int left, unsigned int total) {
  auto* steps = static_cast<Steps*>(context);
  steps->falls = steps->falls && (steps->calls == 0 || left < steps->last_left);
  steps->last_left = left;
  steps->total = total;
  ++steps->calls;
  return steps->calls == steps->stop_at ? 1 : 0;
}

TEST_F(DatabaseBackup, ProgressIsToldWithPagesThatBecomeFewer) {
  Steps steps;
  ASSERT_EQ(Backup(from_, to_, Note, &steps), 0);
  EXPECT_GT(steps.calls, 2U);
  EXPECT_TRUE(steps.falls);
  EXPECT_GT(steps.total, steps.last_left);
}

TEST_F(DatabaseBackup, ProgressCanEndItAndNothingIsLeft) {
  Steps steps;
  steps.stop_at = 2;
  EXPECT_EQ(Backup(from_, to_, Note, &steps), -1);
  EXPECT_EQ(steps.calls, 2U);
  EXPECT_EQ(Error(from_), "interrupted");
  EXPECT_EQ(FilesOfTheCopy(), 0U);
  EXPECT_EQ(Execute(from_, "BEGIN IMMEDIATE; COMMIT"), 0);
}

// Writes with a connection of its own, as another process would.
struct Writing {
  Db other;
  Steps steps;
  int failures = 0;
};

int WriteBetween(void* context, unsigned int left, unsigned int total) {
  auto* writing = static_cast<Writing*>(context);
  Note(&writing->steps, left, total);
  writing->failures += Execute(writing->other, "UPDATE t SET a = a + 1") == 0 ? 0 : 1;
  return 0;
}

TEST_F(DatabaseBackup, OthersWriteMeanwhileAndTheCopyIsOfOneMoment) {
  ASSERT_EQ(Execute(from_, "UPDATE t SET a = 100"), 0);
  Writing writing;
  writing.other = Connect(folder_ / "from.db");
  ASSERT_EQ(Backup(from_, to_, WriteBetween, &writing), 0) << Error(from_);
  EXPECT_EQ(writing.failures, 0);
  EXPECT_GT(writing.steps.calls, 2U);
  EXPECT_TRUE(writing.steps.falls) << "the copying began anew";
  EXPECT_EQ(Value(Connect(to_), "SELECT min(a) || ' ' || max(a) AS value FROM t"), "100 100");
}

TEST_F(DatabaseBackup, FullDiskFailsAndLeavesNothing) {
  const int status = tuvo_test::RunInChild([this] {
    // A file's size has a limit here; the signal is the system's way to say so.
    const rlimit small{1 << 20, 1 << 20};
    (void)std::signal(SIGXFSZ, SIG_IGN);
    if (setrlimit(RLIMIT_FSIZE, &small) != 0) {
      return 2;
    }
    const Db from = Connect(folder_ / "from.db");
    return Backup(from, to_) == -1 && !Error(from).empty() ? 0 : 1;
  });
  EXPECT_EQ(status, 0);
  EXPECT_EQ(FilesOfTheCopy(), 0U);
}

TEST_F(DatabaseBackup, MemoryThatRunsOutFailsWithAReason) {
  for (long at = 0; at < 20; ++at) {
    std::filesystem::remove(to_);
    allocations_left = at;
    const int outcome = Backup(from_, to_);
    const bool refused = allocations_left < 0;
    allocations_left = -1;
    if (!refused) {
      EXPECT_EQ(outcome, 0);
      return;
    }
    if (outcome != 0) {
      EXPECT_FALSE(Error(from_).empty());
      EXPECT_EQ(FilesOfTheCopy(), 0U);
    }
  }
  FAIL() << "memory never sufficed";
}

}  // namespace
