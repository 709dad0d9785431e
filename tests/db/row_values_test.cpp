// Columns read without a Field answer what the Field would have answered.
#include <gtest/gtest.h>
#include <internal/row_values.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>

#include <string>

#include "db/test_files.h"

namespace TUVO::sharing::db {
namespace {

const char* const kTexts[] = {"0",
                              "1",
                              "-1",
                              "-0",
                              "+7",
                              "007",
                              " 12",
                              "12 ",
                              "12abc",
                              "abc",
                              "",
                              "-",
                              "--1",
                              "1.9",
                              "1e3",
                              "0x10",
                              "999999999",
                              "1700000000",
                              "2147483647",
                              "2147483648",
                              "-2147483647",
                              "-2147483648",
                              "-2147483649",
                              "4294967295",
                              "4294967296",
                              "9223372036854775807",
                              "9223372036854775808",
                              "-9223372036854775808",
                              "-9223372036854775809",
                              "99999999999999999999999"};

class RowValuesTest : public testing::Test {
 protected:
  RowValuesTest()
      : db_(tuvo_test::NewPath(std::string(tuvo_test::kPrivateFolder) + "values.db"), 0660) {}

  // A row with `text` in column "a".
  Row RowOf(const std::string& text) {
    result_ = Result();
    EXPECT_TRUE(db_.Execute("SELECT '" + text + "' AS a", result_));
    Row row;
    EXPECT_TRUE(result_.NextRow(row));
    return row;
  }

  BaseDB db_;
  Result result_;
};

TEST_F(RowValuesTest, NumbersAreWhatFieldsSay) {
  for (const char* const text : kTexts) {
    const Row row = RowOf(text);
    const RowValues values(row);
    EXPECT_EQ(row.GetField("a").AsInt(42), values.Int("a", 42)) << text;
    EXPECT_EQ(row.GetField("a").AsUInt(42), values.UInt("a", 42)) << text;
    EXPECT_EQ(row.GetField("a").AsTime(42), values.Time("a", 42)) << text;
  }
}

TEST_F(RowValuesTest, TextsAreWhatFieldsSay) {
  for (const char* const text : kTexts) {
    const Row row = RowOf(text);
    EXPECT_EQ(row.GetField("a").AsString(""), RowValues(row).Text("a"));
  }
}

TEST_F(RowValuesTest, WhatIsNotThereIsEmpty) {
  const Row row = RowOf("1");
  EXPECT_EQ("", RowValues(row).Text("b"));
  EXPECT_EQ(42, RowValues(row).Int("b", 42));
  const Row none;
  EXPECT_EQ("", RowValues(none).Text("a"));
  EXPECT_EQ(42, RowValues(none).Time("a", 42));
}

}  // namespace
}  // namespace TUVO::sharing::db
