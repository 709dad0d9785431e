// Who frees a result and how its rows are walked. This program counts, and answers, the platform's
// calls itself.
#include <gtest/gtest.h>
#include <tuvoplatform/database.h>
#include <tuvosharing/result.h>

#include <string>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::db::Result;
auto MembersOf(const Result&);
template struct Reveal<Result, &Result::row_, &Result::result_>;

}  // namespace tuvo_test

// Three rows, number 10, 20 and 30.
struct DBResult_tag {
  std::vector<unsigned int> rows{10, 20, 30};
  size_t next = 0;
};

namespace {

std::vector<DBResult_tag*> freed;
int row_answer = 0;                          // for a row that is there
std::vector<const DBResult_tag*> read_from;  // whose fields were asked for
std::vector<unsigned int> cursors;           // as they came in with each step
std::vector<const DBResult_tag*> walked;

}  // namespace

extern "C" {

int TUVODBFetchRow(DBResult_tag* result, unsigned int* row) {
  walked.push_back(result);
  cursors.push_back(*row);
  if (result == nullptr || result->next == result->rows.size()) {
    return -1;
  }
  *row = result->rows[result->next++];
  return row_answer;
}

const char* TUVODBFetchField(DBResult_tag* result, unsigned int row, const char* name) {
  read_from.push_back(result);
  static std::string text;
  text = std::to_string(row) + name;
  return text.c_str();
}

void TUVODBFreeResult(DBResult_tag* result) {
  freed.push_back(result);
}

}  // extern "C"

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using tuvo_test::MembersOf;

class ResultTest : public testing::Test {
 protected:
  ResultTest() {
    freed.clear();
    cursors.clear();
    walked.clear();
    read_from.clear();
    row_answer = 0;
  }

  static std::string Number(const Row& row) { return row.GetField("").AsString(""); }

  DBResult_tag handle_;
  DBResult_tag other_;
};

TEST_F(ResultTest, WithoutAHandleItIsNotGoodHasNoRowsAndFreesNothing) {
  {
    Result result;
    EXPECT_FALSE(result.IsGood());
    Row row;
    EXPECT_FALSE(result.NextRow(row));
    EXPECT_FALSE(row.IsGood());
  }
  EXPECT_EQ(walked, std::vector<const DBResult_tag*>{nullptr}) << "the platform is asked";
  EXPECT_TRUE(freed.empty());
}

TEST_F(ResultTest, AHandleFromTheConstructorIsFreedOnce) {
  {
    const Result result(&handle_);
    EXPECT_TRUE(result.IsGood());
  }
  EXPECT_EQ(freed, std::vector<DBResult_tag*>{&handle_});
}

TEST_F(ResultTest, AHandleThatWasSetIsFreedOnce) {
  {
    Result result;
    result.SetResult(&handle_);
    EXPECT_TRUE(result.IsGood());
  }
  EXPECT_EQ(freed, std::vector<DBResult_tag*>{&handle_});
}

TEST_F(ResultTest, AHandleThatIsReplacedIsNotFreed) {
  {
    Result result(&handle_);
    result.SetResult(&other_);
    EXPECT_TRUE(freed.empty());
  }
  EXPECT_EQ(freed, std::vector<DBResult_tag*>{&other_});
}

TEST_F(ResultTest, AHandleReplacedByNoneIsNotFreed) {
  {
    Result result(&handle_);
    result.SetResult(nullptr);
    EXPECT_FALSE(result.IsGood());
  }
  EXPECT_TRUE(freed.empty());
}

TEST_F(ResultTest, RowsAreWalkedInOrderAndCarryHandleAndCursor) {
  Result result(&handle_);
  Row row;
  std::vector<std::string> numbers;
  while (result.NextRow(row)) {
    EXPECT_TRUE(row.IsGood());
    numbers.push_back(Number(row));
  }
  EXPECT_EQ(numbers, (std::vector<std::string>{"10", "20", "30"}));
}

TEST_F(ResultTest, TheCursorBeginsAtZeroAndIsThePlatformsOwnAfterwards) {
  Result result(&handle_);
  Row row;
  while (result.NextRow(row)) {
  }
  EXPECT_EQ(cursors, (std::vector<unsigned int>{0, 10, 20, 30}));
}

