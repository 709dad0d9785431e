#include "cli/change_log.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>
#include <vector>

#include "cli/failure.h"
#include "cli/interrupt.h"
#include "support/child.h"
#include "support/syslog_listener.h"

namespace cli {
namespace {

// A process logs one command; hence each in one of its own.
class CliChangeLog : public testing::Test {
 protected:
  // How often that event was logged by `body` with that result.
  int Logged(const std::string& result, const std::function<void()>& body) {
    tuvo_test::SyslogListener listener;
    EXPECT_EQ(tuvo_test::RunInChild([&body] {
                body();
                return 0;
              }),
              0);
    const std::vector<std::string> lines = listener.TakeTexts();
    int count = 0;
    for (const std::string& line : lines) {
      count +=
          line.find("event=set link=0 address=local result=" + result + " ") != std::string::npos
              ? 1
              : 0;
    }
    EXPECT_EQ(static_cast<std::size_t>(count), lines.size());
    return count;
  }
};

TEST_F(CliChangeLog, FailureIsLoggedWithItsCode) {
  EXPECT_EQ(Logged("203",
                   [] {
                     EXPECT_THROW(
                         LogRefusal("set",
                                    []() -> ExitStatus { throw Failure(ExitStatus::kUsage, "x"); }),
                         Failure);
                   }),
            1);
  EXPECT_EQ(Logged("206",
                   [] {
                     EXPECT_THROW(LogRefusal("set",
                                             []() -> ExitStatus {
                                               throw FailureOf(*owner::Fault(
                                                   owner::Error::kFileNotAllowed, "x"));
                                             }),
                                  Failure);
                   }),
            1);
  EXPECT_EQ(Logged("100",
                   [] {
                     EXPECT_THROW(
                         LogRefusal("set", []() -> ExitStatus { throw std::runtime_error("x"); }),
                         std::runtime_error);
                   }),
            1);
}

TEST_F(CliChangeLog, WhatTheCommandLoggedItselfIsEnough) {
  EXPECT_EQ(Logged("1",
                   [] {
                     EXPECT_THROW(LogRefusal("set",
                                             []() -> ExitStatus {
                                               LogChange("set", 0, std::nullopt);
                                               throw Failure(ExitStatus::kFailed, "x");
                                             }),
                                  Failure);
                   }),
            1);
}

TEST_F(CliChangeLog, TheAnswerNoAndASignalAreNoRefusal) {
  EXPECT_EQ(Logged("100",
                   [] {
                     EXPECT_THROW(LogRefusal("set", []() -> ExitStatus { throw Declined("x"); }),
                                  Declined);
                     EXPECT_THROW(LogRefusal("set", []() -> ExitStatus { throw Interruption(); }),
                                  Interruption);
                   }),
            0);
}

TEST_F(CliChangeLog, SuccessIsTheCommandsToLog) {
  EXPECT_EQ(Logged("1",
                   [] {
                     EXPECT_EQ(LogRefusal("set", [] { return ExitStatus::kDamage; }),
                               ExitStatus::kDamage);
                   }),
            0);
}

}  // namespace
}  // namespace cli
