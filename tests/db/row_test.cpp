#include <gtest/gtest.h>
#include <tuvoplatform/database.h>
#include <tuvosharing/row.h>

#include <memory>
#include <string>
#include <tuple>
#include <type_traits>

#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::db::Row;
auto MembersOf(const Row&);
template struct Reveal<Row, &Row::result_, &Row::row_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Field;
using TUVO::sharing::db::Row;
using tuvo_test::MembersOf;

// Two rows of an SQLite database in memory.
class RowTest : public testing::Test {
 protected:
  RowTest()
      : db_(TUVODBConnect("", "", "", ":memory:"), &TUVODBClose),
        result_(Execute("SELECT 1 AS id, 'it''s' AS text, NULL AS none, 5 AS twice, 6 AS twice "
                        "UNION ALL SELECT 2, 'two', 'x', 7, 8"),
                &TUVODBFreeResult) {}

  DBResult_tag* Execute(const char* sql) {
    DBResult_tag* result = nullptr;
    EXPECT_EQ(TUVODBExecute(db_.get(), sql, &result), 0);
    return result;
  }

  std::string Text(const Row& row, const char* name) {
    return row.GetField(name).AsString("default");
  }

  std::unique_ptr<TUVODB, decltype(&TUVODBClose)> db_;
  std::unique_ptr<DBResult_tag, decltype(&TUVODBFreeResult)> result_;
};

TEST_F(RowTest, ADefaultRowIsNotGoodAndReadsAsEmpty) {
  const Row row;
  EXPECT_FALSE(row.IsGood());
  EXPECT_EQ(row.GetField("id").AsInt(5), 5);
  EXPECT_EQ(row.GetField("id").AsUInt(6), 6U);
  EXPECT_EQ(row.GetField("id").AsTime(7), 7);
  EXPECT_EQ(row.GetField("id").AsFloat(1.5F), 1.5F);
  EXPECT_FALSE(row.GetField("id").AsBool(true));
  EXPECT_EQ(Text(row, "id"), "");
}

TEST_F(RowTest, ARowOfAResultGivesItsFieldsByName) {
  const Row first(result_.get(), 0);
  EXPECT_TRUE(first.IsGood());
  EXPECT_EQ(Text(first, "id"), "1");
  EXPECT_EQ(Text(first, "text"), "it's");
  const Row second(result_.get(), 1);
  EXPECT_EQ(Text(second, "id"), "2");
  EXPECT_EQ(Text(second, "none"), "x");
}

TEST_F(RowTest, NullAndUnknownColumnsReadAsEmpty) {
  const Row row(result_.get(), 0);
  EXPECT_EQ(Text(row, "none"), "");
  EXPECT_EQ(Text(row, "missing"), "");
  EXPECT_EQ(Text(row, ""), "");
  EXPECT_EQ(row.GetField("none").AsInt(5), 5);
}

TEST_F(RowTest, ColumnNamesAreComparedByteByByte) {
  const Row row(result_.get(), 0);
  EXPECT_EQ(Text(row, "ID"), "");
  EXPECT_EQ(Text(row, "twice"), "5");
}

TEST_F(RowTest, ARowBehindTheLastReadsAsEmpty) {
  const Row row(result_.get(), 2);
  EXPECT_TRUE(row.IsGood());
  EXPECT_EQ(Text(row, "id"), "");
}

TEST_F(RowTest, TheSettersPointTheRowElsewhere) {
  Row row;
  row.SetResult(result_.get());
  EXPECT_TRUE(row.IsGood());
  EXPECT_EQ(Text(row, "id"), "1");
  row.SetRow(1);
  EXPECT_EQ(Text(row, "id"), "2");
  row.SetResult(nullptr);
  EXPECT_FALSE(row.IsGood());
  EXPECT_EQ(Text(row, "id"), "");
}

TEST_F(RowTest, ACopyIsAnotherViewOfTheSameRow) {
  Row row(result_.get(), 1);
  const Row copy = row;
  row.SetRow(0);
  EXPECT_EQ(Text(copy, "id"), "2");
}

TEST_F(RowTest, TheResultIsBorrowed) {
  { const Row row(result_.get(), 0); }
  EXPECT_EQ(Text(Row(result_.get(), 0), "id"), "1");
}

TEST_F(RowTest, ItsTableHasTheDestructorAloneAndTheResultStandsBeforeTheNumber) {
  const Row row;
  EXPECT_TRUE(std::has_virtual_destructor_v<Row>);
  EXPECT_TRUE(tuvo_test::StandInThisOrder(row, MembersOf(row)));
  EXPECT_TRUE((std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(row))>,
                              std::tuple<DBResult_tag*, unsigned int>>));
  EXPECT_EQ(sizeof(Row), 3 * sizeof(void*)) << "the table's pointer and these two";
  if (tuvo_test::kTablesCanBeRead) {
    EXPECT_EQ(tuvo_test::SlotCount<Row>(), 2U);
  }
}

TEST_F(RowTest, EachFieldIsAFreshOne) {
  const Row row(result_.get(), 0);
  EXPECT_EQ(row.GetField("id").AsInt(0), 1);
  EXPECT_EQ(row.GetField("id").AsInt(0), 1);
}

TEST_F(RowTest, AFieldOutlivesTheResult) {
  const Field field = Row(result_.get(), 0).GetField("text");
  result_.reset();
  EXPECT_EQ(field.AsString(""), "it's");
}

}  // namespace
