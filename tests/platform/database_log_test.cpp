// The length of the log beside a database that many write to, on a disk that takes its time.
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <tuvoplatform/database.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include "platform/database_handles.h"
#include "platform/temp_folder.h"

// In place of the system's, for SQLite as well: as long as a hard disk takes.
extern "C" __attribute__((visibility("default"))) int fdatasync(int) {
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  return 0;
}
extern "C" __attribute__((visibility("default"))) int fsync(int fd) {
  return fdatasync(fd);
}

namespace {

using std::chrono::milliseconds;
using std::chrono::steady_clock;
using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Execute;
using tuvo_test::TempFolder;

constexpr char kPragmas[] = "PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL";
// Ten pages.
constexpr char kWrite[] = "INSERT INTO t VALUES (randomblob(40000))";
constexpr std::uintmax_t kBound = std::uintmax_t{16} * 1024 * 1024;

class DatabaseLog : public testing::Test {
 protected:
  DatabaseLog() { Execute(Connect(path_), std::string(kPragmas) + "; CREATE TABLE t (a)"); }

  std::uintmax_t Size() const { return std::filesystem::file_size(path_ + "-wal"); }

  TempFolder folder_;
  const std::string path_ = folder_ / "test.db";
};

// Six processes write some 60 MB. With checkpoints that let others go on writing, the log was as
// long in the end.
TEST_F(DatabaseLog, StaysShortHoweverManyWrite) {
  constexpr int kProcesses = 6;
  constexpr int kWrites = 250;
  std::array<int, 2> end{};
  ASSERT_EQ(0, pipe(end.data()));
  std::vector<pid_t> writers;
  for (int i = 0; i < kProcesses; ++i) {
    writers.push_back(fork());
    if (writers.back() == 0) {
      close(end[1]);
      const Db db = Connect(path_);
      int code = Execute(db, kPragmas);
      for (int write = 0; write < kWrites; ++write) {
        code |= Execute(db, kWrite);
      }
      char byte = 0;
      code |= static_cast<int>(read(end[0], &byte, 1));  // keeps the file, and so the log
      _exit(code == 0 ? 0 : 1);
    }
  }
  close(end[0]);
  const Db db = Connect(path_);
  while (tuvo_test::Value(db, "SELECT COUNT(*) AS value FROM t") !=
         std::to_string(kProcesses * kWrites)) {
    std::this_thread::sleep_for(milliseconds(50));
  }
  EXPECT_LT(Size(), kBound);
  close(end[1]);
  for (const pid_t writer : writers) {
    int status = -1;
    EXPECT_EQ(writer, waitpid(writer, &status, 0));
    EXPECT_EQ(0, status);
  }
}

// The log cannot begin anew while somebody reads what is in it: writing goes on all the same, a
// little slower.
TEST_F(DatabaseLog, GrowsWhileAReaderStaysAndNobodyWaitsForHim) {
  const Db reader = Connect(path_);
  const Db writer = Connect(path_);
  ASSERT_EQ(0, Execute(writer, kPragmas));
  ASSERT_EQ(0, Execute(writer, kWrite));
  ASSERT_EQ(0, Execute(reader, "BEGIN; SELECT COUNT(*) FROM t"));
  while (Size() < kBound / 2) {
    ASSERT_EQ(0, Execute(writer, kWrite));
  }
  for (int i = 0; i < 5; ++i) {
    const auto begin = steady_clock::now();
    ASSERT_EQ(0, Execute(writer, kWrite));
    EXPECT_LT(steady_clock::now() - begin, std::chrono::seconds(9));
  }
  EXPECT_GT(Size(), kBound / 2);
  ASSERT_EQ(0, Execute(reader, "ROLLBACK"));
  ASSERT_EQ(0, Execute(writer, kWrite));  // folds all of it back
  const std::uintmax_t longest = Size();
  ASSERT_EQ(0, Execute(writer, kWrite));  // is written to the beginning
  EXPECT_EQ(longest, Size());
}

// Folding back by force does not wait for others; what SQLite does next waits again.
TEST_F(DatabaseLog, WhatFollowsALongLogWaitsAsEver) {
  const Db other = Connect(path_);
  const Db writer = Connect(path_);
  ASSERT_EQ(0, Execute(writer, kPragmas));
  ASSERT_EQ(0, Execute(writer, kWrite));
  ASSERT_EQ(0, Execute(other, "BEGIN; SELECT COUNT(*) FROM t"));  // keeps the log growing
  while (Size() < kBound / 2) {
    ASSERT_EQ(0, Execute(writer, kWrite));
  }
  ASSERT_EQ(0, Execute(other, "ROLLBACK"));
  ASSERT_EQ(0, Execute(writer, kWrite));
  ASSERT_EQ(0, Execute(other, "BEGIN IMMEDIATE"));
  std::thread end([&] {
    std::this_thread::sleep_for(milliseconds(500));
    Execute(other, "COMMIT");
  });
  EXPECT_EQ(SQLITE_OK, sqlite3_exec(writer->sqlite, kWrite, nullptr, nullptr, nullptr));
  end.join();
}

}  // namespace
