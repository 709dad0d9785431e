#include <gtest/gtest.h>
#include <internal/condition_private.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/result.h>

#include <climits>
#include <locale>
#include <string>
#include <tuple>
#include <type_traits>
#include <vector>

#include "support/class_layout.h"
#include "test_files.h"

namespace tuvo_test {

using TUVO::sharing::db::ConditionPrivate;
auto MembersOf(const ConditionPrivate&);
template struct Reveal<ConditionPrivate, &ConditionPrivate::wheres_, &ConditionPrivate::orders_,
                       &ConditionPrivate::offset_, &ConditionPrivate::limit_>;

}  // namespace tuvo_test

namespace {

using tuvo_test::MembersOf;

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using Ids = std::vector<int>;

class ConditionTest : public testing::Test {
 protected:
  ConditionTest() : db_(tuvo_test::NewPath("/tmp/condition.db"), 0660), condition_(db_) {}

  // Six rows: id 1 to 6, a = id modulo 2, b = id modulo 3.
  void Fill() {
    ASSERT_TRUE(db_.Execute("CREATE TABLE t (id INTEGER PRIMARY KEY, a INTEGER, b INTEGER)"));
    ASSERT_TRUE(
        db_.Execute("INSERT INTO t VALUES (1,1,1),(2,0,2),(3,1,0),(4,0,1),(5,1,2),(6,0,0)"));
  }

  // The ids that the condition leaves, in its order.
  Ids Selected() {
    Ids ids;
    Result result;
    EXPECT_TRUE(db_.Execute("SELECT id FROM t" + condition_.GetSQL(), result))
        << db_.GetLastQuery() << ": " << db_.GetLastError();
    Row row;
    while (result.NextRow(row)) {
      ids.push_back(row.GetField("id").AsInt(0));
    }
    return ids;
  }

  std::string Sql() const { return condition_.GetSQL(); }

  BaseDB db_;
  Condition condition_;
};

TEST_F(ConditionTest, AFreshOneIsEmptyAndSaysNothing) {
  EXPECT_TRUE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), "");
}

TEST_F(ConditionTest, ARawClauseIsWrittenAsItIs) {
  condition_.Where("a = 'it''s' OR (b)");
  EXPECT_FALSE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), " WHERE a = 'it''s' OR (b)");
}

TEST_F(ConditionTest, AnEqualityQuotesColumnAndValueAndEscapesBoth) {
  condition_.Where("owner", "it's");
  EXPECT_EQ(Sql(), " WHERE `owner` = 'it''s'");
  condition_.Clear();
  condition_.Where("own'er", "x");
  EXPECT_EQ(Sql(), " WHERE `own''er` = 'x'");
}

TEST_F(ConditionTest, AnEmptyValueIsKept) {
  condition_.Where("owner", "");
  EXPECT_FALSE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), " WHERE `owner` = ''");
}

TEST_F(ConditionTest, EmptyColumnsAndEmptyRawClausesAddNothing) {
  condition_.Where("");
  condition_.Where("", "value");
  condition_.Where("", "");
  condition_.OrWhere("");
  condition_.OrWhere("", "value");
  EXPECT_TRUE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), "");
}

TEST_F(ConditionTest, ClausesAreJoinedByTheirOwnWord) {
  condition_.Where("a", "1");
  condition_.Where("b = 2");
  condition_.OrWhere("c", "3");
  condition_.OrWhere("d = 4");
  condition_.Where("e", "5");
  EXPECT_EQ(Sql(), " WHERE `a` = '1' AND b = 2 OR `c` = '3' OR d = 4 AND `e` = '5'");
}

TEST_F(ConditionTest, TheFirstClausesOwnWordIsNeverUsed) {
  condition_.OrWhere("a = 1");
  EXPECT_EQ(Sql(), " WHERE a = 1");
  condition_.Clear();
  condition_.OrWhere("a", "1");
  condition_.Where("b", "2");
  EXPECT_EQ(Sql(), " WHERE `a` = '1' AND `b` = '2'");
}

TEST_F(ConditionTest, SortKeysFollowInTheirOrder) {
  condition_.OrderBy("a", true);
  EXPECT_FALSE(condition_.IsEmpty());
  condition_.OrderBy("b", false);
  EXPECT_EQ(Sql(), " ORDER BY a ASC,b DESC");
}

TEST_F(ConditionTest, ASortKeyIsEscapedNotQuotedAndNeverIgnored) {
  condition_.OrderBy("a'b", true);
  EXPECT_EQ(Sql(), " ORDER BY a''b ASC");
  condition_.Clear();
  condition_.OrderBy("", false);
  EXPECT_FALSE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), " ORDER BY  DESC");
}

TEST_F(ConditionTest, TheFirstNumberIsTheRowsSkippedTheSecondTheRowsReturned) {
  condition_.Limit(5, 10);
  EXPECT_FALSE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), " LIMIT 10 OFFSET 5");
}

