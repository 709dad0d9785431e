// The temporary switch of the effective ids, from every identity that a program may start under.
#include <gtest/gtest.h>
#include <internal/run_as.h>
#include <syslog.h>

#include <cerrno>
#include <functional>
#include <stdexcept>
#include <string>
#include <vector>

#include "log_lines.h"
#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"

namespace {

using tuvo_test::CurrentIds;
using tuvo_test::Ids;
using tuvo_test::kNobody;
using tuvo_test::kRoot;
using tuvo_test::kSavedRoot;
using tuvo_test::kSetresgid;
using tuvo_test::kSetresuid;
using tuvo_test::kSystem;
using tuvo_test::LogLine;
using tuvo_test::RefuseCalls;
using tuvo_test::RunInChildAs;
using tuvo_test::SyslogListener;
using tuvo_test::ToText;
using Lines = std::vector<std::string>;

// The ids under which the statement's body ran; "failed" when the other branch was taken.
std::string SeenAs(uid_t uid, gid_t gid) {
  IF_RUN_AS(uid, gid) {
    return ToText(CurrentIds());
  }
  else {
    return "failed";
  }
}

// The ids of `start` with other effective ones.
std::string Effective(Ids start, uid_t uid, gid_t gid) {
  start.euid = uid;
  start.egid = gid;
  return ToText(start);
}

// Switches in a child that starts as `start`, which must have all its six ids again afterwards, and
// expects the body to have run under the effective ids asked for.
void ExpectSwitch(const Ids& start, uid_t uid, gid_t gid) {
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(start,
                         [&] {
                           EXPECT_EQ(SeenAs(uid, gid), Effective(start, uid, gid));
                           EXPECT_EQ(ToText(CurrentIds()), ToText(start));
                           return 0;
                         }),
            0);
  EXPECT_EQ(tuvo_test::TakeLines(listener), Lines{});
}

// Switches in a child that starts as `start` and expects a failure with its one line.
void ExpectFailure(const Ids& start, uid_t uid, gid_t gid, const std::string& line) {
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(start,
                         [&] {
                           EXPECT_EQ(SeenAs(uid, gid), "failed");
                           EXPECT_EQ(ToText(CurrentIds()), ToText(start));
                           return 0;
                         }),
            0);
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(lines[0].text), line);
  EXPECT_EQ(lines[0].facility, LOG_AUTH);
  EXPECT_EQ(lines[0].priority, LOG_ERR);
}

TEST(RunAs, RootTakesTheSystemIdentityAndReturns) {
  ExpectSwitch(kRoot, 1, 1);
}

TEST(RunAs, SavedRootTakesTheSystemIdentityAndReturns) {
  ExpectSwitch(kSavedRoot, 1, 1);
}

TEST(RunAs, TheSystemIdentityStaysWhatItIs) {
  ExpectSwitch(kSystem, 1, 1);
}

TEST(RunAs, NobodyCannotTakeTheSystemIdentity) {
  ExpectFailure(kNobody, 1, 1, "run_as_test:LINE ERROR: IF_RUN_AS(1, 1)");
}

TEST(RunAs, RootStaysRoot) {
  ExpectSwitch(kRoot, 0, 0);
}

TEST(RunAs, SavedRootTakesRootAndReturns) {
  ExpectSwitch(kSavedRoot, 0, 0);
}

TEST(RunAs, TheSystemIdentityCannotTakeRoot) {
  ExpectFailure(kSystem, 0, 0, "run_as_test:LINE ERROR: IF_RUN_AS(0, 0)");
}

TEST(RunAs, NobodyCannotTakeRoot) {
  ExpectFailure(kNobody, 0, 0, "run_as_test:LINE ERROR: IF_RUN_AS(0, 0)");
}

TEST(RunAs, TheSystemIdentityWithSavedRootTakesRootAndReturns) {
  ExpectSwitch({1, 1, 0, 1, 1, 0}, 0, 0);
}

TEST(RunAs, RealRootIsAWayBackToo) {
  ExpectSwitch({0, 65534, 65534, 0, 65534, 65534}, 1, 1);
}

TEST(RunAs, OnlyTheUidDiffers) {
  ExpectSwitch({0, 0, 0, 1, 1, 1}, 1, 1);
}

TEST(RunAs, OnlyTheGidDiffers) {
  ExpectSwitch({1, 1, 1, 65534, 65534, 1}, 1, 1);
}

// Only root may take any group, and the uid asked for is in force already: root is not regained.
TEST(RunAs, TheRightUidWithAForeignGidFailsEvenWithSavedRoot) {
  ExpectFailure({1, 1, 0, 5, 5, 5}, 1, 1, "run_as_test:LINE ERROR: IF_RUN_AS(1, 1)");
}

