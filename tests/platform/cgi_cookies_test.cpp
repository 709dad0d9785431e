#include "cgi_cookies.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace tuvo_platform {
namespace {

using Cookies = std::vector<CgiField>;

TEST(CgiCookies, EachPairIsACookie) {
  EXPECT_EQ(ParseCookies("id=abc; sharing_sid=x_Y-9"),
            (Cookies{{"id", "abc"}, {"sharing_sid", "x_Y-9"}}));
  EXPECT_EQ(ParseCookies(""), Cookies{});
}

TEST(CgiCookies, BlanksAroundNamesAndValuesAreTrimmed) {
  EXPECT_EQ(ParseCookies("\t a = b c \t;d=e;  f=g"),
            (Cookies{{"a", "b c"}, {"d", "e"}, {"f", "g"}}));
}

TEST(CgiCookies, FirstEqualsSignEndsTheName) {
  EXPECT_EQ(ParseCookies("a=b=c=="), (Cookies{{"a", "b=c=="}}));
}

TEST(CgiCookies, QuotesAroundAValueAreTakenOff) {
  EXPECT_EQ(ParseCookies("a=\"b\"; c=\"\"; d=\"; e=x\"y\""),
            (Cookies{{"a", "b"}, {"c", ""}, {"d", "\""}, {"e", "x\"y\""}}));
}

TEST(CgiCookies, NothingIsDecoded) {
  EXPECT_EQ(ParseCookies("a=%41+%00"), (Cookies{{"a", "%41+%00"}}));
}

TEST(CgiCookies, PiecesThatAreNoPairsArePassedOver) {
  EXPECT_EQ(ParseCookies(";;x;  ; =y; =; a=b;"), (Cookies{{"a", "b"}}));
}

TEST(CgiCookies, EmptyValueIsAValue) {
  EXPECT_EQ(ParseCookies("a="), (Cookies{{"a", ""}}));
}

TEST(CgiCookies, EqualNamesStayInTheirOrder) {
  const Cookies cookies = ParseCookies("a=1; a=2");
  EXPECT_EQ(cookies, (Cookies{{"a", "1"}, {"a", "2"}}));
  EXPECT_STREQ(FindCgiField(cookies, "a"), "1");
}

}  // namespace
}  // namespace tuvo_platform
