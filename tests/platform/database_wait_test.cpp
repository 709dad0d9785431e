// How often a locked file is looked at.
#include <gtest/gtest.h>
#include <tuvoplatform/database.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <ctime>
#include <functional>
#include <thread>
#include <vector>

#include "platform/database_handles.h"
#include "platform/temp_folder.h"

namespace {

using std::chrono::microseconds;
using std::chrono::milliseconds;

// Every pause that this thread has been asked to make.
thread_local std::vector<microseconds>* pauses = nullptr;

void Note(microseconds pause) {
  if (pauses != nullptr) {
    pauses->push_back(pause);
  }
}

}  // namespace

// In place of the system's, for SQLite's own waiting as well.
extern "C" __attribute__((visibility("default"))) int nanosleep(const timespec* pause,
                                                                timespec* left) {
  Note(std::chrono::seconds(pause->tv_sec) + microseconds(pause->tv_nsec / 1000));
  return clock_nanosleep(CLOCK_MONOTONIC, 0, pause, left) == 0 ? 0 : -1;
}
extern "C" __attribute__((visibility("default"))) int usleep(useconds_t pause) {
  const timespec time{static_cast<time_t>(pause / 1000000),
                      static_cast<long>(pause % 1000000) * 1000};
  return nanosleep(&time, nullptr);
}

namespace {

using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Execute;
using tuvo_test::TempFolder;

// Among many who want the file, those who have just come would otherwise always find it before
// those who have waited long, until these give up.
TEST(DatabaseWait, WhoeverHasWaitedLongerLooksMoreOften) {
  const TempFolder folder;
  const Db holder = Connect(folder / "test.db");
  const Db db = Connect(folder / "test.db");
  ASSERT_EQ(0, Execute(holder, "PRAGMA journal_mode = WAL; CREATE TABLE t (a); BEGIN IMMEDIATE"));
  std::thread end([&] {
    std::this_thread::sleep_for(milliseconds(4000));
    Execute(holder, "COMMIT");
  });
  std::vector<microseconds> all;
  pauses = &all;
  EXPECT_EQ(0, Execute(db, "INSERT INTO t VALUES (1)"));
  pauses = nullptr;
  end.join();
  ASSERT_FALSE(all.empty());
  const auto longest = std::max_element(all.begin(), all.end());
  EXPECT_LE(longest->count(), 10000);
  EXPECT_TRUE(std::is_sorted(longest, all.end(), std::greater<>()));
  EXPECT_LE(all.front().count(), 1000);  // most locks are short
  EXPECT_LE(all.back().count(), 1000);
}

}  // namespace