// The way goes through root alone.
TEST(RunAs, ARealOrSavedUidThatIsTheOneAskedForIsNoWay) {
  ExpectFailure({1, 65534, 1, 1, 65534, 1}, 1, 1, "run_as_test:LINE ERROR: IF_RUN_AS(1, 1)");
}

TEST(RunAs, UnderTheSystemIdentityNoIdIsEverTouched) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(RunInChildAs(kSystem,
                         [] {
                           EXPECT_TRUE(RefuseCalls({{kSetresuid, tuvo_test::kKill},
                                                    {kSetresgid, tuvo_test::kKill},
                                                    {__NR_setuid, tuvo_test::kKill},
                                                    {__NR_setgid, tuvo_test::kKill},
                                                    {__NR_setreuid, tuvo_test::kKill},
                                                    {__NR_setregid, tuvo_test::kKill}}));
                           EXPECT_EQ(SeenAs(1, 1), ToText(kSystem));
                           return 0;
                         }),
            0);
}

// The filter of the test above does end a process that changes its ids.
TEST(RunAs, AForbiddenCallIsSeen) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(RunInChildAs(kRoot,
                         [] {
                           EXPECT_TRUE(RefuseCalls({{kSetresgid, tuvo_test::kKill}}));
                           SeenAs(1, 1);
                           return 0;
                         }),
            256 + SIGSYS);
}

TEST(RunAs, LeavingTheBodyByReturnPutsTheIdsBack) {
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           const auto early = [] {
                             IF_RUN_AS(1, 1) {
                               return CurrentIds().euid;
                             }
                             return uid_t{77};
                           };
                           EXPECT_EQ(early(), 1U);
                           EXPECT_EQ(ToText(CurrentIds()), ToText(kSavedRoot));
                           return 0;
                         }),
            0);
}

TEST(RunAs, LeavingTheBodyByAnExceptionPutsTheIdsBack) {
  EXPECT_EQ(RunInChildAs(kRoot,
                         [] {
                           try {
                             IF_RUN_AS(1, 1) {
                               throw std::runtime_error("out");
                             }
                           } catch (const std::runtime_error&) {
                             EXPECT_EQ(ToText(CurrentIds()), ToText(kRoot));
                             return 0;
                           }
                           return 1;
                         }),
            0);
}

TEST(RunAs, NestedSwitchesReturnOneByOne) {
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           IF_RUN_AS(1, 1) {
                             EXPECT_EQ(SeenAs(0, 0), Effective(kSavedRoot, 0, 0));
                             EXPECT_EQ(ToText(CurrentIds()), Effective(kSavedRoot, 1, 1));
                           }
                           EXPECT_EQ(ToText(CurrentIds()), ToText(kSavedRoot));
                           return 0;
                         }),
            0);
}

TEST(RunAs, ErrnoOfTheBodySurvivesTheReturn) {
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           IF_RUN_AS(1, 1) {
                             errno = EDOM;
                           }
                           EXPECT_EQ(errno, EDOM);
                           return 0;
                         }),
            0);
}

// A child's status holds no more than a byte.
constexpr int kLineBase = __LINE__;

// The line of the switch in this function; 0 when it succeeded.
int FailingLine() {
  IF_RUN_AS(1, 1) {
    return 0;
  }
  return __LINE__ - 3;
}

TEST(RunAs, TheLineNamesTheFileAndLineOfTheSwitch) {
  SyslogListener listener;
  const int line = RunInChildAs(kNobody, [] { return FailingLine() - kLineBase; }) + kLineBase;
  EXPECT_EQ(listener.TakeTexts(),
            (Lines{"run_as_test:" + std::to_string(line) + " ERROR: IF_RUN_AS(1, 1)"}));
}

// The facility of the program has no say in what concerns identities.
TEST(RunAs, TheLineGoesToTheAuthorisationFacilityWhateverTheProgramChose) {
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(kNobody,
                         [] {
                           openlog("program", 0, LOG_DAEMON);
                           return SeenAs(1, 1) == "failed" ? 0 : 1;
                         }),
            0);
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].facility, LOG_AUTH);
}

// Each call that the switch makes refused in turn, in a child that starts as saved root.
class RunAsRefused : public testing::Test {
 protected:
  void SetUp() override {
    if (!tuvo_test::CanRefuseCalls()) {
      GTEST_SKIP() << "this system has no system call filters";
    }
  }

  // Setting the effective id `value` fails.
  static tuvo_test::Refusal Setting(long call, std::uint32_t value) {
    return {call, EPERM, 1, value};
  }

