#include "owner/owner_ids.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <vector>

#include "support/child.h"

namespace owner {
namespace {

using tuvo_test::CurrentIds;
using tuvo_test::Ids;
using tuvo_test::RunInChildAs;

const Account kAlice{2001, "alice", false};
constexpr Ids kWhollyAlice{2001, 2001, 2001, 2001, 2001, 2001};

// 0 when a process that starts with `start` becomes alice for good.
int BecomeAliceFrom(const Ids& start) {
  const std::optional<OwnerIds> ids = IdsOf(kAlice);
  return RunInChildAs(start, [&ids] {
    if (!ids || !Become(*ids)) {
      return 1;
    }
    return CurrentIds() == kWhollyAlice && seteuid(0) != 0 ? 0 : 2;
  });
}

TEST(OwnerOwnerIds, AreTheAccountsIdsAndAllItsGroups) {
  const std::optional<OwnerIds> ids = IdsOf(kAlice);
  ASSERT_TRUE(ids);
  EXPECT_EQ(ids->uid, 2001U);
  EXPECT_EQ(ids->gid, 2001U);
  EXPECT_EQ(std::count(ids->groups.begin(), ids->groups.end(), 3001U), 1);
  EXPECT_EQ(std::count(ids->groups.begin(), ids->groups.end(), 2001U), 1);
}

TEST(OwnerOwnerIds, OfAnUnknownAccountAreNone) {
  EXPECT_FALSE(IdsOf(Account{4711, "mallory", false}));
}

TEST(OwnerOwnerIds, RootBecomesTheOwnerForGood) {
  EXPECT_EQ(BecomeAliceFrom(tuvo_test::kRoot), 0);
}

TEST(OwnerOwnerIds, SetUserIdRootBecomesTheOwnerForGood) {
  EXPECT_EQ(BecomeAliceFrom({33, 33, 0, 33, 33, 33}), 0);
}

TEST(OwnerOwnerIds, RootInTheGuiseOfTheSystemBecomesTheOwnerForGood) {
  EXPECT_EQ(BecomeAliceFrom({0, 1, 0, 0, 1, 0}), 0);
}

TEST(OwnerOwnerIds, GroupsAreTheOwnersAlone) {
  const std::optional<OwnerIds> ids = IdsOf(kAlice);
  EXPECT_EQ(tuvo_test::RunInChild([&ids] {
              const gid_t shadow = 42;
              if (setgroups(1, &shadow) != 0 || !Become(*ids)) {
                return 1;
              }
              std::array<gid_t, 64> groups{};
              const int count = getgroups(static_cast<int>(groups.size()), groups.data());
              const std::vector<gid_t> held(groups.begin(), groups.begin() + std::max(count, 0));
              return std::count(held.begin(), held.end(), shadow) == 0 &&
                             std::count(held.begin(), held.end(), 3001U) == 1
                         ? 0
                         : 2;
            }),
            0);
}

TEST(OwnerOwnerIds, StrangerCannotBecomeTheOwner) {
  EXPECT_EQ(BecomeAliceFrom(tuvo_test::kNobody), 1);
  EXPECT_EQ(BecomeAliceFrom(tuvo_test::kSystem), 1);
}

TEST(OwnerOwnerIds, OwnerStaysTheOwner) {
  EXPECT_EQ(BecomeAliceFrom(kWhollyAlice), 0);
}

}  // namespace
}  // namespace owner
