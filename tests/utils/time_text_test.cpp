#include <gtest/gtest.h>
#include <internal/time_text.h>

#include <cstdlib>
#include <ctime>
#include <limits>
#include <string>

namespace {

using TUVO::sharing::TextToTime;
using TUVO::sharing::TimeToText;

constexpr char kFormat[] = "%Y-%m-%d %H:%M:%S";
// 2023-11-14 22:13:20 in Greenwich.
constexpr std::time_t kMoment = 1700000000;

// Winter time one hour east of Greenwich, summer time two, in the north and in the south.
constexpr char kNorth[] = "AAA-1BBB,M3.5.0,M10.5.0/3";
constexpr char kSouth[] = "AAA-1BBB,M10.5.0,M3.5.0/3";
// Summer time all year, and none.
constexpr char kAlwaysSummer[] = "AAA-1BBB,0/0,J365/25";
constexpr char kNeverSummer[] = "AAA-1";

// The time zone for one test. Set without tzset, as a program does that only changes its
// environment.
class Zone {
 public:
  explicit Zone(const char* name) { setenv("TZ", name, 1); }
  ~Zone() { unsetenv("TZ"); }
  Zone(const Zone&) = delete;
  Zone& operator=(const Zone&) = delete;
};

std::time_t InGreenwich(const std::string& text) {
  std::tm parts{};
  strptime(text.c_str(), kFormat, &parts);
  return timegm(&parts);
}

bool IsSummerNow() {
  const std::time_t now = std::time(nullptr);
  return std::localtime(&now)->tm_isdst > 0;
}

TEST(TimeToText, IsLocalTimeUnderTheFormat) {
  const Zone zone(kNeverSummer);
  EXPECT_EQ(TimeToText(kMoment, kFormat), "2023-11-14 23:13:20");
  EXPECT_EQ(TimeToText(kMoment, "%H o'clock"), "23 o'clock");
}

TEST(TimeToText, ZeroIsEmpty) {
  EXPECT_EQ(TimeToText(0, kFormat), "");
}

TEST(TimeToText, OneSecondAroundZeroIsATime) {
  const Zone zone("UTC0");
  EXPECT_EQ(TimeToText(1, kFormat), "1970-01-01 00:00:01");
  EXPECT_EQ(TimeToText(-1, kFormat), "1969-12-31 23:59:59");
}

TEST(TimeToText, FollowsSummerTime) {
  const Zone zone(kNorth);
  EXPECT_EQ(TimeToText(InGreenwich("2024-01-15 12:00:00"), kFormat), "2024-01-15 13:00:00");
  EXPECT_EQ(TimeToText(InGreenwich("2024-07-15 12:00:00"), kFormat), "2024-07-15 14:00:00");
}

// A long-lived program may learn of another zone while it runs.
TEST(TimeToText, AZoneSetLaterCounts) {
  {
    const Zone zone("UTC0");
    EXPECT_EQ(TimeToText(kMoment, kFormat), "2023-11-14 22:13:20");
  }
  const Zone zone("AAA-5");
  EXPECT_EQ(TimeToText(kMoment, kFormat), "2023-11-15 03:13:20");
}

TEST(TimeToText, WhatDoesNotFitIn127BytesIsEmpty) {
  const Zone zone("UTC0");
  EXPECT_EQ(TimeToText(kMoment, std::string(127, 'x').c_str()), std::string(127, 'x'));
  EXPECT_EQ(TimeToText(kMoment, std::string(128, 'x').c_str()), "");
}

TEST(TimeToText, ATimeBeyondAllYearsIsEmpty) {
  if (sizeof(std::time_t) < 8) {
    GTEST_SKIP() << "every time has a year here";
  }
  EXPECT_EQ(TimeToText(std::numeric_limits<std::time_t>::max(), kFormat), "");
}

TEST(TimeToText, AnEmptyOrMissingFormatIsEmpty) {
  EXPECT_EQ(TimeToText(kMoment, ""), "");
  EXPECT_EQ(TimeToText(kMoment, nullptr), "");
}

TEST(TextToTime, IsTheMomentThatTheTextNamesInLocalTime) {
  const Zone zone(kNeverSummer);
  EXPECT_EQ(TextToTime("2023-11-14 23:13:20", kFormat), kMoment);
}

TEST(TextToTime, AnEmptyTextIsZero) {
  EXPECT_EQ(TextToTime("", kFormat), 0);
  EXPECT_EQ(TextToTime("", ""), 0);
}

TEST(TextToTime, ATextThatDoesNotFitTheFormatIsZero) {
  EXPECT_EQ(TextToTime("tomorrow", kFormat), 0);
  EXPECT_EQ(TextToTime("2023-11-14", kFormat), 0);
  EXPECT_EQ(TextToTime("2023-13-14 00:00:00", kFormat), 0);
  EXPECT_EQ(TextToTime("2023-11-14 25:00:00", kFormat), 0);
}

TEST(TextToTime, AMissingFormatIsZero) {
  EXPECT_EQ(TextToTime("2023-11-14 23:13:20", nullptr), 0);
}

TEST(TextToTime, WhatFollowsTheTimeIsNotLookedAt) {
  const Zone zone("UTC0");
  EXPECT_EQ(TextToTime("2023-11-14 22:13:20 or so", kFormat), kMoment);
}

TEST(TextToTime, ADayThatTheMonthDoesNotHaveRunsOn) {
  const Zone zone("UTC0");
  EXPECT_EQ(TextToTime("2023-02-31 00:00:00", kFormat), InGreenwich("2023-03-03 00:00:00"));
}

// A text of the other half of the year is read with today's offset; so it comes back one hour off.
TEST(TextToTime, SummerTimeIsThatOfTodayNotThatOfTheText) {
  for (const char* name : {kNorth, kSouth, kAlwaysSummer, kNeverSummer}) {
    const Zone zone(name);
    const std::time_t offset = IsSummerNow() && name != kNeverSummer ? 7200 : 3600;
    for (const char* text : {"2024-01-15 12:00:00", "2024-07-15 12:00:00"}) {
      // In a zone that has no such time the flag counts for nothing.
      EXPECT_EQ(TextToTime(text, kFormat), InGreenwich(text) - offset) << name << " " << text;
    }
  }
}

TEST(TextToTime, OneOfTheTwoHalvesOfTheWorldHasSummerNow) {
  const Zone north(kNorth);
  const bool north_summer = IsSummerNow();
  const Zone south(kSouth);
  EXPECT_NE(IsSummerNow(), north_summer);
}

TEST(TextToTime, AZoneSetLaterCounts) {
  {
    const Zone zone("UTC0");
    EXPECT_EQ(TextToTime("2023-11-14 22:13:20", kFormat), kMoment);
  }
  const Zone zone("AAA-5");
  EXPECT_EQ(TextToTime("2023-11-15 03:13:20", kFormat), kMoment);
}

TEST(TimeText, WhatIsWrittenIsReadBack) {
  for (const char* name : {kAlwaysSummer, kNeverSummer, "UTC0"}) {
    const Zone zone(name);
    EXPECT_EQ(TextToTime(TimeToText(kMoment, kFormat), kFormat), kMoment) << name;
  }
}

}  // namespace
