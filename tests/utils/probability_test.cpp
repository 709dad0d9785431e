// The dice as they fall; what each fall means is in probability_threshold_test.
#include <gtest/gtest.h>
#include <tuvosharing/utils.h>

#include <atomic>
#include <cerrno>
#include <limits>
#include <thread>
#include <vector>

#include "support/child.h"
#include "support/seccomp_filter.h"

namespace {

using TUVO::sharing::IsProbabilityHit;

int Hits(float probability, int throws) {
  int hits = 0;
  for (int i = 0; i < throws; ++i) {
    hits += IsProbabilityHit(probability) ? 1 : 0;
  }
  return hits;
}

TEST(IsProbabilityHit, OneAndAboveAlwaysHits) {
  EXPECT_EQ(Hits(1.0F, 1000), 1000);
  EXPECT_EQ(Hits(2.5F, 1000), 1000);
  EXPECT_EQ(Hits(std::numeric_limits<float>::max(), 1000), 1000);
  EXPECT_EQ(Hits(std::numeric_limits<float>::infinity(), 1000), 1000);
}

TEST(IsProbabilityHit, ZeroAndBelowNeverHits) {
  EXPECT_EQ(Hits(0.0F, 1000), 0);
  EXPECT_EQ(Hits(-0.0F, 1000), 0);
  EXPECT_EQ(Hits(-0.5F, 1000), 0);
  EXPECT_EQ(Hits(-1.0F, 1000), 0);
  EXPECT_EQ(Hits(std::numeric_limits<float>::lowest(), 1000), 0);
  EXPECT_EQ(Hits(-std::numeric_limits<float>::infinity(), 1000), 0);
}

TEST(IsProbabilityHit, WhatIsNoNumberNeverHits) {
  EXPECT_EQ(Hits(std::numeric_limits<float>::quiet_NaN(), 1000), 0);
}

// Ten standard deviations to each side: a right die fails this once in 10^22 runs.
TEST(IsProbabilityHit, HitsAsOftenAsAsked) {
  EXPECT_NEAR(Hits(0.5F, 100000), 50000, 1600);
  EXPECT_NEAR(Hits(0.25F, 100000), 25000, 1400);
}

TEST(IsProbabilityHit, TheFractionOfAPerCentIsCutOff) {
  EXPECT_NEAR(Hits(0.015F, 100000), 1000, 315);
  EXPECT_EQ(Hits(0.009F, 10000), 0);
}

TEST(IsProbabilityHit, ThreadsMayAskAtTheSameTime) {
  std::vector<std::thread> threads;
  std::atomic<int> hits{0};
  for (int i = 0; i < 8; ++i) {
    threads.emplace_back([&hits] { hits += Hits(1.0F, 500) + Hits(0.0F, 500); });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(hits, 4000);
}

// A purge that does not run is the harmless failure.
TEST(IsProbabilityHit, WithoutARandomSourceNothingButACertaintyHits) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(tuvo_test::RunInChild([] {
              EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kGetrandom, EPERM}}));
              EXPECT_EQ(Hits(0.99F, 1000), 0);
              EXPECT_EQ(Hits(1.0F, 1000), 1000);
              return 0;
            }),
            0);
}

}  // namespace