TEST_F(ConditionTest, NumbersOfZeroAndBelowAreNotWritten) {
  condition_.Limit(0, 0);
  EXPECT_EQ(Sql(), "");
  EXPECT_FALSE(condition_.IsEmpty()) << "but something was set";
  condition_.Limit(0, 10);
  EXPECT_EQ(Sql(), " LIMIT 10");
  condition_.Limit(-5, 10);
  EXPECT_EQ(Sql(), " LIMIT 10");
  condition_.Limit(1, 1);
  EXPECT_EQ(Sql(), " LIMIT 1 OFFSET 1");
}

TEST_F(ConditionTest, AnOffsetWithoutALimitIsWrittenAndFails) {
  Fill();
  condition_.Limit(5, -1);
  EXPECT_EQ(Sql(), " OFFSET 5");
  EXPECT_FALSE(db_.Execute("SELECT * FROM t" + Sql()));
}

TEST_F(ConditionTest, MinusOneForBothIsTheSameAsNothing) {
  condition_.Limit(3, 4);
  condition_.Limit(-1, -1);
  EXPECT_TRUE(condition_.IsEmpty());
}

TEST_F(ConditionTest, OneOfTheTwoIsEnoughNotToBeEmpty) {
  condition_.Limit(-1, 0);
  EXPECT_FALSE(condition_.IsEmpty());
  condition_.Limit(0, -1);
  EXPECT_FALSE(condition_.IsEmpty());
}

TEST_F(ConditionTest, PagesCountFromOne) {
  condition_.Page(1, 20);
  EXPECT_EQ(Sql(), " LIMIT 20");
  condition_.Page(2, 10);
  EXPECT_EQ(Sql(), " LIMIT 10 OFFSET 10");
  condition_.Page(7, 3);
  EXPECT_EQ(Sql(), " LIMIT 3 OFFSET 18");
}

TEST_F(ConditionTest, APageBelowTheFirstSkipsNothing) {
  condition_.Page(0, 10);
  EXPECT_EQ(Sql(), " LIMIT 10");
  EXPECT_FALSE(condition_.IsEmpty());
  condition_.Page(-3, 10);
  EXPECT_EQ(Sql(), " LIMIT 10");
}

TEST_F(ConditionTest, ANegativeSizeIsNotWritten) {
  condition_.Page(1, -10);
  EXPECT_EQ(Sql(), "");
  condition_.Page(-1, -10);
  EXPECT_EQ(Sql(), " OFFSET 20");
}

// Page(1, -1) leaves an offset of 0, which is not the unset -1.
TEST_F(ConditionTest, ThePageOfSizeMinusOneIsStillSomething) {
  condition_.Page(1, -1);
  EXPECT_FALSE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), "");
}

TEST_F(ConditionTest, AbsurdPagesWrapAround) {
  condition_.Page(50000, 50000);
  EXPECT_EQ(Sql(), " LIMIT 50000");
  condition_.Page(100001, 50000);
  EXPECT_EQ(Sql(), " LIMIT 50000 OFFSET 705032704");
  condition_.Page(INT_MAX, INT_MAX);
  EXPECT_EQ(Sql(), " LIMIT 2147483647");
  condition_.Page(INT_MIN, INT_MAX);
  EXPECT_EQ(Sql(), " LIMIT 2147483647 OFFSET 1");
  condition_.Page(INT_MIN, INT_MIN);
  EXPECT_EQ(Sql(), "");
}

TEST_F(ConditionTest, AllPartsStandInTheirOrder) {
  condition_.Page(2, 10);
  condition_.OrderBy("id", false);
  condition_.Where("owner", "it's");
  condition_.OrWhere("enabled = 1");
  EXPECT_EQ(Sql(), " WHERE `owner` = 'it''s' OR enabled = 1 ORDER BY id DESC LIMIT 10 OFFSET 10");
}

TEST_F(ConditionTest, RenderingChangesNothing) {
  condition_.Where("a", "1");
  condition_.OrderBy("a", true);
  condition_.Page(2, 2);
  const std::string first = Sql();
  EXPECT_EQ(Sql(), first);
  EXPECT_FALSE(condition_.IsEmpty());
}

TEST_F(ConditionTest, ClearForgetsEverything) {
  condition_.Where("a", "1");
  condition_.OrWhere("b = 1");
  condition_.OrderBy("a", true);
  condition_.Limit(1, 2);
  condition_.Clear();
  EXPECT_TRUE(condition_.IsEmpty());
  EXPECT_EQ(Sql(), "");
  condition_.OrWhere("c = 3");
  EXPECT_EQ(Sql(), " WHERE c = 3");
}

