#include "cli/exit_status.h"

#include <gtest/gtest.h>

namespace cli {
namespace {

using owner::Error;

TEST(CliExitStatus, NumbersAreThoseOfTheManualPage) {
  EXPECT_EQ(static_cast<int>(ExitStatus::kDone), 0);
  EXPECT_EQ(static_cast<int>(ExitStatus::kFailed), 1);
  EXPECT_EQ(static_cast<int>(ExitStatus::kUsage), 2);
  EXPECT_EQ(static_cast<int>(ExitStatus::kDamage), 3);
  EXPECT_EQ(static_cast<int>(ExitStatus::kNoSuchLink), 4);
  EXPECT_EQ(static_cast<int>(ExitStatus::kTaken), 5);
  EXPECT_EQ(static_cast<int>(ExitStatus::kNotAllowed), 6);
  EXPECT_EQ(static_cast<int>(ExitStatus::kBusy), 7);
}

TEST(CliExitStatus, ProblemsHaveTheStatusOfTheirKind) {
  EXPECT_EQ(StatusOf(Error::kInternal), ExitStatus::kFailed);
  EXPECT_EQ(StatusOf(Error::kNoSuchLink), ExitStatus::kNoSuchLink);
  EXPECT_EQ(StatusOf(Error::kHashTaken), ExitStatus::kTaken);
  EXPECT_EQ(StatusOf(Error::kFileNotAllowed), ExitStatus::kNotAllowed);
  EXPECT_EQ(StatusOf(Error::kForbidden), ExitStatus::kNotAllowed);
  EXPECT_EQ(StatusOf(Error::kBusy), ExitStatus::kBusy);
  EXPECT_EQ(StatusOf(Error::kBadValue), ExitStatus::kUsage);
  EXPECT_EQ(StatusOf(Error::kConflict), ExitStatus::kUsage);
  EXPECT_EQ(StatusOf(Error::kMissingArgument), ExitStatus::kUsage);
}

TEST(CliExitStatus, StatusesHaveACodeThatHasThatStatus) {
  for (const ExitStatus status : {ExitStatus::kFailed, ExitStatus::kUsage, ExitStatus::kNoSuchLink,
                                  ExitStatus::kTaken, ExitStatus::kNotAllowed, ExitStatus::kBusy}) {
    EXPECT_EQ(StatusOf(UsualErrorOf(status)), status) << static_cast<int>(status);
  }
}

}  // namespace
}  // namespace cli
