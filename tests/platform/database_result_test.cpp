#include <gtest/gtest.h>
#include <malloc.h>
#include <tuvoplatform/database.h>

#include <chrono>
#include <cstdlib>
#include <string>

#include "platform/database_handles.h"
#include "platform/temp_folder.h"

namespace {

using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Query;
using tuvo_test::Rows;
using tuvo_test::TempFolder;

class DatabaseResult : public ::testing::Test {
 protected:
  std::string Field(const Rows& rows, unsigned int row, const char* name) {
    return TUVODBFetchField(rows.get(), row, name);
  }

  TempFolder folder_;
  Db db_ = Connect(folder_ / "test.db");
};

TEST_F(DatabaseResult, FetchRowStepsThroughTheRowsFromTheFirst) {
  const Rows rows = Query(db_, "SELECT 'a' AS v UNION ALL SELECT 'b' UNION ALL SELECT 'c'");
  std::string seen;
  unsigned int row = 99;
  while (TUVODBFetchRow(rows.get(), &row) == 0) {
    seen += std::to_string(row) + Field(rows, row, "v");
  }
  EXPECT_EQ("0a1b2c", seen);
}

TEST_F(DatabaseResult, FetchRowLeavesTheRowAloneAtTheEnd) {
  const Rows rows = Query(db_, "SELECT 1 AS v");
  unsigned int row = 99;
  EXPECT_EQ(0, TUVODBFetchRow(rows.get(), &row));
  EXPECT_EQ(0U, row);
  row = 99;
  EXPECT_EQ(-1, TUVODBFetchRow(rows.get(), &row));
  EXPECT_EQ(-1, TUVODBFetchRow(rows.get(), &row));
  EXPECT_EQ(99U, row);
}

TEST_F(DatabaseResult, FetchRowOfNullAndOfNoRowsHasNone) {
  unsigned int row = 99;
  EXPECT_EQ(-1, TUVODBFetchRow(nullptr, &row));
  const Rows rows = Query(db_, "SELECT 1 AS v WHERE 0");
  ASSERT_NE(nullptr, rows);
  EXPECT_EQ(-1, TUVODBFetchRow(rows.get(), &row));
  EXPECT_EQ(99U, row);
}

TEST_F(DatabaseResult, FetchRowWithoutAPlaceForTheIndexDoesNotStep) {
  const Rows rows = Query(db_, "SELECT 1 AS v");
  EXPECT_EQ(-1, TUVODBFetchRow(rows.get(), nullptr));
  unsigned int row = 99;
  EXPECT_EQ(0, TUVODBFetchRow(rows.get(), &row));
}

TEST_F(DatabaseResult, EveryTypeReadsAsText) {
  const Rows rows = Query(db_,
                          "SELECT 42 AS i, -9223372036854775808 AS low, 1.5 AS r, 'text' AS t,"
                          " x'616263' AS b, 'M\xc3\xbcller''s' AS u");
  EXPECT_EQ("42", Field(rows, 0, "i"));
  EXPECT_EQ("-9223372036854775808", Field(rows, 0, "low"));
  EXPECT_EQ("1.5", Field(rows, 0, "r"));
  EXPECT_EQ("text", Field(rows, 0, "t"));
  EXPECT_EQ("abc", Field(rows, 0, "b"));
  EXPECT_EQ("M\xc3\xbcller's", Field(rows, 0, "u"));
}

TEST_F(DatabaseResult, NullAndEmptyValuesReadAsEmptyText) {
  const Rows rows = Query(db_, "SELECT NULL AS n, '' AS t, x'' AS b, 'end' AS e");
  EXPECT_EQ("", Field(rows, 0, "n"));
  EXPECT_EQ("", Field(rows, 0, "t"));
  EXPECT_EQ("", Field(rows, 0, "b"));
  EXPECT_EQ("end", Field(rows, 0, "e"));
}

TEST_F(DatabaseResult, ValueReadsAsFarAsAZeroInIt) {
  const Rows rows = Query(db_,
                          "SELECT 'ab' || char(0) || 'cd' AS t, x'6162006364' AS b,"
                          " char(0) || 'x' AS z, 'next' AS n");
  EXPECT_EQ("ab", Field(rows, 0, "t"));
  EXPECT_EQ("ab", Field(rows, 0, "b"));
  EXPECT_EQ("", Field(rows, 0, "z"));
  EXPECT_EQ("next", Field(rows, 0, "n"));
}

TEST_F(DatabaseResult, UnknownColumnsAndRowsReadAsEmptyText) {
  const Rows rows = Query(db_, "SELECT 1 AS v");
  EXPECT_EQ("", Field(rows, 0, "w"));
  EXPECT_EQ("", Field(rows, 0, ""));
  EXPECT_EQ("", Field(rows, 0, nullptr));
  EXPECT_EQ("", Field(rows, 1, "v"));
  EXPECT_EQ("", Field(rows, 4294967295U, "v"));
  EXPECT_STREQ("", TUVODBFetchField(nullptr, 0, "v"));
  const Rows none = Query(db_, "SELECT 1 AS v WHERE 0");
  EXPECT_EQ("", Field(none, 0, "v"));
}

TEST_F(DatabaseResult, ColumnNamesAreComparedByteByByte) {
  const Rows rows = Query(db_, "SELECT 1 AS Name, 2 AS name, 3 AS \"COUNT(*)\", 4 AS nam");
  EXPECT_EQ("1", Field(rows, 0, "Name"));
  EXPECT_EQ("2", Field(rows, 0, "name"));
  EXPECT_EQ("3", Field(rows, 0, "COUNT(*)"));
  EXPECT_EQ("", Field(rows, 0, "NAME"));
}

TEST_F(DatabaseResult, FirstOfEquallyNamedColumnsCounts) {
  const Rows rows = Query(db_, "SELECT 1 AS v, 2 AS v");
  EXPECT_EQ("1", Field(rows, 0, "v"));
  EXPECT_EQ("1", Field(rows, 0, "v"));  // columns are expected in their order
}

TEST_F(DatabaseResult, RowsCanBeReadInAnyOrderAndAgain) {
  const Rows rows = Query(db_, "VALUES ('a', 'b'), ('c', NULL), ('', 'd')");
  EXPECT_EQ("d", Field(rows, 2, "column2"));
  EXPECT_EQ("a", Field(rows, 0, "column1"));
  EXPECT_EQ("", Field(rows, 1, "column2"));
  EXPECT_EQ("c", Field(rows, 1, "column1"));
  EXPECT_EQ("d", Field(rows, 2, "column2"));
}

TEST_F(DatabaseResult, FieldsStayValidTogether) {
  const Rows rows = Query(db_, "VALUES ('first', 'second')");
  const char* first = TUVODBFetchField(rows.get(), 0, "column1");
  const char* second = TUVODBFetchField(rows.get(), 0, "column2");
  EXPECT_STREQ("first", first);
  EXPECT_STREQ("second", second);
}

TEST_F(DatabaseResult, ResultIsReadableAfterItsConnectionIsClosed) {
  const Rows rows = Query(db_, "SELECT 'kept' AS v");
  db_.reset();
  EXPECT_EQ("kept", Field(rows, 0, "v"));
}

TEST_F(DatabaseResult, ChangedTableShowsItsNewColumns) {
  ASSERT_EQ(0, tuvo_test::Execute(db_, "CREATE TABLE t (a); INSERT INTO t VALUES (1)"));
  EXPECT_EQ("1", Field(Query(db_, "SELECT * FROM t"), 0, "a"));
  {
    const Db other = Connect(folder_ / "test.db");
    ASSERT_EQ(0, tuvo_test::Execute(other, "ALTER TABLE t ADD COLUMN b DEFAULT 'new'"));
  }
  EXPECT_EQ("new", Field(Query(db_, "SELECT * FROM t"), 0, "b"));
}

TEST_F(DatabaseResult, FreeingNullIsAccepted) {
  TUVODBFreeResult(nullptr);
}

TEST_F(DatabaseResult, ForgottenRowsReadAsEmptyTextAndTheOthersStay) {
  const Rows rows = Query(db_, "VALUES ('a', 'b'), ('c', 'd'), ('e', 'f')");
  const char* kept = TUVODBFetchField(rows.get(), 2, "column2");
  TUVODBForgetRows(rows.get(), 2);
  EXPECT_EQ("", Field(rows, 0, "column1"));
  EXPECT_EQ("", Field(rows, 1, "column2"));
  EXPECT_EQ("e", Field(rows, 2, "column1"));
  EXPECT_STREQ("f", kept);
}

TEST_F(DatabaseResult, WhatIsForgottenStaysForgotten) {
  const Rows rows = Query(db_, "VALUES ('a'), ('b'), ('c')");
  TUVODBForgetRows(rows.get(), 2);
  TUVODBForgetRows(rows.get(), 1);
  EXPECT_EQ("", Field(rows, 1, "column1"));
}

TEST_F(DatabaseResult, AllRowsAndMoreCanBeForgotten) {
  const Rows rows = Query(db_, "VALUES ('a'), ('b')");
  TUVODBForgetRows(rows.get(), 1000);
  EXPECT_EQ("", Field(rows, 1, "column1"));
  unsigned int row = 99;
  EXPECT_EQ(0, TUVODBFetchRow(rows.get(), &row));
  EXPECT_EQ(0U, row);
}

TEST_F(DatabaseResult, ForgettingRowsOfNullIsAccepted) {
  TUVODBForgetRows(nullptr, 1);
}

// Texts of all lengths, so that they lie at and across the ends of whatever holds them.
TEST_F(DatabaseResult, RowsAreWholeWhereverTheyLieWhileOthersAreForgotten) {
  const Rows rows = Query(db_,
                          "WITH RECURSIVE c(x) AS (SELECT 0 UNION ALL SELECT x + 1 FROM c LIMIT "
                          "3000) SELECT x AS id, substr(hex(zeroblob(2000)), 1, x) AS text, "
                          "'end' || x AS last FROM c");
  for (unsigned int row = 0; row < 3000; ++row) {
    TUVODBForgetRows(rows.get(), row);
    ASSERT_EQ(std::to_string(row), Field(rows, row, "id"));
    ASSERT_EQ(std::string(row, '0'), Field(rows, row, "text"));
    ASSERT_EQ("end" + std::to_string(row), Field(rows, row, "last"));
  }
}

TEST_F(DatabaseResult, LongNamesOfColumnsStayWhileRowsAreForgotten) {
  std::string sql = "SELECT 'first' AS v";
  for (int i = 0; i < 60; ++i) {
    sql += ", 1 AS a_column_with_a_long_name_" + std::to_string(i);
  }
  const Rows rows = Query(
      db_, sql + ", 'last' AS w UNION ALL SELECT 'x'" + [] {
        std::string row;
        for (int i = 0; i < 60; ++i) {
          row += ", 2";
        }
        return row + ", 'y'";
      }());
  TUVODBForgetRows(rows.get(), 1);
  EXPECT_EQ("2", Field(rows, 1, "a_column_with_a_long_name_59"));
  EXPECT_EQ("y", Field(rows, 1, "w"));
  EXPECT_EQ("x", Field(rows, 1, "v"));
}

size_t HeapInUse() {
  const struct mallinfo2 heap = mallinfo2();
  return heap.uordblks + heap.hblkhd;
}

TEST_F(DatabaseResult, ForgettingRowsGivesTheirMemoryBack) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the address sanitizer's heap does not say what is in use";
#endif
  constexpr size_t kBytes = size_t{20} * 1000 * 1000;
  const Rows rows = Query(db_,
                          "WITH RECURSIVE c(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM c LIMIT "
                          "20000) SELECT hex(zeroblob(500)) AS text FROM c");
  const size_t all = HeapInUse();
  TUVODBForgetRows(rows.get(), 10000);
  const size_t half = HeapInUse();
  EXPECT_GT(all - half, kBytes * 9 / 20);
  TUVODBForgetRows(rows.get(), 20000);
  EXPECT_GT(half - HeapInUse(), kBytes * 9 / 20);
}

// A cost per row that grew with the number of rows would take minutes here.
TEST_F(DatabaseResult, RowsByTheHundredThousandAreQuick) {
  constexpr unsigned int kRows = 300000;
  const auto start = std::chrono::steady_clock::now();
  const Rows rows = Query(db_,
                          "WITH RECURSIVE c(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM c LIMIT "
                          "300000) SELECT x AS id, 'name-' || x AS name, NULL AS none, x * 2 AS "
                          "twice FROM c");
  ASSERT_NE(nullptr, rows);
  unsigned int count = 0;
  for (unsigned int row = 0; TUVODBFetchRow(rows.get(), &row) == 0; ++count) {
    const std::string id = std::to_string(count + 1);
    ASSERT_EQ(id, TUVODBFetchField(rows.get(), row, "id"));
    ASSERT_EQ("name-" + id, TUVODBFetchField(rows.get(), row, "name"));
    ASSERT_STREQ("", TUVODBFetchField(rows.get(), row, "none"));
    ASSERT_EQ(std::to_string(2 * (count + 1)), TUVODBFetchField(rows.get(), row, "twice"));
  }
  EXPECT_EQ(kRows, count);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(20));
}

}  // namespace
