#include "visitor/http_date.h"

#include <gtest/gtest.h>

#include <limits>

namespace visitor {
namespace {

constexpr std::time_t kSample = 784111777;

TEST(VisitorHttpDate, IsWrittenInTheFixedForm) {
  EXPECT_EQ(HttpDate(kSample), "Sun, 06 Nov 1994 08:49:37 GMT");
}

TEST(VisitorHttpDate, TimeWithoutAYearHasNoDate) {
  if (sizeof(std::time_t) == 4) {
    GTEST_SKIP() << "a time of 32 bits always has a year";
  }
  EXPECT_EQ(HttpDate(std::numeric_limits<std::time_t>::max()), "");
}

TEST(VisitorHttpDate, AllThreeFormsAreRead) {
  EXPECT_EQ(ParseHttpDate("Sun, 06 Nov 1994 08:49:37 GMT"), kSample);
  EXPECT_EQ(ParseHttpDate("Sunday, 06-Nov-94 08:49:37 GMT"), kSample);
  EXPECT_EQ(ParseHttpDate("Sun Nov  6 08:49:37 1994"), kSample);
}

TEST(VisitorHttpDate, OtherTextsAreNone) {
  for (const char* text : {"", "yesterday", "784111777", "Sun, 06 Nov 1994 08:49:37",
                           "Sun, 06 Nov 1994 08:49:37 GMT+1", "Sun, 06 Foo 1994 08:49:37 GMT"}) {
    EXPECT_EQ(ParseHttpDate(text), std::nullopt) << text;
  }
}

}  // namespace
}  // namespace visitor
