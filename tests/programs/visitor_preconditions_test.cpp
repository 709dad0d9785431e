#include "visitor/preconditions.h"

#include <gtest/gtest.h>

#include "visitor/http_date.h"

namespace visitor {
namespace {

constexpr std::time_t kModified = 1700000000;
const Validators kFile{"\"v1\"", kModified};

ConditionHeaders With(std::string ConditionHeaders::*header, const std::string& value) {
  ConditionHeaders headers;
  headers.*header = value;
  return headers;
}

Verdict VerdictOf(std::string ConditionHeaders::*header, const std::string& value) {
  return Evaluate(With(header, value), kFile);
}

TEST(VisitorPreconditions, WithoutConditionsTheFileIsSent) {
  EXPECT_EQ(Evaluate({}, kFile), Verdict::kSend);
}

TEST(VisitorPreconditions, KnownTagIsNotSentAgain) {
  for (const char* value : {"\"v1\"", "W/\"v1\"", "\"a\", \"v1\"", "\"a\",W/\"v1\" ,\"b\"", "*"}) {
    EXPECT_EQ(VerdictOf(&ConditionHeaders::if_none_match, value), Verdict::kNotModified) << value;
  }
  for (const char* value : {"\"v2\"", "v1", "\"v1", "w/\"v1\"", "\"a\" \"v1\""}) {
    EXPECT_EQ(VerdictOf(&ConditionHeaders::if_none_match, value), Verdict::kSend) << value;
  }
}

TEST(VisitorPreconditions, UnchangedSinceIsNotSentAgain) {
  const auto since = [](std::time_t time) {
    return VerdictOf(&ConditionHeaders::if_modified_since, HttpDate(time));
  };
  EXPECT_EQ(since(kModified - 1), Verdict::kSend);
  EXPECT_EQ(since(kModified), Verdict::kNotModified);
  EXPECT_EQ(since(kModified + 1), Verdict::kNotModified);
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_modified_since, "now"), Verdict::kSend);
}

TEST(VisitorPreconditions, TagsOutweighDates) {
  ConditionHeaders headers = With(&ConditionHeaders::if_none_match, "\"v2\"");
  headers.if_modified_since = HttpDate(kModified);
  EXPECT_EQ(Evaluate(headers, kFile), Verdict::kSend);
  headers = With(&ConditionHeaders::if_match, "\"v1\"");
  headers.if_unmodified_since = HttpDate(kModified - 1);
  EXPECT_EQ(Evaluate(headers, kFile), Verdict::kSend);
}

TEST(VisitorPreconditions, DemandedTagMustBeTheSameStrongOne) {
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_match, "\"v1\""), Verdict::kSend);
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_match, "*"), Verdict::kSend);
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_match, "\"v2\""), Verdict::kFailed);
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_match, "W/\"v1\""), Verdict::kFailed);
}

TEST(VisitorPreconditions, ChangedSinceFailsADemand) {
  const auto since = [](std::time_t time) {
    return VerdictOf(&ConditionHeaders::if_unmodified_since, HttpDate(time));
  };
  EXPECT_EQ(since(kModified - 1), Verdict::kFailed);
  EXPECT_EQ(since(kModified), Verdict::kSend);
  EXPECT_EQ(VerdictOf(&ConditionHeaders::if_unmodified_since, "now"), Verdict::kSend);
}

TEST(VisitorPreconditions, RangeAppliesToTheSameVersionOnly) {
  constexpr std::time_t kLater = kModified + 100;
  EXPECT_TRUE(RangeApplies("", kFile, kLater));
  EXPECT_TRUE(RangeApplies("\"v1\"", kFile, kLater));
  EXPECT_FALSE(RangeApplies("\"v2\"", kFile, kLater));
  EXPECT_FALSE(RangeApplies("W/\"v1\"", kFile, kLater));
  EXPECT_TRUE(RangeApplies(HttpDate(kModified), kFile, kLater));
  EXPECT_FALSE(RangeApplies(HttpDate(kModified - 1), kFile, kLater));
  EXPECT_FALSE(RangeApplies(HttpDate(kModified + 1), kFile, kLater));
  EXPECT_FALSE(RangeApplies("nonsense", kFile, kLater));
}

TEST(VisitorPreconditions, DateOfAFileJustChangedSaysNothing) {
  EXPECT_FALSE(RangeApplies(HttpDate(kModified), kFile, kModified + 1));
  EXPECT_TRUE(RangeApplies(HttpDate(kModified), kFile, kModified + 2));
}

}  // namespace
}  // namespace visitor
