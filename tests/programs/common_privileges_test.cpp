#include "common/privileges.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>

#include "support/child.h"

namespace common {
namespace {

using tuvo_test::CurrentIds;
using tuvo_test::Ids;

// The exit status of a process that starts with `start` and drops: 0 when it ends with `end`.
int DropFrom(const Ids& start, const Ids& end) {
  return tuvo_test::RunInChildAs(start, [end] {
    if (!DropPrivileges()) {
      return 1;
    }
    return CurrentIds() == end ? 0 : 2;
  });
}

TEST(CommonPrivileges, SetUserIdRootBecomesItsCallerAndKeepsTheWayBack) {
  EXPECT_EQ(DropFrom({33, 0, 0, 33, 33, 33}, {33, 33, 0, 33, 33, 33}), 0);
}

TEST(CommonPrivileges, SetUserAndGroupIdRootBecomesItsCaller) {
  EXPECT_EQ(DropFrom({33, 0, 0, 33, 0, 0}, {33, 33, 0, 33, 33, 0}), 0);
}

TEST(CommonPrivileges, RootBecomesTheSystemIdentity) {
  EXPECT_EQ(DropFrom(tuvo_test::kRoot, {0, 1, 0, 0, 1, 0}), 0);
}

TEST(CommonPrivileges, SystemIdentityStays) {
  EXPECT_EQ(DropFrom(tuvo_test::kSystem, tuvo_test::kSystem), 0);
}

TEST(CommonPrivileges, StrangerStays) {
  EXPECT_EQ(DropFrom(tuvo_test::kNobody, tuvo_test::kNobody), 0);
}

TEST(CommonPrivileges, SetGroupIdRootAloneIsGivenUp) {
  EXPECT_EQ(DropFrom({33, 33, 33, 33, 0, 0}, {33, 33, 33, 33, 33, 0}), 0);
}

TEST(CommonPrivileges, SupplementaryGroupsAreLeftBySetUserIdRoot) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const gid_t shadow = 42;
              if (setgroups(1, &shadow) != 0 || setresgid(33, 33, 33) != 0 ||
                  setresuid(33, 0, 0) != 0 || getgroups(0, nullptr) != 1) {
                return 1;
              }
              return DropPrivileges() && getgroups(0, nullptr) == 0 ? 0 : 2;
            }),
            0);
}

TEST(CommonPrivileges, SupplementaryGroupsAreLeftByRoot) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const gid_t shadow = 42;
              if (setgroups(1, &shadow) != 0) {
                return 1;
              }
              return DropPrivileges() && getgroups(0, nullptr) == 0 ? 0 : 2;
            }),
            0);
}

TEST(CommonPrivileges, RootCanBeTakenBack) {
  EXPECT_EQ(tuvo_test::RunInChildAs({33, 0, 0, 33, 33, 33},
                                    [] { return DropPrivileges() && seteuid(0) == 0 ? 0 : 1; }),
            0);
}

TEST(CommonPrivileges, CallersMaskIsReplaced) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              umask(0);
              return DropPrivileges() && umask(0) == 077 ? 0 : 1;
            }),
            0);
}

int HideFrom(const Ids& start, const Ids& end) {
  return tuvo_test::RunInChildAs(start, [end] {
    if (!HideFromCaller()) {
      return 1;
    }
    return CurrentIds() == end ? 0 : 2;
  });
}

TEST(CommonPrivileges, CallerIsLeftForTheSystemIdentityWithTheWayBackKept) {
  EXPECT_EQ(HideFrom({2001, 2001, 0, 2001, 2001, 2001}, {1, 1, 0, 1, 1, 2001}), 0);
}

TEST(CommonPrivileges, WithoutSavedRootNothingIsHidden) {
  EXPECT_EQ(HideFrom(tuvo_test::kNobody, tuvo_test::kNobody), 0);
  EXPECT_EQ(HideFrom({0, 1, 0, 0, 1, 0}, {0, 1, 0, 0, 1, 0}), 0);
}

TEST(CommonPrivileges, CallerCannotSignalWhatHasHidden) {
  std::array<int, 2> ready{};
  ASSERT_EQ(pipe(ready.data()), 0);
  const pid_t hidden = fork();
  if (hidden == 0) {
    if (setresgid(2001, 2001, 2001) != 0 || setresuid(2001, 2001, 0) != 0 || !HideFromCaller() ||
        write(ready[1], "x", 1) != 1) {
      _exit(1);
    }
    pause();
    _exit(0);
  }
  char byte = 0;
  ASSERT_EQ(read(ready[0], &byte, 1), 1);
  for (const int signal : {SIGSTOP, SIGTERM, SIGKILL}) {
    EXPECT_EQ(tuvo_test::RunInChildAs(
                  {2001, 2001, 2001, 2001, 2001, 2001},
                  [&] { return kill(hidden, signal) == -1 && errno == EPERM ? 0 : 1; }),
              0)
        << signal;
  }
  kill(hidden, SIGKILL);
  waitpid(hidden, nullptr, 0);
  close(ready[0]);
  close(ready[1]);
}

}  // namespace
}  // namespace common
