#include "cgi_urlencoded.h"

#include <gtest/gtest.h>

#include <string>
#include <string_view>

namespace tuvo_platform {
namespace {

using std::string_view_literals::operator""sv;

std::string Clean(std::string_view text) {
  size_t fields_left = 100;
  return CleanUrlEncoded(text, &fields_left).value_or("refused");
}

TEST(CgiUrlEncoded, OrdinaryFieldsStayAsTheyAre) {
  EXPECT_EQ(Clean("a=1&b=%C3%A4+x&c=&d=x=y"), "a=1&b=%C3%A4+x&c=&d=x=y");
  EXPECT_EQ(Clean(""), "");
}

TEST(CgiUrlEncoded, SemicolonBecomesPartOfTheValue) {
  EXPECT_EQ(Clean("password=a;b&x;y=1"), "password=a%3Bb&x%3By=1");
}

TEST(CgiUrlEncoded, FieldWithoutEqualsSignGetsAnEmptyValue) {
  EXPECT_EQ(Clean("a"), "a=");
  EXPECT_EQ(Clean("a&b=1&c"), "a=&b=1&c=");
}

TEST(CgiUrlEncoded, EmptyPiecesAreNoFields) {
  size_t fields_left = 2;
  EXPECT_EQ(CleanUrlEncoded("&&a=1&&&b=2&", &fields_left), "a=1&b=2");
  EXPECT_EQ(fields_left, 0u);
}

TEST(CgiUrlEncoded, BadEscapesAreRefused) {
  for (const std::string_view text : {"a=%", "a=1%", "a=%4", "a=%zz", "a=%4g", "a=%g4", "%=1",
                                      "a=%%41", "a=% 41", "a=%\xc3\xa4"}) {
    EXPECT_EQ(Clean(text), "refused") << text;
  }
}

TEST(CgiUrlEncoded, ZeroBytesAreRefused) {
  for (const std::string_view text : {"a=%00"sv, "%00=a"sv, "a=x%00y"sv, "a=\0"sv, "\0"sv}) {
    EXPECT_EQ(Clean(text), "refused") << text;
  }
}

TEST(CgiUrlEncoded, EscapedPercentBeforeTwoZerosIsNoZeroByte) {
  EXPECT_EQ(Clean("a=%2500"), "a=%2500");
}

TEST(CgiUrlEncoded, MoreFieldsThanLeftAreRefused) {
  size_t fields_left = 2;
  EXPECT_TRUE(CleanUrlEncoded("a=1&b=2", &fields_left));
  fields_left = 2;
  EXPECT_FALSE(CleanUrlEncoded("a=1&b=2&c", &fields_left));
}

}  // namespace
}  // namespace tuvo_platform
