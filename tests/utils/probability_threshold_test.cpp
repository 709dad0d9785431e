// What each fall of the dice means: this program throws them itself, with a definition of its own
// in place of the platform's.
#include <gtest/gtest.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/utils.h>

#include <functional>
#include <thread>
#include <utility>
#include <vector>

namespace {

int fall = 0;                            // what the dice show
std::vector<std::pair<int, int>> asked;  // the ranges that were asked for
std::vector<const void*> dice;           // that were thrown

}  // namespace

int TUVO::RANDOM::TUVORandomBase::random(int low, int high) {
  asked.emplace_back(low, high);
  dice.push_back(this);
  return fall;
}

namespace {

using TUVO::sharing::IsProbabilityHit;

// How many of the falls 0 to 99 hit; the hits are the low ones without a gap.
int Percentage(float probability) {
  int hits = 0;
  for (fall = 0; fall < 100; ++fall) {
    if (IsProbabilityHit(probability)) {
      EXPECT_EQ(hits, fall) << probability;
      ++hits;
    }
  }
  return hits;
}

TEST(ProbabilityThreshold, OneThrowFrom0To99IsMadeForEachQuestion) {
  asked.clear();
  for (const float probability : {-1.0F, 0.0F, 0.5F, 1.0F, 7.0F}) {
    IsProbabilityHit(probability);
  }
  EXPECT_EQ(asked, (std::vector<std::pair<int, int>>(5, {0, 99})));
}

TEST(ProbabilityThreshold, TheSameDiceAreThrownForEveryQuestion) {
  // At another place of the stack, were they kept there.
  const std::function<void(int)> ask_deeper = [&](int depth) {
    depth > 0 ? ask_deeper(depth - 1) : static_cast<void>(IsProbabilityHit(0.5F));
  };
  dice.clear();
  ask_deeper(0);
  ask_deeper(50);
  std::thread(ask_deeper, 0).join();
  ASSERT_EQ(dice.size(), 3U);
  EXPECT_EQ(dice, std::vector<const void*>(3, dice[0]));
}

TEST(ProbabilityThreshold, WholePerCentsBelowTheProbabilityHit) {
  EXPECT_EQ(Percentage(0.5F), 50);
  EXPECT_EQ(Percentage(0.25F), 25);
  EXPECT_EQ(Percentage(0.75F), 75);
  EXPECT_EQ(Percentage(1.0F), 100);
  EXPECT_EQ(Percentage(0.0F), 0);
}

TEST(ProbabilityThreshold, TheFractionIsCutOff) {
  EXPECT_EQ(Percentage(0.015F), 1);
  EXPECT_EQ(Percentage(0.009F), 0);
  EXPECT_EQ(Percentage(0.999F), 99);
  EXPECT_EQ(Percentage(0.5099F), 50);
}

// The product is not rounded to a float first: a float that lies a little below its decimal text
// counts one per cent less. A product in single precision would give 29, 57 and 1.
TEST(ProbabilityThreshold, TheProductIsTakenInExtendedPrecision) {
  EXPECT_EQ(Percentage(0.29F), 28);
  EXPECT_EQ(Percentage(0.57F), 56);
  EXPECT_EQ(Percentage(0.01F), 0);
  EXPECT_EQ(Percentage(0.07F), 7);
  EXPECT_EQ(Percentage(0.02F), 1);
}

TEST(ProbabilityThreshold, BeyondTheRangeOfAnIntTheAnswerStays) {
  EXPECT_EQ(Percentage(3e9F), 100);
  EXPECT_EQ(Percentage(1e38F), 100);
  EXPECT_EQ(Percentage(-3e9F), 0);
}

}  // namespace