TEST_F(ConditionTest, ItsTableHasTheDestructorAloneAndItHoldsOnePointer) {
  EXPECT_TRUE(std::has_virtual_destructor_v<Condition>);
  EXPECT_EQ(sizeof(Condition), 2 * sizeof(void*));
  if (tuvo_test::kTablesCanBeRead) {
    EXPECT_EQ(tuvo_test::SlotCount<Condition>(), 2U);
  }
}

// In front of them stands the connection, a reference.
TEST_F(ConditionTest, ItsFieldsStandInTheirOrder) {
  const TUVO::sharing::db::ConditionPrivate fields(db_);
  EXPECT_TRUE(tuvo_test::StandInThisOrder(fields, MembersOf(fields)));
  using Types = tuvo_test::TypesOf<decltype(MembersOf(fields))>;
  EXPECT_TRUE((std::is_same_v<std::tuple_element_t<2, Types>, int>));
  EXPECT_TRUE((std::is_same_v<std::tuple_element_t<3, Types>, int>));
}

// A structured binding names all members in their order.
TEST_F(ConditionTest, AClauseKeepsColumnValueRawTextAndItsWord) {
  TUVO::sharing::db::ConditionPrivate fields(db_);
  fields.Where("a", "1", true);
  const auto& clauses = fields.*std::get<0>(MembersOf(fields));
  const auto& clause = clauses.at(0);
  EXPECT_TRUE(
      (std::is_same_v<decltype(clauses), const std::vector<std::decay_t<decltype(clause)>>&>));
  const auto& [column, value, raw, is_and] = clause;
  EXPECT_TRUE((std::is_same_v<decltype(column), const std::string>));
  EXPECT_TRUE((std::is_same_v<decltype(value), const std::string>));
  EXPECT_TRUE((std::is_same_v<decltype(raw), const std::string>));
  EXPECT_TRUE((std::is_same_v<decltype(is_and), const bool>));
  EXPECT_EQ(&column, &clause.column);
  EXPECT_EQ(&value, &clause.value);
  EXPECT_EQ(&raw, &clause.raw);
  EXPECT_EQ(&is_and, &clause.is_and);
}

TEST_F(ConditionTest, ASortKeyKeepsColumnAndDirection) {
  TUVO::sharing::db::ConditionPrivate fields(db_);
  fields.OrderBy("a", true);
  const auto& keys = fields.*std::get<1>(MembersOf(fields));
  const auto& key = keys.at(0);
  EXPECT_TRUE((std::is_same_v<decltype(keys), const std::vector<std::decay_t<decltype(key)>>&>));
  const auto& [column, ascending] = key;
  EXPECT_TRUE((std::is_same_v<decltype(column), const std::string>));
  EXPECT_TRUE((std::is_same_v<decltype(ascending), const bool>));
  EXPECT_EQ(&column, &key.column);
  EXPECT_EQ(&ascending, &key.ascending);
}

TEST_F(ConditionTest, CannotBeCopied) {
  static_assert(!std::is_copy_constructible_v<Condition>);
  static_assert(!std::is_copy_assignable_v<Condition>);
}

TEST_F(ConditionTest, TheDatabaseUnderstandsIt) {
  Fill();
  condition_.Where("a", "1");
  EXPECT_EQ(Selected(), (Ids{1, 3, 5}));
  condition_.OrWhere("b", "0");
  condition_.OrderBy("id", false);
  EXPECT_EQ(Selected(), (Ids{6, 5, 3, 1}));
  condition_.Page(2, 3);
  EXPECT_EQ(Selected(), Ids{1});
}

TEST_F(ConditionTest, AndBindsTighterThanOr) {
  Fill();
  condition_.Where("a", "1");
  condition_.OrWhere("a", "0");
  condition_.Where("b", "0");
  condition_.OrderBy("id", true);
  EXPECT_EQ(Selected(), (Ids{1, 3, 5, 6}));
}

TEST_F(ConditionTest, AValueCannotGetOutOfItsQuotes) {
  Fill();
  condition_.Where("a", "1' OR '1'='1");
  EXPECT_EQ(Selected(), Ids{});
  condition_.Clear();
  condition_.Where("a", std::string("1\0' OR 1=1", 10));
  EXPECT_EQ(Sql(), " WHERE `a` = '1'");
}

// Escaping needs no open file, so a filter may be made all the same.
TEST(Condition, WorksOnADatabaseThatIsNotGood) {
  BaseDB db("/tmp/no such folder/x.db", 0660);
  Condition condition(db);
  condition.Where("a", "it's");
  EXPECT_EQ(condition.GetSQL(), " WHERE `a` = 'it''s'");
}

// Groups digits, as a program with a local taste might.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST_F(ConditionTest, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  condition_.Limit(1234567, 7654321);
  EXPECT_EQ(Sql(), " LIMIT 7654321 OFFSET 1234567");
  std::locale::global(former);
}

}  // namespace
