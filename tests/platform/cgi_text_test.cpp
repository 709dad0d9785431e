#include "cgi_text.h"

#include <gtest/gtest.h>

#include <string_view>

namespace tuvo_platform {
namespace {

using std::string_view_literals::operator""sv;

TEST(CgiText, TakeUntilReturnsWhatPrecedesTheSeparator) {
  std::string_view rest = "a;b;c";
  EXPECT_EQ(TakeUntil(';', &rest), "a");
  EXPECT_EQ(rest, "b;c");
}

TEST(CgiText, TakeUntilTakesAllWithoutSeparator) {
  std::string_view rest = "abc";
  EXPECT_EQ(TakeUntil(';', &rest), "abc");
  EXPECT_EQ(rest, "");
  EXPECT_EQ(TakeUntil(';', &rest), "");
}

TEST(CgiText, TakeUntilAtATrailingSeparatorLeavesNothing) {
  std::string_view rest = "abc;";
  EXPECT_EQ(TakeUntil(';', &rest), "abc");
  EXPECT_EQ(rest, "");
}

TEST(CgiText, TrimBlanksTakesSpacesAndTabsFromBothEnds) {
  EXPECT_EQ(TrimBlanks(" \ta b\t "), "a b");
  EXPECT_EQ(TrimBlanks(" \t "), "");
  EXPECT_EQ(TrimBlanks(""), "");
  EXPECT_EQ(TrimBlanks("\na\r"), "\na\r");
}

TEST(CgiText, ComparisonIgnoresTheCaseOfAsciiLettersOnly) {
  EXPECT_TRUE(EqualsIgnoringCase("Multipart/FORM-data", "multipart/form-data"));
  EXPECT_FALSE(EqualsIgnoringCase("form", "form-data"));
  EXPECT_FALSE(EqualsIgnoringCase("form-data", "form"));
  EXPECT_FALSE(EqualsIgnoringCase("\xe4", "\xc4"));
  EXPECT_FALSE(EqualsIgnoringCase("@", "`"));
  EXPECT_FALSE(EqualsIgnoringCase("[", "{"));
}

TEST(CgiText, ZeroByteIsSeenAnywhere) {
  EXPECT_TRUE(HoldsZeroByte("\0"sv));
  EXPECT_TRUE(HoldsZeroByte("ab\0"sv));
  EXPECT_FALSE(HoldsZeroByte("ab"));
  EXPECT_FALSE(HoldsZeroByte(""));
}

}  // namespace
}  // namespace tuvo_platform
