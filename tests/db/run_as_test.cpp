// The temporary switch of the effective ids, from every identity that a program may start under.
#include <gtest/gtest.h>
#include <internal/run_as.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <stdexcept>
#include <string>
#include <string_view>
#include <tuple>
#include <type_traits>
#include <vector>

#include "identity_lines.h"
#include "support/child.h"
#include "support/class_layout.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"

namespace tuvo_test {

using Guard = _________::__;
auto MembersOf(const Guard&);
template struct Reveal<Guard, &Guard::saved_uid_, &Guard::saved_gid_, &Guard::source_,
                       &Guard::line_, &Guard::name_>;

}  // namespace tuvo_test

namespace {

using tuvo_test::CurrentIds;
using tuvo_test::Ids;
using tuvo_test::kNobody;
using tuvo_test::kRoot;
using tuvo_test::kSavedRoot;
using tuvo_test::kSetresgid;
using tuvo_test::kSetresuid;
using tuvo_test::kSystem;
using tuvo_test::MembersOf;
using tuvo_test::RefuseCalls;
using tuvo_test::RunInChildAs;
using tuvo_test::SyslogListener;
using tuvo_test::TakeWritten;
using tuvo_test::ToText;
using Lines = std::vector<std::string>;

// The ids under which the statement's body ran; "failed" when the other branch was taken.
const std::string kSeenAs = "run_as_test:" + std::to_string(__LINE__ + 2);
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
  EXPECT_EQ(TakeWritten(listener), Lines{});
}

// Switches in a child that starts as `start` and expects a failure with its one line.
void ExpectFailure(const Ids& start, uid_t uid, gid_t gid, const std::string& text) {
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(start,
                         [&] {
                           EXPECT_EQ(SeenAs(uid, gid), "failed");
                           EXPECT_EQ(ToText(CurrentIds()), ToText(start));
                           return 0;
                         }),
            0);
  EXPECT_EQ(TakeWritten(listener), Lines{"auth.err " + kSeenAs + text});
}

TEST(RunAs, TheGuardKeepsUserGroupSourceLineAndName) {
  const tuvo_test::Guard guard("run_as_test", 1, "IF_RUN_AS");
  const auto members = MembersOf(guard);
  EXPECT_TRUE((std::is_same_v<tuvo_test::TypesOf<std::decay_t<decltype(members)>>,
                              std::tuple<uid_t, gid_t, std::string_view, int, const char*>>));
  constexpr std::ptrdiff_t kIds = sizeof(uid_t) + sizeof(gid_t);
  constexpr std::ptrdiff_t kLine = kIds + std::ptrdiff_t{sizeof(std::string_view)};
  constexpr std::ptrdiff_t kName = kLine + std::ptrdiff_t{sizeof(void*)};
  EXPECT_EQ(tuvo_test::Offsets(guard, members),
            (std::vector<std::ptrdiff_t>{0, sizeof(uid_t), kIds, kLine, kName}));
  EXPECT_EQ(sizeof guard, sizeof(void*) + kName);
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
  ExpectFailure(kNobody, 1, 1, " ERROR: IF_RUN_AS(1, 1)");
}

TEST(RunAs, RootStaysRoot) {
  ExpectSwitch(kRoot, 0, 0);
}

TEST(RunAs, SavedRootTakesRootAndReturns) {
  ExpectSwitch(kSavedRoot, 0, 0);
}

TEST(RunAs, TheSystemIdentityCannotTakeRoot) {
  ExpectFailure(kSystem, 0, 0, " ERROR: IF_RUN_AS(0, 0)");
}

TEST(RunAs, NobodyCannotTakeRoot) {
  ExpectFailure(kNobody, 0, 0, " ERROR: IF_RUN_AS(0, 0)");
}

TEST(RunAs, OtherIdsAreTakenEachInItsPlace) {
  ExpectSwitch(kSavedRoot, 2001, 3001);
}

TEST(RunAs, OtherIdsThatCannotBeTakenAreLoggedEachInItsPlace) {
  ExpectFailure(kNobody, 2001, 3001, " ERROR: IF_RUN_AS(2001, 3001)");
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
  ExpectFailure({1, 1, 0, 5, 5, 5}, 1, 1, " ERROR: IF_RUN_AS(1, 1)");
}

// The way goes through root alone.
TEST(RunAs, ARealOrSavedUidThatIsTheOneAskedForIsNoWay) {
  ExpectFailure({1, 65534, 1, 1, 65534, 1}, 1, 1, " ERROR: IF_RUN_AS(1, 1)");
}

TEST(RunAs, UnderTheSystemIdentityNoIdIsEverTouched) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(RunInChildAs(kSystem,
                         [] {
                           EXPECT_TRUE(tuvo_test::EndAtIdChanges());
                           EXPECT_EQ(SeenAs(1, 1), ToText(kSystem));
                           return 0;
                         }),
            0);
}

