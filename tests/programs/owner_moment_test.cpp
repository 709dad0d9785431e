#include "owner/moment.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace owner {
namespace {

constexpr std::time_t kNow = 1700000000;

// In a zone with summer time, so that a fixed distance to UTC would be found out.
class OwnerMoment : public testing::Test {
 protected:
  void SetUp() override {
    setenv("TZ", "CET-1CEST,M3.5.0,M10.5.0/3", 1);
    tzset();
  }
  void TearDown() override {
    unsetenv("TZ");
    tzset();
  }

  static std::optional<std::time_t> Parse(std::string_view text) {
    return ParseMoment(text, kNow, DayPart::kFirstSecond);
  }
};

TEST_F(OwnerMoment, LocalTimeIsRead) {
  EXPECT_EQ(Parse("2026-01-02 03:04:05"), 1767319445);  // 02:04:05 UTC
}

TEST_F(OwnerMoment, SummerTimeIsThatOfTheDay) {
  EXPECT_EQ(Parse("2026-07-02 03:04:05"), 1782954245);  // 01:04:05 UTC
}

TEST_F(OwnerMoment, SecondsMayBeLeftOut) {
  EXPECT_EQ(Parse("2026-01-02 03:04"), Parse("2026-01-02 03:04:00"));
}

TEST_F(OwnerMoment, LetterMayStandForTheBlank) {
  EXPECT_EQ(Parse("2026-01-02T03:04:05"), Parse("2026-01-02 03:04:05"));
  EXPECT_EQ(Parse("2026-01-02T03:04"), Parse("2026-01-02 03:04:00"));
}

TEST_F(OwnerMoment, DateAloneIsItsFirstSecondAsAStart) {
  EXPECT_EQ(ParseMoment("2026-01-02", kNow, DayPart::kFirstSecond), Parse("2026-01-02 00:00:00"));
}

TEST_F(OwnerMoment, DateAloneIsItsLastSecondAsAnEnd) {
  EXPECT_EQ(ParseMoment("2026-01-02", kNow, DayPart::kLastSecond), Parse("2026-01-02 23:59:59"));
}

TEST_F(OwnerMoment, TimeOfDayCountsForAnEndToo) {
  EXPECT_EQ(ParseMoment("2026-01-02 05:00", kNow, DayPart::kLastSecond),
            Parse("2026-01-02 05:00:00"));
}

TEST_F(OwnerMoment, SpansCountFromNow) {
  EXPECT_EQ(Parse("+90s"), kNow + 90);
  EXPECT_EQ(Parse("+30m"), kNow + 1800);
  EXPECT_EQ(Parse("+12h"), kNow + 43200);
  EXPECT_EQ(Parse("+7d"), kNow + 604800);
  EXPECT_EQ(Parse("+2w"), kNow + 1209600);
  EXPECT_EQ(Parse("+0s"), kNow);
}

TEST_F(OwnerMoment, OtherTextsAreNoTime) {
  for (const char* text : {"",
                           "+",
                           "+d",
                           "+7",
                           "+-7d",
                           "+7x",
                           "+7d ",
                           " +7d",
                           "++7d",
                           "+7.5d",
                           "7d",
                           "-7d",
                           "now",
                           "2026",
                           "2026-01",
                           "2026-1-2",
                           "2026-01-02 ",
                           "2026-01-02 03",
                           "2026-01-02 03:0",
                           "2026-01-02 3:04",
                           "2026-01-02 03:04:5",
                           "2026-01-02 03:04:05Z",
                           "2026-01-02 03:04:05.1",
                           "2026/01/02",
                           "02.01.2026",
                           "2026-01-02_03:04",
                           "2026-01-02 24:00",
                           "2026-01-02 03:60",
                           "2026-01-02 03:04:60",
                           "+2026-01-02"}) {
    EXPECT_EQ(Parse(text), std::nullopt) << text;
  }
}

TEST_F(OwnerMoment, DatesThatDoNotExistAreRefused) {
  EXPECT_EQ(Parse("2026-02-29 12:00"), std::nullopt);
  EXPECT_NE(Parse("2028-02-29 12:00"), std::nullopt);
  EXPECT_EQ(Parse("2026-13-01 12:00"), std::nullopt);
  EXPECT_EQ(Parse("2026-00-01 12:00"), std::nullopt);
  EXPECT_EQ(Parse("2026-04-31"), std::nullopt);
  EXPECT_EQ(Parse("2026-04-00"), std::nullopt);
}

TEST_F(OwnerMoment, LastMomentOfTheFileIsTheLastOne) {
  EXPECT_EQ(Parse("2038-01-19 04:14:07"), kLastMoment);
  EXPECT_EQ(Parse("2038-01-19 04:14:08"), std::nullopt);
  EXPECT_EQ(Parse("2099-01-01"), std::nullopt);
  EXPECT_EQ(Parse("9999-12-31 23:59:59"), std::nullopt);
}

TEST_F(OwnerMoment, NothingLiesBeforeTheEpoch) {
  EXPECT_EQ(Parse("1970-01-01 01:00:00"), std::nullopt);  // 0 is "not set"
  EXPECT_EQ(Parse("1970-01-01 01:00:01"), 1);
  EXPECT_EQ(Parse("1969-12-31 23:59:59"), std::nullopt);
  EXPECT_EQ(Parse("0000-01-01"), std::nullopt);
}

TEST_F(OwnerMoment, SpansBeyondTheLastMomentAreRefused) {
  EXPECT_EQ(Parse("+447483647s"), kLastMoment);
  EXPECT_EQ(Parse("+447483648s"), std::nullopt);
  EXPECT_EQ(Parse("+2147483647w"), std::nullopt);
  EXPECT_EQ(Parse("+99999999999999999999s"), std::nullopt);
}

TEST_F(OwnerMoment, TextOfAMomentIsLocalTime) {
  EXPECT_EQ(MomentText(1767319445), "2026-01-02 03:04:05");
}

TEST_F(OwnerMoment, NoMomentHasNoText) {
  EXPECT_EQ(MomentText(0), "");
}

}  // namespace
}  // namespace owner
