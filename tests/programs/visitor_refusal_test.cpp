#include "visitor/refusal.h"

#include <gtest/gtest.h>

#include <set>
#include <string>

namespace visitor {
namespace {

bool AsksAgain(const Refusal& refusal) {
  return !refusal.complaint.empty();
}

TEST(VisitorRefusal, LoginThatCanBeTriedAgainShowsTheForm) {
  std::set<std::string_view> complaints;
  for (const int code : {-2, -3, -9, -10}) {
    EXPECT_TRUE(AsksAgain(RefusedLogin(code))) << code;
    complaints.insert(RefusedLogin(code).complaint);
  }
  EXPECT_EQ(complaints.size(), 4U);
}

TEST(VisitorRefusal, LoginThatCannotIsANotice) {
  EXPECT_EQ(TextOf(RefusedLogin(-8).notice).status, 429);
  EXPECT_EQ(TextOf(RefusedLogin(-11).notice).status, 410);
  EXPECT_EQ(TextOf(RefusedLogin(-4).notice).status, 500);
  for (const int code : {-4, -8, -11}) {
    EXPECT_FALSE(AsksAgain(RefusedLogin(code))) << code;
  }
}

TEST(VisitorRefusal, VisitThatALoginCanMendShowsTheForm) {
  for (const int code : {-1, -2, -5, -7, -8}) {
    EXPECT_TRUE(AsksAgain(RefusedVisit(code))) << code;
  }
}

TEST(VisitorRefusal, VisitThatNothingCanMendIsANotice) {
  EXPECT_FALSE(AsksAgain(RefusedVisit(-6)));
  EXPECT_EQ(TextOf(RefusedVisit(-6).notice).status, 404);
  EXPECT_FALSE(AsksAgain(RefusedVisit(-4)));
  EXPECT_EQ(TextOf(RefusedVisit(-4).notice).status, 500);
}

TEST(VisitorRefusal, AddressMeansOneThingAtLoginAndAnotherLater) {
  EXPECT_FALSE(AsksAgain(RefusedLogin(-8)));
  EXPECT_TRUE(AsksAgain(RefusedVisit(-8)));
}

TEST(VisitorRefusal, UnheardOfCodesAreFailures) {
  for (const int code : {0, 2, -12, -100}) {
    EXPECT_EQ(TextOf(RefusedLogin(code).notice).status, 500) << code;
    EXPECT_FALSE(AsksAgain(RefusedLogin(code))) << code;
    EXPECT_EQ(TextOf(RefusedVisit(code).notice).status, 500) << code;
    EXPECT_FALSE(AsksAgain(RefusedVisit(code))) << code;
  }
}

}  // namespace
}  // namespace visitor