// The filter of the test above ends a process at each of them.
TEST(RunAs, AForbiddenCallIsSeen) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  for (const long call : tuvo_test::kIdChanges) {
    EXPECT_EQ(RunInChildAs(kSystem,
                           [&] {
                             EXPECT_TRUE(tuvo_test::EndAtIdChanges());
                             syscall(call, 1, 1, 1);
                             return 0;
                           }),
              256 + SIGSYS)
        << call;
  }
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

TEST(RunAs, ASwitchAndItsReturnLeaveErrno) {
  for (const Ids& start : {kRoot, kSavedRoot, kSystem}) {
    EXPECT_EQ(RunInChildAs(start,
                           [] {
                             errno = EDOM;
                             IF_RUN_AS(1, 1) {
                               EXPECT_EQ(errno, EDOM);
                             }
                             EXPECT_EQ(errno, EDOM);
                             return 0;
                           }),
              0);
  }
}

// Nobody listens to the log, so writing the line fails, for reasons of its own.
TEST(RunAs, TheReasonOfAFailureIsThereInTheOtherBranchAndAfterIt) {
  EXPECT_EQ(RunInChildAs(kNobody,
                         [] {
                           errno = 0;
                           IF_RUN_AS(1, 1) {
                             return 1;
                           }
                           else {
                             EXPECT_EQ(errno, EPERM);
                           }
                           EXPECT_EQ(errno, EPERM);
                           return 0;
                         }),
            0);
}

// No filter is needed to close the way back.
TEST(RunAs, ABodyThatGivesRootUpLeavesErrnoAndTheLineOfAFailedReturn) {
  constexpr int kGiveUpLine = __LINE__ + 2;
  const auto give_up = [] {
    IF_RUN_AS(1, 1) {
      EXPECT_EQ(setresuid(1, 1, 1), 0);
      errno = EDOM;
    }
    EXPECT_EQ(errno, EDOM);
    EXPECT_EQ(ToText(CurrentIds()), ToText({1, 1, 1, 65534, 1, 0}));
    return 0;
  };
  EXPECT_EQ(RunInChildAs(kSavedRoot, give_up), 0) << "while nobody listens to the log";
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(kSavedRoot, give_up), 0);
  EXPECT_EQ(TakeWritten(listener), Lines{"auth.crit run_as_test:" + std::to_string(kGiveUpLine) +
                                         " ERROR: ~IF_RUN_AS(65534, 65534)"});
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
  EXPECT_EQ(TakeWritten(listener), Lines{"auth.err " + kSeenAs + " ERROR: IF_RUN_AS(1, 1)"});
}

// Meets the refusal on the way back alone.
const std::string kReturnInto = "run_as_test:" + std::to_string(__LINE__ + 2);
void ReturnInto(const tuvo_test::Refusal& refusal) {
  IF_RUN_AS(1, 1) {
    EXPECT_TRUE(RefuseCalls({refusal}));
    errno = EDOM;
  }
  EXPECT_EQ(errno, EDOM);
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
    return TakeWritten(listener);
  }

  // What is logged when only the return meets it, and the ids that the process is left with.
  static Lines ReturnUnder(const tuvo_test::Refusal& refusal, const Ids& start,
                           const std::string& left) {
    SyslogListener listener;
    EXPECT_EQ(RunInChildAs(start,
                           [&] {
                             ReturnInto(refusal);
                             EXPECT_EQ(ToText(CurrentIds()), left);
                             return 0;
                           }),
              0);
    return TakeWritten(listener);
  }
};

const Lines kSwitchLine{"auth.err " + kSeenAs + " ERROR: IF_RUN_AS(1, 1)"};
const Lines kReturnLine{"auth.crit " + kReturnInto + " ERROR: ~IF_RUN_AS(65534, 65534)"};

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
            Lines{"auth.crit " + kReturnInto + " ERROR: ~IF_RUN_AS(0, 0)"});
}

TEST_F(RunAsRefused, IdsAreWrittenAsSignedNumbers) {
  const Ids start{4294967294U, 4294967294U, 0, 4294967293U, 4294967293U, 0};
  EXPECT_EQ(ReturnUnder(Setting(kSetresuid, 0), start, Effective(start, 1, 1)),
            Lines{"auth.crit " + kReturnInto + " ERROR: ~IF_RUN_AS(-2, -3)"});
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
  EXPECT_EQ(TakeWritten(listener),
            (Lines{kSwitchLine[0], "auth.crit " + kSeenAs + " ERROR: ~IF_RUN_AS(65534, 65534)"}));
}

}  // namespace
