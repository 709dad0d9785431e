// The form of a line in the system log.
#include <gtest/gtest.h>
#include <internal/log.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <string>
#include <vector>

#include "support/syslog_listener.h"
#include "support/written_line.h"

namespace {

using TUVO::sharing::internal::ErrorText;
using TUVO::sharing::internal::SourceStem;
using tuvo_test::LogLine;
using tuvo_test::SyslogListener;

std::string Pid() {
  return std::to_string(getpid());
}

TEST(SourceStem, IsTheNameWithoutFolderAndExtension) {
  EXPECT_EQ(SourceStem("/a/b.c/base_db.cpp"), "base_db");
  EXPECT_EQ(SourceStem("db/base_db.cpp"), "base_db");
  EXPECT_EQ(SourceStem("base_db.cpp"), "base_db");
  EXPECT_EQ(SourceStem("base_db"), "base_db");
  EXPECT_EQ(SourceStem("/a.b/base_db"), "base_db");
  EXPECT_EQ(SourceStem("popen.inner.h"), "popen.inner");
  EXPECT_EQ(SourceStem(""), "");
}

TEST(Log, ALineNamesTheSourceFileAndTheLineOfTheCall) {
  SyslogListener listener;
  const int line = __LINE__ + 1;
  SHARING_LOG("No such user [%s]", "eve");
  EXPECT_EQ(listener.TakeTexts(),
            (std::vector<std::string>{"log_test:" + std::to_string(line) + " No such user [eve]"}));
}

TEST(Log, ALineWithTheProcessIdHasItBehindTheLine) {
  SyslogListener listener;
  const int line = __LINE__ + 1;
  SHARING_LOG_PID("init failed\n\n");
  EXPECT_EQ(listener.TakeTexts(), (std::vector<std::string>{"log_test:" + std::to_string(line) +
                                                            " (" + Pid() + ") init failed\n\n"}));
}

TEST(Log, PriorityIsErrorAndTheFacilityTheDefaultOne) {
  SyslogListener listener;
  SHARING_LOG("one");
  SHARING_LOG_PID("two");
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 2U);
  for (const LogLine& line : lines) {
    EXPECT_EQ(line.priority, LOG_ERR);
    EXPECT_EQ(line.facility, LOG_USER);
  }
}

TEST(Log, TheFacilityThatTheProgramChoseIsUsed) {
  SyslogListener listener;
  openlog("program", 0, LOG_DAEMON);
  SHARING_LOG_PID("text");
  openlog(nullptr, 0, LOG_USER);
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].facility, LOG_DAEMON);
}

TEST(Log, ValuesAreWrittenInFullAndNeverTakenForAFormat) {
  SyslogListener listener;
  const std::string value = std::string(5000, 'x') + "%s%n%m";
  SHARING_LOG("%s", value.c_str());
  const std::vector<std::string> texts = listener.TakeTexts();
  ASSERT_EQ(texts.size(), 1U);
  EXPECT_EQ(texts[0].substr(texts[0].find(' ') + 1), value);
}

TEST(Log, ErrnoIsLeftAlone) {
  SyslogListener listener;
  errno = EDOM;
  SHARING_LOG("text");
  EXPECT_EQ(errno, EDOM);
  SHARING_LOG_PID("text");
  EXPECT_EQ(errno, EDOM);
}

TEST(Log, WithNobodyListeningErrnoIsLeftAloneToo) {
  closelog();
  errno = EDOM;
  SHARING_LOG_PID("text");
  EXPECT_EQ(errno, EDOM);
}

TEST(ErrorText, IsTheTextOfErrnoAndLeavesIt) {
  for (const int error : {0, ENOENT, EACCES, EDOM}) {
    errno = error;
    const std::string text = ErrorText();
    EXPECT_EQ(errno, error);
    EXPECT_EQ(text, std::strerror(error));
  }
}

int refusing_line = 0;

bool RefusesNegative(int number) {
  refusing_line = __LINE__ + 2;
  // clang-format off
  SHARING_RETURN_FALSE_IF(0 > number &&   "" != std::string( "a"));
  // clang-format on
  return true;
}

TEST(ReturnFalseIf, AConditionThatHoldsIsLoggedWithItsSourceTextAndErrno) {
  SyslogListener listener;
  errno = ENOSPC;
  EXPECT_FALSE(RefusesNegative(-1));
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(tuvo_test::Written(lines[0]),
            "user.err log_test:" + std::to_string(refusing_line) + " (" + Pid() +
                ") Failed [0 > number && \"\" != std::string( \"a\")], "
                "err=No space left on device\n\n");
}

TEST(ReturnFalseIf, AConditionThatDoesNotHoldIsPassedInSilence) {
  SyslogListener listener;
  EXPECT_TRUE(RefusesNegative(1));
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

bool RefusesPercent(int number) {
  // clang-format off
  SHARING_RETURN_FALSE_IF(number % 2 == 0);
  // clang-format on
  return true;
}

TEST(ReturnFalseIf, APercentSignInTheConditionIsWrittenAsItIs) {
  SyslogListener listener;
  errno = 0;
  EXPECT_FALSE(RefusesPercent(2));
  const std::vector<std::string> texts = listener.TakeTexts();
  ASSERT_EQ(texts.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(texts[0]),
            "log_test:LINE (PID) Failed [number % 2 == 0], err=Success\n\n");
}

}  // namespace