  // What is logged when the switch to 1:1 itself meets the refusal; the ids must be the old ones
  // afterwards.
  static Lines SwitchUnder(const tuvo_test::Refusal& refusal) {
    SyslogListener listener;
    EXPECT_EQ(RunInChildAs(kSavedRoot,
                           [&] {
                             EXPECT_TRUE(RefuseCalls({refusal}));
                             EXPECT_EQ(SeenAs(1, 1), "failed");
                             EXPECT_EQ(ToText(CurrentIds()), ToText(kSavedRoot));
                             return 0;
                           }),
              0);
    return Described(listener);
  }

  // What is logged when only the return meets it, and the ids that the process is left with.
  static Lines ReturnUnder(const tuvo_test::Refusal& refusal, const Ids& start,
                           const std::string& left) {
    SyslogListener listener;
    EXPECT_EQ(RunInChildAs(start,
                           [&] {
                             IF_RUN_AS(1, 1) {
                               EXPECT_TRUE(RefuseCalls({refusal}));
                               errno = EDOM;
                             }
                             EXPECT_EQ(errno, EDOM);
                             EXPECT_EQ(ToText(CurrentIds()), left);
                             return 0;
                           }),
              0);
    return Described(listener);
  }

  static Lines Described(SyslogListener& listener) {
    Lines described;
    for (const LogLine& line : listener.Take()) {
      described.push_back((line.facility == LOG_AUTH ? "auth " : "? ") +
                          std::string(line.priority == LOG_ERR    ? "error "
                                      : line.priority == LOG_CRIT ? "critical "
                                                                  : "? ") +
                          tuvo_test::Normalized(line.text));
    }
    return described;
  }
};

const Lines kSwitchLine{"auth error run_as_test:LINE ERROR: IF_RUN_AS(1, 1)"};
const Lines kReturnLine{"auth critical run_as_test:LINE ERROR: ~IF_RUN_AS(65534, 65534)"};

TEST_F(RunAsRefused, RegainingRootFailsTheSwitch) {
  EXPECT_EQ(SwitchUnder(Setting(kSetresuid, 0)), kSwitchLine);
}

TEST_F(RunAsRefused, TakingTheGroupFailsTheSwitchAndTheUidGoesBack) {
  EXPECT_EQ(SwitchUnder(Setting(kSetresgid, 1)), kSwitchLine);
}

TEST_F(RunAsRefused, TakingTheUserFailsTheSwitchAndBothIdsGoBack) {
  EXPECT_EQ(SwitchUnder(Setting(kSetresuid, 1)), kSwitchLine);
}

TEST_F(RunAsRefused, AReturnThatCannotRegainRootIsLoggedAndStopsThere) {
  EXPECT_EQ(ReturnUnder(Setting(kSetresuid, 0), kSavedRoot, Effective(kSavedRoot, 1, 1)),
            kReturnLine);
}

TEST_F(RunAsRefused, AReturnThatCannotTakeTheGroupIsLoggedAndStopsThere) {
  EXPECT_EQ(ReturnUnder(Setting(kSetresgid, 65534), kSavedRoot, Effective(kSavedRoot, 0, 1)),
            kReturnLine);
}

TEST_F(RunAsRefused, AReturnThatCannotTakeTheUserIsLogged) {
  EXPECT_EQ(ReturnUnder(Setting(kSetresuid, 65534), kSavedRoot, Effective(kSavedRoot, 0, 65534)),
            kReturnLine);
}

TEST_F(RunAsRefused, AReturnToRootIsLoggedWithRootsIds) {
  EXPECT_EQ(ReturnUnder(Setting(kSetresuid, 0), kRoot, Effective(kRoot, 1, 1)),
            Lines{"auth critical run_as_test:LINE ERROR: ~IF_RUN_AS(0, 0)"});
}

TEST_F(RunAsRefused, IdsAreWrittenAsSignedNumbers) {
  const Ids start{4294967294U, 4294967294U, 0, 4294967293U, 4294967293U, 0};
  EXPECT_EQ(ReturnUnder(Setting(kSetresuid, 0), start, Effective(start, 1, 1)),
            Lines{"auth critical run_as_test:LINE ERROR: ~IF_RUN_AS(-2, -3)"});
}

TEST_F(RunAsRefused, AFailedReturnOfAFailedSwitchIsLoggedToo) {
  SyslogListener listener;
  EXPECT_EQ(
      RunInChildAs(kSavedRoot,
                   [] {
                     EXPECT_TRUE(RefuseCalls({Setting(kSetresuid, 1), Setting(kSetresgid, 65534)}));
                     EXPECT_EQ(SeenAs(1, 1), "failed");
                     EXPECT_EQ(ToText(CurrentIds()), Effective(kSavedRoot, 0, 1));
                     return 0;
                   }),
      0);
  EXPECT_EQ(Described(listener), (Lines{kSwitchLine[0], kReturnLine[0]}));
}

}  // namespace
