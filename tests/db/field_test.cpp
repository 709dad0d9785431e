#include <gtest/gtest.h>
#include <tuvosharing/field.h>

#include <climits>
#include <locale>
#include <sstream>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>

#include "support/class_layout.h"

namespace tuvo_test {

using TUVO::sharing::db::Field;
auto MembersOf(const Field&);
template struct Reveal<Field, &Field::value_, &Field::stream_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::Field;
using tuvo_test::MembersOf;

TEST(Field, AnIntIsRead) {
  EXPECT_EQ(Field("42").AsInt(0), 42);
  EXPECT_EQ(Field("-42").AsInt(0), -42);
  EXPECT_EQ(Field("+42").AsInt(0), 42);
  EXPECT_EQ(Field("2147483647").AsInt(0), INT_MAX);
  EXPECT_EQ(Field("-2147483648").AsInt(0), INT_MIN);
}

TEST(Field, LeadingBlanksAreSkippedAndWhatFollowsIsNotLookedAt) {
  EXPECT_EQ(Field("12abc").AsInt(0), 12);
  EXPECT_EQ(Field(" 7").AsInt(0), 7);
  EXPECT_EQ(Field("\t\n 7 8").AsInt(0), 7);
  EXPECT_EQ(Field("1.9").AsInt(0), 1);
  EXPECT_EQ(Field("010").AsInt(0), 10);
  EXPECT_EQ(Field("0x10").AsInt(5), 0);
}

TEST(Field, WithoutANumberTheDefaultIsGiven) {
  for (const char* text : {"", "abc", " ", "-", "+", "--1", ".5", "true"}) {
    EXPECT_EQ(Field(text).AsInt(5), 5) << text;
    EXPECT_EQ(Field(text).AsUInt(5), 5U) << text;
    EXPECT_EQ(Field(text).AsTime(5), 5) << text;
  }
}

TEST(Field, ANumberThatDoesNotFitGivesTheDefault) {
  EXPECT_EQ(Field("2147483648").AsInt(5), 5);
  EXPECT_EQ(Field("-2147483649").AsInt(5), 5);
  EXPECT_EQ(Field("4294967296").AsUInt(5), 5U);
  EXPECT_EQ(Field("99999999999999999999").AsTime(5), 5);
  EXPECT_EQ(Field("1e999").AsFloat(5.0F), 5.0F);
}

TEST(Field, AnUnsignedIntIsReadAndANegativeOneWraps) {
  EXPECT_EQ(Field("4294967295").AsUInt(0), 4294967295U);
  EXPECT_EQ(Field("-1").AsUInt(0), 4294967295U);
  EXPECT_EQ(Field("1026").AsUInt(0), 1026U);
  EXPECT_EQ(Field("-4294967295").AsUInt(0), 1U);
  EXPECT_EQ(Field("-4294967296").AsUInt(5), 5U);
}

TEST(Field, ATimeIsRead) {
  EXPECT_EQ(Field("1700000000").AsTime(0), 1700000000L);
  EXPECT_EQ(Field("-1").AsTime(0), -1L);
  EXPECT_EQ(Field("").AsTime(0), 0L);
  EXPECT_EQ(Field(std::to_string(LONG_MAX)).AsTime(0), LONG_MAX);
  EXPECT_EQ(Field("2147483647").AsTime(0), 2147483647L);
  EXPECT_EQ(Field(std::to_string(LONG_MAX) + "0").AsTime(5), 5L);
}

TEST(Field, AFloatIsRead) {
  EXPECT_EQ(Field("0.25").AsFloat(0.0F), 0.25F);
  EXPECT_EQ(Field("-1e3").AsFloat(0.0F), -1000.0F);
  EXPECT_EQ(Field("3").AsFloat(0.0F), 3.0F);
  EXPECT_EQ(Field("x").AsFloat(1.5F), 1.5F);
  EXPECT_EQ(Field("").AsFloat(1.5F), 1.5F);
  EXPECT_EQ(Field("nan").AsFloat(1.5F), 1.5F);
  EXPECT_EQ(Field("inf").AsFloat(1.5F), 1.5F);
}

TEST(Field, OnlyTheTextOneIsTrueAndTheDefaultIsNeverUsed) {
  EXPECT_TRUE(Field("1").AsBool(false));
  EXPECT_TRUE(Field("1").AsBool(true));
  for (const char* text : {"", "0", "true", "yes", "01", " 1", "1 ", "11", "TRUE", "-1"}) {
    EXPECT_FALSE(Field(text).AsBool(true)) << text;
  }
}

TEST(Field, TheTextIsTheTextAndTheDefaultIsNeverUsed) {
  EXPECT_EQ(Field("text").AsString("default"), "text");
  EXPECT_EQ(Field("").AsString("default"), "");
  const std::string with_nul("a\0b", 3);
  EXPECT_EQ(Field(with_nul).AsString(""), with_nul);
}

TEST(Field, TheTextIsGivenByReference) {
  const Field field("text");
  EXPECT_EQ(&field.AsString(""), &field.AsString("other"));
}

TEST(Field, ASecondConversionAfterOneThatReadToTheEndGivesTheDefault) {
  Field field("42");
  EXPECT_EQ(field.AsInt(0), 42);
  EXPECT_EQ(field.AsInt(0), 0);
  EXPECT_EQ(field.AsUInt(7), 7U);
  EXPECT_EQ(field.AsTime(8), 8);
  EXPECT_EQ(field.AsFloat(9.0F), 9.0F);
  EXPECT_EQ(field.AsString(""), "42");
}

TEST(Field, ASecondConversionAfterAFailedOneGivesTheDefault) {
  Field field("abc");
  EXPECT_EQ(field.AsInt(1), 1);
  EXPECT_EQ(field.AsInt(2), 2);
  Field too_long("99999999999 ");
  EXPECT_EQ(too_long.AsInt(1), 1);
  EXPECT_EQ(too_long.AsFloat(2.0F), 2.0F) << "which alone would have read it";
}

TEST(Field, AConversionThatStoppedBeforeTheEndCanBeRepeated) {
  Field field("12abc");
  EXPECT_EQ(field.AsInt(0), 12);
  EXPECT_EQ(field.AsUInt(0), 12U);
  EXPECT_EQ(field.AsTime(0), 12);
}

TEST(Field, ClearDoesNotMendTheState) {
  Field field("42");
  EXPECT_EQ(field.AsInt(0), 42);
  field.Clear();
  EXPECT_EQ(field.AsInt(5), 5);
}

TEST(Field, BoolAndTextDoNotSpoilANumber) {
  Field field("1");
  EXPECT_TRUE(field.AsBool(false));
  EXPECT_EQ(field.AsString(""), "1");
  EXPECT_EQ(field.AsInt(0), 1);
  EXPECT_TRUE(field.AsBool(false)) << "and a number does not spoil the bool";
}

TEST(Field, ACopyStartsAfresh) {
  Field used("42");
  EXPECT_EQ(used.AsInt(0), 42);
  Field copy(used);
  EXPECT_EQ(copy.AsInt(0), 42);
  EXPECT_EQ(used.AsInt(0), 0);
}

TEST(Field, AnAssignedFieldStartsAfresh) {
  Field used("42");
  EXPECT_EQ(used.AsInt(0), 42);
  Field other("7");
  EXPECT_EQ(other.AsInt(0), 7);
  other = used;
  EXPECT_EQ(other.AsInt(0), 42);
  EXPECT_EQ(other.AsString(""), "42");
}

TEST(Field, AssigningAFieldToItselfChangesNothing) {
  Field field("42");
  Field& same = field;
  field = same;
  EXPECT_EQ(field.AsInt(0), 42);
}

TEST(Field, ItsTableHasTheDestructorAloneAndTheTextStandsBeforeTheStream) {
  const Field field("42");
  EXPECT_TRUE(std::has_virtual_destructor_v<Field>);
  EXPECT_TRUE(tuvo_test::StandInThisOrder(field, MembersOf(field)));
  EXPECT_TRUE((std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(field))>,
                              std::tuple<std::string, std::stringstream>>));
  EXPECT_EQ(sizeof(Field), sizeof(void*) + sizeof(std::string) + sizeof(std::stringstream));
  if (tuvo_test::kTablesCanBeRead) {
    EXPECT_EQ(tuvo_test::SlotCount<Field>(), 2U);
  }
}

// Groups digits and has another decimal point and other words for booleans.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  char do_decimal_point() const override { return ','; }
  std::string do_grouping() const override { return "\3"; }
  std::string do_truename() const override { return "1"; }
};

TEST(Field, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  EXPECT_EQ(Field("1234567").AsInt(0), 1234567);
  EXPECT_EQ(Field("1.234").AsInt(0), 1);
  EXPECT_EQ(Field("4294967295").AsUInt(0), 4294967295U);
  EXPECT_EQ(Field("1700000000").AsTime(0), 1700000000L);
  EXPECT_EQ(Field("0.25").AsFloat(0.0F), 0.25F);
  EXPECT_EQ(Field("0,25").AsFloat(1.0F), 0.0F);
  Field assigned("");
  assigned = Field("1234567");
  EXPECT_EQ(assigned.AsInt(0), 1234567);
  Field copy(assigned);
  EXPECT_EQ(copy.AsInt(0), 1234567);
  std::locale::global(former);
}

}  // namespace
