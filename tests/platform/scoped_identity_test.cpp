#include "scoped_identity.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <optional>
#include <string>

#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace tuvo_platform {
namespace {

using tuvo_test::CurrentIds;
using tuvo_test::Ids;
using tuvo_test::RunInChildAs;
using tuvo_test::ToText;

// Takes `uid` and `gid` in a process that starts as `start`, and expects what `expected` has for
// its effective ids meanwhile, and the start's afterwards.
void ExpectSwitch(const Ids& start, uid_t uid, gid_t gid, bool ok, const Ids& expected) {
  EXPECT_EQ(RunInChildAs(start,
                         [&] {
                           {
                             const ScopedIdentity identity(uid, gid);
                             EXPECT_EQ(identity.ok(), ok);
                             EXPECT_EQ(ToText(CurrentIds()), ToText(expected));
                           }
                           EXPECT_EQ(ToText(CurrentIds()), ToText(start));
                           return 0;
                         }),
            0)
      << ToText(start) << " to " << uid << "/" << gid;
}

TEST(ScopedIdentity, RootTakesAnyIds) {
  ExpectSwitch(tuvo_test::kRoot, 1, 1, true, {0, 1, 0, 0, 1, 0});
  ExpectSwitch(tuvo_test::kRoot, 0, 0, true, tuvo_test::kRoot);
}

TEST(ScopedIdentity, SavedRootIsRegained) {
  ExpectSwitch(tuvo_test::kSavedRoot, 0, 0, true, {65534, 0, 0, 65534, 0, 0});
}

TEST(ScopedIdentity, SavedRootTakesOtherIds) {
  ExpectSwitch(tuvo_test::kSavedRoot, 1, 1, true, {65534, 1, 0, 65534, 1, 0});
}

TEST(ScopedIdentity, RealRootIsRegained) {
  ExpectSwitch({0, 65534, 65534, 0, 65534, 65534}, 0, 0, true, {0, 0, 65534, 0, 0, 65534});
}

TEST(ScopedIdentity, IdsThatAreThereNeedNoRoot) {
  ExpectSwitch(tuvo_test::kSystem, 1, 1, true, tuvo_test::kSystem);
}

TEST(ScopedIdentity, WithoutRootNothingChanges) {
  ExpectSwitch(tuvo_test::kNobody, 0, 0, false, tuvo_test::kNobody);
  ExpectSwitch(tuvo_test::kNobody, 1, 1, false, tuvo_test::kNobody);
  ExpectSwitch(tuvo_test::kSystem, 0, 0, false, tuvo_test::kSystem);
}

TEST(ScopedIdentity, RootThatCouldNotComeBackIsKept) {
  const Ids start{1, 0, 1, 1, 0, 1};
  ExpectSwitch(start, 65534, 65534, false, start);
  ExpectSwitch({1, 0, 1, 1, 1, 1}, 0, 0, true, start);
}

TEST(ScopedIdentity, OwnIdsWithoutAGroupAreNotHalfTaken) {
  const Ids start{65534, 65534, 1, 65534, 65534, 65534};
  ExpectSwitch(start, 1, 1, false, start);
}

TEST(ScopedIdentity, TheRightUidStillNeedsItsGroup) {
  ExpectSwitch({1, 1, 0, 3001, 3001, 3001}, 1, 1, true, {1, 1, 0, 3001, 1, 3001});
  const Ids start{1, 1, 1, 3001, 3001, 3001};
  ExpectSwitch(start, 1, 1, false, start);
}

// Root is regained on the way; when the group is then refused, the process must not stay root.
TEST(ScopedIdentity, ASwitchThatStopsHalfwayIsUndone) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system cannot refuse single system calls";
  }
  const Ids& start = tuvo_test::kSavedRoot;
  EXPECT_EQ(RunInChildAs(start,
                         [&] {
                           EXPECT_TRUE(tuvo_test::RefuseCalls(
                               {{tuvo_test::kSetresgid, EDOM, /*argument=*/1, /*value=*/1}}));
                           errno = 0;
                           const ScopedIdentity identity(1, 1);
                           EXPECT_EQ(errno, EDOM);
                           EXPECT_FALSE(identity.ok());
                           EXPECT_EQ(ToText(CurrentIds()), ToText(start));
                           return 0;
                         }),
            0);
}

TEST(ScopedIdentity, ObjectsNest) {
  EXPECT_EQ(RunInChildAs(tuvo_test::kSavedRoot,
                         [] {
                           const ScopedIdentity root(0, 0);
                           {
                             const ScopedIdentity system(1, 1);
                             EXPECT_EQ(geteuid(), 1u);
                           }
                           EXPECT_EQ(geteuid(), 0u);
                           EXPECT_EQ(getegid(), 0u);
                           return 0;
                         }),
            0);
}

TEST(ScopedIdentity, SupplementaryGroupsStay) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const gid_t group = 7;
              EXPECT_EQ(setgroups(1, &group), 0);
              const ScopedIdentity identity(1, 1);
              gid_t groups[8] = {};
              EXPECT_EQ(getgroups(8, groups), 1);
              EXPECT_EQ(groups[0], group);
              return 0;
            }),
            0);
}

TEST(ScopedIdentity, ErrnoIsKept) {
  EXPECT_EQ(RunInChildAs(tuvo_test::kSavedRoot,
                         [] {
                           {
                             const ScopedIdentity identity(1, 1);
                             errno = ENOTTY;
                           }
                           EXPECT_EQ(errno, ENOTTY);
                           return 0;
                         }),
            0);
  EXPECT_EQ(RunInChildAs(tuvo_test::kNobody,
                         [] {
                           errno = 0;
                           const ScopedIdentity identity(1, 1);
                           EXPECT_EQ(errno, EPERM);
                           return 0;
                         }),
            0);
}

TEST(ScopedIdentity, ProcessEndsWhenItCannotReturn) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(RunInChildAs(tuvo_test::kRoot,
                         [] {
                           std::optional<ScopedIdentity> identity;
                           identity.emplace(1, 1);
                           if (setresuid(1, 1, 1) != 0) {  // root is given up behind its back
                             return 1;
                           }
                           identity.reset();
                           return 0;
                         }),
            256 + SIGABRT);
  const auto lines = log.Take();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_EQ(lines[0].facility, LOG_AUTH);
  EXPECT_EQ(lines[0].priority, LOG_CRIT);
  const int line =
      tuvo_test::SourceLine("platform/src/scoped_identity.cpp", "syslog(LOG_AUTH | LOG_CRIT");
  EXPECT_EQ(lines[0].text, "scoped_identity:" + std::to_string(line) +
                               " cannot return to uid 0 gid 0: Operation not permitted");
}

}  // namespace
}  // namespace tuvo_platform
