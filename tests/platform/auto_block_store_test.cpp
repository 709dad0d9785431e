#include "auto_block_store.h"

#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <ctime>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>

namespace {

time_t clock_time = 0;  // what time() answers in place of the clock; 0: the real time

}  // namespace

// Stands in front of the C library's for this program.
extern "C" __attribute__((visibility("default"))) time_t time(time_t* out) noexcept {
  timespec now{clock_time, 0};
  if (clock_time == 0) {
    clock_gettime(CLOCK_REALTIME, &now);
  }
  if (out != nullptr) {
    *out = now.tv_sec;
  }
  return now.tv_sec;
}

namespace tuvo_platform {
namespace {

constexpr char kPath[] = "/tmp/autoblock-store-test.db";
constexpr char kVisitor[] = "192.0.2.1";

int KeepFirst(void* out, int /*columns*/, char** texts, char** /*names*/) {
  auto* text = static_cast<std::string*>(out);
  if (text->empty() && texts[0] != nullptr) {
    *text = texts[0];
  }
  return 0;
}

// Runs SQL on the file behind the store's back; the first value of its answer.
std::string Sql(const std::string& sql) {
  sqlite3* database = nullptr;
  EXPECT_EQ(sqlite3_open(kPath, &database), SQLITE_OK);
  std::string first;
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), KeepFirst, &first, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  sqlite3_close(database);
  return first;
}

class AutoBlockStoreTest : public testing::Test {
 protected:
  void SetUp() override { unlink(kPath); }
  void TearDown() override {
    unlink(kPath);
    clock_time = 0;
  }

  static void Count(const std::string& network, int times, const AutoBlockLimits& limits,
                    const std::string& service = "WEB") {
    for (int i = 0; i < times; ++i) {
      AutoBlockStore(kPath).CountFailure(network, service, limits);
    }
  }
  static bool IsDenied(const std::string& network) {
    return AutoBlockStore(kPath).IsDenied(network);
  }

