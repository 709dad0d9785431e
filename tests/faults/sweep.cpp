#include "faults/sweep.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <map>

#include "support/child.h"

namespace tuvo_test {

namespace {

constexpr long kFarTooMany = 50000;
constexpr int kEnoughFailures = 20;
constexpr int kHighestDescriptor = 255;

int AnswerOf(const std::function<int()>& operation) {
  try {
    return operation();
  } catch (const std::exception&) {
    return kThrew;
  }
}

int FailuresSoFar() {
  return testing::UnitTest::GetInstance()->current_test_info()->result()->total_part_count();
}

}  // namespace

bool Step::Logged(const std::string& piece) const {
  return std::any_of(log.begin(), log.end(), [&](const std::string& line) {
    return line.find(piece) != std::string::npos;
  });
}

std::vector<int> OpenDescriptors() {
  std::vector<int> open;
  for (int fd = 0; fd <= kHighestDescriptor; ++fd) {
    if (fcntl(fd, F_GETFD) != -1) {
      open.push_back(fd);
    }
  }
  return open;
}

void Sweep(const std::string& name, unsigned int kinds, const std::function<int()>& operation,
           const std::function<void(const Step&)>& examine) {
  const Ids ids = CurrentIds();
  const std::vector<int> open = OpenDescriptors();
  std::map<FaultKind, long> reached;
  const int failures_before = FailuresSoFar();
  Step step{0, kNoFault, 0, {}};
  do {
    ++step.number;
    FailAt(kinds, step.number);
    step.answer = AnswerOf(operation);
    step.fault = StopFailing();
    step.log = TakeLogged();
    ++reached[step.fault];

    SCOPED_TRACE(name + ": call " + std::to_string(step.number) + " failed, " + NameOf(step.fault) +
                 ", answer " + std::to_string(step.answer));
    EXPECT_NE(kThrew, step.answer);
    EXPECT_EQ(ToText(ids), ToText(CurrentIds()));
    EXPECT_EQ(open, OpenDescriptors());
    examine(step);
    if (FailuresSoFar() - failures_before >= kEnoughFailures) {
      return;
    }
  } while (step.fault != kNoFault && step.number < kFarTooMany);
  EXPECT_LT(step.number, kFarTooMany);
  EXPECT_LT(1, step.number) << name << ": nothing failed, so the stand-ins do not stand in";
  std::printf("%s:", name.c_str());
  for (const auto& [kind, count] : reached) {
    if (kind != kNoFault) {
      std::printf(" %s %ld", NameOf(kind), count);
    }
  }
  std::printf("\n");
}

}  // namespace tuvo_test