TEST_F(ResultTest, BehindTheLastRowTheRowIsLeftAsItWas) {
  Result result(&handle_);
  Row row;
  while (result.NextRow(row)) {
  }
  EXPECT_FALSE(result.NextRow(row));
  EXPECT_TRUE(row.IsGood());
  EXPECT_EQ(Number(row), "30");
}

TEST_F(ResultTest, EveryAnswerButMinusOneIsARow) {
  handle_.rows = {0, 1, 2, 3};
  Result result(&handle_);
  Row row;
  for (const int answer : {0, 1, -2, 101}) {
    row_answer = answer;
    EXPECT_TRUE(result.NextRow(row)) << answer;
  }
  EXPECT_EQ(Number(row), "3");
}

// A Result serves one statement; whoever gives it another handle goes on where the first stopped.
TEST_F(ResultTest, AnotherHandleLeavesTheCursor) {
  Result result(&handle_);
  Row row;
  EXPECT_TRUE(result.NextRow(row));
  result.SetResult(&other_);
  EXPECT_TRUE(result.NextRow(row));
  EXPECT_EQ(cursors, (std::vector<unsigned int>{0, 10}));
  EXPECT_EQ(walked.back(), &other_);
}

TEST_F(ResultTest, ARowAsksItsResultForAFieldAndWithoutOneNobody) {
  EXPECT_EQ(Row(&handle_, 7).GetField("name").AsString(""), "7name");
  EXPECT_EQ(Row(nullptr, 7).GetField("name").AsString(""), "");
  EXPECT_EQ(Row().GetField("name").AsString(""), "");
  EXPECT_EQ(read_from, std::vector<const DBResult_tag*>{&handle_});
}

TEST_F(ResultTest, ItsTableHasTheDestructorAloneAndTheCursorStandsBeforeTheHandle) {
  const Result result;
  EXPECT_TRUE(std::has_virtual_destructor_v<Result>);
  EXPECT_TRUE(tuvo_test::StandInThisOrder(result, MembersOf(result)));
  EXPECT_TRUE((std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(result))>,
                              std::tuple<unsigned int, DBResult_tag*>>));
  EXPECT_EQ(sizeof(Result), 3 * sizeof(void*)) << "the table's pointer and these two";
  if (tuvo_test::kTablesCanBeRead) {
    EXPECT_EQ(tuvo_test::SlotCount<Result>(), 2U);
  }
}

TEST_F(ResultTest, CannotBeCopied) {
  static_assert(!std::is_copy_constructible_v<Result>);
  static_assert(!std::is_copy_assignable_v<Result>);
}

TEST_F(ResultTest, MovingHandsTheHandleOverWithItsPlace) {
  {
    Result source(&handle_);
    Row row;
    EXPECT_TRUE(source.NextRow(row));
    Result target(std::move(source));
    EXPECT_FALSE(source.IsGood());  // NOLINT(bugprone-use-after-move): what a move leaves is told
    EXPECT_TRUE(target.NextRow(row));
    EXPECT_EQ(Number(row), "20");
    EXPECT_EQ(cursors, (std::vector<unsigned int>{0, 10}));
  }
  EXPECT_EQ(freed, std::vector<DBResult_tag*>{&handle_});
}

TEST_F(ResultTest, MovingOntoAnotherFreesWhatThatHeld) {
  {
    Result source(&handle_);
    Result target(&other_);
    target = std::move(source);
    EXPECT_EQ(freed, std::vector<DBResult_tag*>{&other_});
    EXPECT_TRUE(target.IsGood());
    EXPECT_FALSE(source.IsGood());  // NOLINT(bugprone-use-after-move)
  }
  EXPECT_EQ(freed, (std::vector<DBResult_tag*>{&other_, &handle_}));
}

TEST_F(ResultTest, MovingOntoAnotherHandsThePlaceOver) {
  Result source(&handle_);
  Row row;
  EXPECT_TRUE(source.NextRow(row));
  Result target;
  target = std::move(source);
  EXPECT_TRUE(target.NextRow(row));
  EXPECT_EQ(cursors, (std::vector<unsigned int>{0, 10}));
}

TEST_F(ResultTest, MovingOntoItselfKeepsTheHandle) {
  {
    Result result(&handle_);
    Result& same = result;
    result = std::move(same);
    EXPECT_TRUE(result.IsGood());
    EXPECT_TRUE(freed.empty());
  }
  EXPECT_EQ(freed, std::vector<DBResult_tag*>{&handle_});
}

}  // namespace
