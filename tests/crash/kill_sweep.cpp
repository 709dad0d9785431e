#include "crash/kill_sweep.h"

#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <cstdio>

#include "concurrency/crew.h"

namespace tuvo_test {

namespace {

constexpr long kFarTooMany = 20000;
constexpr int kEnoughFailures = 10;
constexpr int kKilled = 256 + SIGKILL;

int FailuresSoFar() {
  return testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
}

}  // namespace

long SweepDeaths(const std::string& name, const std::function<int(long number, Death death)>& run) {
  long deaths = 0;
  const int failures_before = FailuresSoFar();
  std::printf("%s:", name.c_str());
  for (const Death death : {Death::kBeforeACall, Death::kWithinAWrite}) {
    int status = kKilled;
    long number = 0;
    while (status == kKilled && number < kFarTooMany) {
      ++number;
      SCOPED_TRACE(name + ": killed " + (death == Death::kBeforeACall ? "at call " : "in write ") +
                   std::to_string(number));
      status = run(number, death);
      if (FailuresSoFar() - failures_before >= kEnoughFailures) {
        return deaths;
      }
    }
    EXPECT_EQ(0, status);
    EXPECT_LT(1, number) << "nothing to be killed at";
    deaths += number - 1;
    std::printf(" %s %ld", death == Death::kBeforeACall ? "calls" : "writes", number - 1);
  }
  std::printf("\n");
  return deaths;
}

void SweepKills(const KillSweep& sweep) {
  SweepDeaths(sweep.name, [&](long number, Death death) {
    sweep.prepare();
    const Shared<std::atomic<bool>> acknowledged;
    const int status = Wait(Start(kRoot, [&] {
      sweep.begin();
      KillAt(number, death);
      sweep.operation([&] { *acknowledged = true; });
      return 0;
    }));
    EXPECT_TRUE(status != 0 || *acknowledged) << "the operation failed by itself";
    sweep.examine(*acknowledged);
    return status;
  });
}

}  // namespace tuvo_test
