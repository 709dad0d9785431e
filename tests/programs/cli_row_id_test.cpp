#include "cli/row_id.h"

#include <gtest/gtest.h>
#include <tuvosharing/result.h>
#include <tuvosharing/sharing_db.h>

#include <limits>

namespace cli {
namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;

RowId Read(const std::string& number) {
  Result result;
  Row row;
  EXPECT_TRUE(SharingDB::Instance().Execute("SELECT " + number + " AS id", result));
  EXPECT_TRUE(result.NextRow(row));
  return RowIdOf(row);
}

TEST(CliRowId, EveryNumberOfTheDatabaseIsRead) {
  EXPECT_EQ(Read("7"), 7);
  EXPECT_EQ(Read("3000000000"), 3000000000);
  EXPECT_EQ(Read("-5"), -5);
  EXPECT_EQ(Read("9223372036854775807"), std::numeric_limits<RowId>::max());
  EXPECT_EQ(Read("-9223372036854775808"), std::numeric_limits<RowId>::min());
}

TEST(CliRowId, UsualNumbersAreThoseOfTheLibrary) {
  EXPECT_TRUE(IsUsualId(1));
  EXPECT_TRUE(IsUsualId(2147483647));
  EXPECT_FALSE(IsUsualId(0));
  EXPECT_FALSE(IsUsualId(-1));
  EXPECT_FALSE(IsUsualId(2147483648));
}

TEST(CliRowId, AllRowsAreBehindNone) {
  EXPECT_EQ(BehindRow("id", std::nullopt), "1");
  EXPECT_EQ(BehindRow("t.id", -5), "t.id > -5");
}

}  // namespace
}  // namespace cli
