// The purge that sessions and tokens share.
#include <gtest/gtest.h>
#include <internal/purge.h>
#include <tuvosharing/base_db.h>

#include <ctime>
#include <string>

#include "sqlite_file.h"
#include "statement_time.h"
#include "test_files.h"

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::PurgeTimedOut;
using tuvo_test::SqliteFile;

constexpr char kPath[] = "/tmp/purge.db";

class Purge : public testing::Test {
 protected:
  Purge() : db_(tuvo_test::NewPath(kPath), 0660) {
    EXPECT_TRUE(db_.Execute("CREATE TABLE thing (id INTEGER PRIMARY KEY, timeout INTEGER)"));
    EXPECT_TRUE(db_.Execute("CREATE TABLE other (id INTEGER PRIMARY KEY, timeout INTEGER)"));
    EXPECT_TRUE(db_.Execute("INSERT INTO other VALUES (1, 1)"));
  }

  void Add(std::time_t timeout) { ASSERT_TRUE(db_.Insert("thing", {std::to_string(timeout)})); }

  static std::string Count(const std::string& table) {
    return SqliteFile(kPath).Value("SELECT COUNT(*) FROM " + table);
  }

  BaseDB db_;
};

TEST_F(Purge, DeletesTheRowsOfTheTableThatTimedOutBeforeThisSecond) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM thing"));
    Add(now - 1);
    Add(now);
    Add(now + 1);
    EXPECT_TRUE(PurgeTimedOut(db_, "thing", 1.0F));
  });
  EXPECT_EQ(Count("thing"), "2");
  EXPECT_EQ(Count("other"), "1");
}

TEST_F(Purge, TheStatementNamesTheTableAndQuotesTheSecond) {
  tuvo_test::ExpectStatementOfNow([&] { return PurgeTimedOut(db_, "thing", 1.0F); },
                                  [&] { return db_.GetLastQuery(); },
                                  "DELETE FROM thing WHERE timeout < 'NOW'");
}

// The text of the time must be compared as a number, whatever its number of digits.
TEST_F(Purge, TheQuotedTimeIsComparedAsANumber) {
  Add(9);
  Add(2147483647);
  EXPECT_TRUE(PurgeTimedOut(db_, "thing", 1.0F));
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT timeout FROM thing"), "2147483647");
}

TEST_F(Purge, ARowWithoutATimeoutStays) {
  ASSERT_TRUE(db_.Execute("INSERT INTO thing VALUES (NULL, NULL)"));
  EXPECT_TRUE(PurgeTimedOut(db_, "thing", 1.0F));
  EXPECT_EQ(Count("thing"), "1");
}

TEST_F(Purge, WithAProbabilityOfZeroNothingRuns) {
  Add(1);
  const std::string before = db_.GetLastQuery();
  EXPECT_TRUE(PurgeTimedOut(db_, "thing", 0.0F));
  EXPECT_TRUE(PurgeTimedOut(db_, "no such table", 0.0F));
  EXPECT_EQ(db_.GetLastQuery(), before);
  EXPECT_EQ(Count("thing"), "1");
}

// Each call throws anew: with one half, 200 calls give neither 0 nor 200 hits.
TEST_F(Purge, WithAProbabilityBetweenOnlySomeCallsRun) {
  int runs = 0;
  for (int i = 0; i < 200; ++i) {
    ASSERT_TRUE(db_.Execute("SELECT 1"));
    EXPECT_TRUE(PurgeTimedOut(db_, "thing", 0.5F));
    runs += db_.GetLastQuery() == "SELECT 1" ? 0 : 1;
  }
  EXPECT_GT(runs, 30);
  EXPECT_LT(runs, 170);
}

TEST_F(Purge, AFailedStatementAnswersFalse) {
  EXPECT_FALSE(PurgeTimedOut(db_, "missing", 1.0F));
}

}  // namespace