  AutoBlockLimits limits_;
};

TEST_F(AutoBlockStoreTest, FileIsCreatedWithItsModeWhateverTheMask) {
  const mode_t mask = umask(0777);
  AutoBlockStore store(kPath);
  umask(mask);
  struct stat status {};
  ASSERT_EQ(stat(kPath, &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0660u);
}

TEST_F(AutoBlockStoreTest, NoFileIsLeftBesideTheStore) {
  Count(kVisitor, 1, limits_);
  EXPECT_NE(access((std::string(kPath) + "-journal").c_str(), F_OK), 0);
  EXPECT_NE(access((std::string(kPath) + "-wal").c_str(), F_OK), 0);
}

TEST_F(AutoBlockStoreTest, LastFailureOfTheLimitDenies) {
  Count(kVisitor, 9, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
  EXPECT_FALSE(IsDenied("192.0.2.2"));
}

TEST_F(AutoBlockStoreTest, OneFailureCanBeTheLimit) {
  limits_.failures = 1;
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, FailuresOlderThanTheWindowDoNotCount) {
  Count(kVisitor, 9, limits_);
  Sql("UPDATE failure SET at = at - 302");
  Count(kVisitor, 9, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "9");
}

TEST_F(AutoBlockStoreTest, FailuresWithinTheWindowCount) {
  Count(kVisitor, 9, limits_);
  Sql("UPDATE failure SET at = at - 290");
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, AFailureAsOldAsTheWindowStillCounts) {
  clock_time = 1000000;
  Count(kVisitor, 9, limits_);
  clock_time += static_cast<time_t>(limits_.window_seconds);
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, AFailureASecondOlderThanTheWindowIsForgotten) {
  clock_time = 1000000;
  Count(kVisitor, 9, limits_);
  clock_time += static_cast<time_t>(limits_.window_seconds) + 1;
  Count(kVisitor, 1, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "1");
}

TEST_F(AutoBlockStoreTest, ADenialLastsItsSecondsToTheLast) {
  clock_time = 1000000;
  Count(kVisitor, 10, limits_);
  clock_time += static_cast<time_t>(limits_.block_seconds) - 1;
  EXPECT_TRUE(IsDenied(kVisitor));
  clock_time += 1;
  EXPECT_FALSE(IsDenied(kVisitor));
}

// The moment at which it ends is the first at which failures count again.
TEST_F(AutoBlockStoreTest, FailuresCountAgainAsSoonAsTheDenialEnds) {
  clock_time = 1000000;
  Count(kVisitor, 10, limits_);
  clock_time += static_cast<time_t>(limits_.block_seconds);
  Count(kVisitor, 10, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, TheWindowSlides) {
  Count(kVisitor, 5, limits_);
  Sql("UPDATE failure SET at = at - 200");
  Count(kVisitor, 4, limits_);
  Sql("UPDATE failure SET at = at - 150");  // the first five are out, the other four are not
  Count(kVisitor, 5, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, DenialEndsAndTheCountBeginsAnew) {
  limits_.window_seconds = 1000000;
  Count(kVisitor, 10, limits_);
  ASSERT_TRUE(IsDenied(kVisitor));
  Sql("UPDATE denial SET until = until - 1790");
  EXPECT_TRUE(IsDenied(kVisitor));
  Sql("UPDATE denial SET until = until - 11");
  EXPECT_FALSE(IsDenied(kVisitor));
  Count(kVisitor, 9, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  Count(kVisitor, 1, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, FailuresWhileDeniedNeitherLoseNorLengthenTheDenial) {
  Count(kVisitor, 10, limits_);
  Sql("UPDATE denial SET until = until - 1000");
  const std::string until = Sql("SELECT until FROM denial");
  Count(kVisitor, 25, limits_);
  EXPECT_TRUE(IsDenied(kVisitor));
  EXPECT_EQ(Sql("SELECT until FROM denial"), until);
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "0");
}

TEST_F(AutoBlockStoreTest, ServicesCountApartAndDenialHoldsForAll) {
  Count(kVisitor, 9, limits_, "WEB");
  Count(kVisitor, 9, limits_, "FTP");
  EXPECT_FALSE(IsDenied(kVisitor));
  Count(kVisitor, 1, limits_, "FTP");
  EXPECT_TRUE(IsDenied(kVisitor));
}

TEST_F(AutoBlockStoreTest, VisitorsCountApart) {
  Count(kVisitor, 9, limits_);
  Count("192.0.2.2", 9, limits_);
  EXPECT_FALSE(IsDenied(kVisitor));
  EXPECT_FALSE(IsDenied("192.0.2.2"));
}

TEST_F(AutoBlockStoreTest, ForgettingLiftsTheDenialOfThatVisitorOnly) {
  Count(kVisitor, 10, limits_);
  Count("192.0.2.2", 10, limits_);
  AutoBlockStore(kPath).Forget(kVisitor);
  EXPECT_FALSE(IsDenied(kVisitor));
  EXPECT_TRUE(IsDenied("192.0.2.2"));
}

TEST_F(AutoBlockStoreTest, ForgettingNothingDoesNotWaitForAWriter) {
  Count("192.0.2.2", 1, limits_);
  sqlite3* writer = nullptr;
  ASSERT_EQ(sqlite3_open(kPath, &writer), SQLITE_OK);
  EXPECT_EQ(sqlite3_exec(writer, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr), SQLITE_OK);
  EXPECT_NO_THROW(AutoBlockStore(kPath).Forget(kVisitor));  // the wait would end in an exception
  sqlite3_close(writer);
}

TEST_F(AutoBlockStoreTest, ForgettingClearsTheCountAtEveryService) {
  Count(kVisitor, 9, limits_, "WEB");
  Count(kVisitor, 9, limits_, "FTP");
  Count("192.0.2.2", 9, limits_, "WEB");
  AutoBlockStore(kPath).Forget(kVisitor);
  Count(kVisitor, 1, limits_, "WEB");
  Count(kVisitor, 1, limits_, "FTP");
  EXPECT_FALSE(IsDenied(kVisitor));
  Count("192.0.2.2", 1, limits_, "WEB");
  EXPECT_TRUE(IsDenied("192.0.2.2"));
}

TEST_F(AutoBlockStoreTest, AnyVisitorsFailureRemovesWhatIsOver) {
  limits_.failures = 2;
  Count("192.0.2.2", 1, limits_);
  Count("192.0.2.3", 2, limits_);
  Sql("UPDATE failure SET at = at - 302; UPDATE denial SET until = until - 1801");
  Count(kVisitor, 1, limits_);
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "1");
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM denial"), "0");
}

TEST_F(AutoBlockStoreTest, TimesInTheFutureAreTakenAsLateAsTheyCanBe) {
  limits_.failures = 2;
  Count("192.0.2.2", 1, limits_);
  Count("192.0.2.3", 2, limits_);
  Sql("UPDATE failure SET at = at + 1000000; UPDATE denial SET until = until + 1000000");
  Count(kVisitor, 1, limits_);
  const int64_t now = time(nullptr);
  EXPECT_LE(std::stoll(Sql("SELECT MAX(at) FROM failure")), now);
  EXPECT_LE(std::stoll(Sql("SELECT until FROM denial")), now + limits_.block_seconds);
  EXPECT_TRUE(IsDenied("192.0.2.3"));
}

TEST_F(AutoBlockStoreTest, RowsAreBounded) {
  AutoBlockStore{kPath};
  const std::string now = std::to_string(time(nullptr));
  Sql("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 60000) "
      "INSERT INTO failure (network, service, at) SELECT '2001:db8:0:' || i || '::/64', 'WEB', " +
      now + " FROM n");
  Sql("WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 60000) "
      "INSERT INTO denial (network, until) SELECT '2001:db8:1:' || i || '::/64', " +
      now + " + 1000 FROM n");
  limits_.failures = 1;
  Count(kVisitor, 1, limits_);
  limits_.failures = 10;
  Count("192.0.2.2", 1, limits_);
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), std::to_string(kMaxAutoBlockRows));
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM denial"), std::to_string(kMaxAutoBlockRows - 1));
  EXPECT_TRUE(IsDenied(kVisitor));
  EXPECT_FALSE(IsDenied("2001:db8:1:1::/64"));
  EXPECT_TRUE(IsDenied("2001:db8:1:60000::/64"));
  struct stat status {};
  ASSERT_EQ(stat(kPath, &status), 0);
  RecordProperty("bytes", static_cast<int>(status.st_size));
  EXPECT_LT(status.st_size, 20 << 20);
}

TEST_F(AutoBlockStoreTest, CorruptFileThrows) {
  std::ofstream(kPath) << std::string(8192, 'x');
  EXPECT_THROW(IsDenied(kVisitor), std::runtime_error);
  EXPECT_THROW(Count(kVisitor, 1, limits_), std::runtime_error);
}

TEST_F(AutoBlockStoreTest, UnknownLayoutThrows) {
  AutoBlockStore{kPath};
  Sql("PRAGMA user_version = 2");
  EXPECT_THROW(IsDenied(kVisitor), std::runtime_error);
}

TEST_F(AutoBlockStoreTest, DanglingLinkIsNotFollowed) {
  ASSERT_EQ(symlink("/tmp/autoblock-elsewhere.db", kPath), 0);
  EXPECT_THROW(IsDenied(kVisitor), std::runtime_error);
  EXPECT_NE(access("/tmp/autoblock-elsewhere.db", F_OK), 0);
}

TEST_F(AutoBlockStoreTest, FailedChangeIsUndoneWhole) {
  limits_.failures = 2;
  Count(kVisitor, 1, limits_);
  Sql("CREATE TRIGGER refuse BEFORE INSERT ON denial BEGIN SELECT RAISE(FAIL, 'no'); END");
  EXPECT_THROW(Count(kVisitor, 1, limits_), std::runtime_error);
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "1");
}

TEST_F(AutoBlockStoreTest, QuotesInServiceNamesAreMereText) {
  limits_.failures = 2;
  Count(kVisitor, 1, limits_, "x'); DELETE FROM failure; --");
  EXPECT_EQ(Sql("SELECT service FROM failure"), "x'); DELETE FROM failure; --");
}

}  // namespace
}  // namespace tuvo_platform
