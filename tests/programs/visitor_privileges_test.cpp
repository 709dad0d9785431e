#include "visitor/privileges.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "support/child.h"

namespace visitor {
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

TEST(VisitorPrivileges, SetUserIdRootBecomesItsCallerAndKeepsTheWayBack) {
  EXPECT_EQ(DropFrom({33, 0, 0, 33, 33, 33}, {33, 33, 0, 33, 33, 33}), 0);
}

TEST(VisitorPrivileges, SetUserAndGroupIdRootBecomesItsCaller) {
  EXPECT_EQ(DropFrom({33, 0, 0, 33, 0, 0}, {33, 33, 0, 33, 33, 0}), 0);
}

TEST(VisitorPrivileges, RootBecomesTheSystemIdentity) {
  EXPECT_EQ(DropFrom(tuvo_test::kRoot, {0, 1, 0, 0, 1, 0}), 0);
}

TEST(VisitorPrivileges, SystemIdentityStays) {
  EXPECT_EQ(DropFrom(tuvo_test::kSystem, tuvo_test::kSystem), 0);
}

TEST(VisitorPrivileges, StrangerStays) {
  EXPECT_EQ(DropFrom(tuvo_test::kNobody, tuvo_test::kNobody), 0);
}

TEST(VisitorPrivileges, SetGroupIdRootAloneIsGivenUp) {
  EXPECT_EQ(DropFrom({33, 33, 33, 33, 0, 0}, {33, 33, 33, 33, 33, 0}), 0);
}

TEST(VisitorPrivileges, RootCanBeTakenBack) {
  EXPECT_EQ(tuvo_test::RunInChildAs({33, 0, 0, 33, 33, 33},
                                    [] { return DropPrivileges() && seteuid(0) == 0 ? 0 : 1; }),
            0);
}

TEST(VisitorPrivileges, CallersMaskIsReplaced) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              umask(0);
              return DropPrivileges() && umask(0) == 077 ? 0 : 1;
            }),
            0);
}

}  // namespace
}  // namespace visitor
