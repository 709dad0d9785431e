// User and group lookup against the accounts of the private namespace: alice 2001 (groups alice,
// friends), bob 2002, carol 2003 (carol, administrators), dave 2004.
#include <gtest/gtest.h>
#include <syslog.h>
#include <tuvoplatform/account.h>
#include <tuvosharing/user_group.h>

#include <fstream>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "support/child.h"
#include "support/syslog_listener.h"

namespace {

using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)
using tuvo_test::LogLine;
using tuvo_test::SyslogListener;
using Gids = std::set<unsigned int>;
using User = std::unique_ptr<TUVOUSER, decltype(&TUVOUserFree)>;

constexpr unsigned int kUntouched = 77;

User Account(const char* name) {
  TUVOUSER* user = nullptr;
  EXPECT_TRUE(UserGet(name, user));
  return {user, &TUVOUserFree};
}

TEST(GetRealUsername, NullIsEmpty) {
  EXPECT_EQ(GetRealUsername(nullptr), "");
}

TEST(GetRealUsername, ANameThatNeedsNoConversionIsItself) {
  EXPECT_EQ(GetRealUsername("alice"), "alice");
  EXPECT_EQ(GetRealUsername(""), "");
  EXPECT_EQ(GetRealUsername(std::string(2000, 'x').c_str()), std::string(2000, 'x'));
}

TEST(UserGet, FindsAnAccountWithNameAndUidInSilence) {
  SyslogListener listener;
  const User user = Account("alice");
  ASSERT_NE(user, nullptr);
  EXPECT_STREQ(user->szName, "alice");
  EXPECT_EQ(user->nUid, 2001U);
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

TEST(UserGet, AnUnknownNameFailsWithOneLine) {
  SyslogListener listener;
  TUVOUSER* user = nullptr;
  EXPECT_FALSE(UserGet("mallory", user));
  EXPECT_EQ(user, nullptr);
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(lines[0].text), "utils_user_group:LINE No such user [mallory]");
  EXPECT_EQ(lines[0].priority, LOG_ERR);
  EXPECT_EQ(lines[0].facility, LOG_USER);
}

TEST(UserGet, NullIsAnUnknownName) {
  SyslogListener listener;
  TUVOUSER* user = nullptr;
  EXPECT_FALSE(UserGet(nullptr, user));
  const std::vector<std::string> texts = listener.TakeTexts();
  ASSERT_EQ(texts.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(texts[0]), "utils_user_group:LINE No such user []");
}

TEST(UserToUID, GivesTheUid) {
  unsigned int uid = kUntouched;
  EXPECT_TRUE(UserToUID("carol", uid));
  EXPECT_EQ(uid, 2003U);
}

TEST(UserToUID, RootIsFoundAsZero) {
  unsigned int uid = kUntouched;
  EXPECT_TRUE(UserToUID("root", uid));
  EXPECT_EQ(uid, 0U);
}

TEST(UserToUID, AnUnknownNameFailsInSilenceAndLeavesTheUidAlone) {
  SyslogListener listener;
  unsigned int uid = kUntouched;
  EXPECT_FALSE(UserToUID("mallory", uid));
  EXPECT_FALSE(UserToUID("", uid));
  EXPECT_FALSE(UserToUID("Alice", uid));
  EXPECT_FALSE(UserToUID("2001", uid));
  EXPECT_EQ(uid, kUntouched);
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

TEST(GroupToGID, GivesTheGid) {
  unsigned int gid = kUntouched;
  EXPECT_TRUE(GroupToGID("friends", gid));
  EXPECT_EQ(gid, 3001U);
}

TEST(GroupToGID, AnUnknownNameFailsInSilenceAndLeavesTheGidAlone) {
  SyslogListener listener;
  unsigned int gid = kUntouched;
  EXPECT_FALSE(GroupToGID("foes", gid));
  EXPECT_FALSE(GroupToGID("", gid));
  EXPECT_EQ(gid, kUntouched);
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

TEST(UIDToUser, GivesTheName) {
  std::string name = "kept";
  EXPECT_TRUE(UIDToUser(2002, name));
  EXPECT_EQ(name, "bob");
}

TEST(UIDToUser, AnUnknownUidFailsInSilenceAndLeavesTheNameAlone) {
  SyslogListener listener;
  std::string name = "kept";
  EXPECT_FALSE(UIDToUser(9999, name));
  EXPECT_FALSE(UIDToUser(4294967295U, name));
  EXPECT_EQ(name, "kept");
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

TEST(GIDToGroup, GivesTheName) {
  std::string name = "kept";
  EXPECT_TRUE(GIDToGroup(3002, name));
  EXPECT_EQ(name, "administrators");
}

TEST(GIDToGroup, AnUnknownGidFailsInSilenceAndLeavesTheNameAlone) {
  SyslogListener listener;
  std::string name = "kept";
  EXPECT_FALSE(GIDToGroup(9999, name));
  EXPECT_FALSE(GIDToGroup(4294967295U, name));
  EXPECT_EQ(name, "kept");
  EXPECT_EQ(listener.TakeTexts(), std::vector<std::string>{});
}

TEST(UserGroupsGet, AddsEveryGroupOfTheAccount) {
  const User user = Account("alice");
  Gids gids;
  EXPECT_TRUE(UserGroupsGet(user.get(), gids));
  EXPECT_EQ(gids, (Gids{2001, 3001}));
}

TEST(UserGroupsGet, OnlyAdds) {
  const User user = Account("carol");
  Gids gids{5, 2003, 9000};
  EXPECT_TRUE(UserGroupsGet(user.get(), gids));
  EXPECT_EQ(gids, (Gids{5, 2003, 3002, 9000}));
}

TEST(UserGroupsGet, FailsForAnAccountThatThePlatformDoesNotKnowAndLeavesTheSetAlone) {
  std::string name = "mallory";
  TUVOUSER user{};
  user.szName = name.data();
  Gids gids{5};
  EXPECT_FALSE(UserGroupsGet(&user, gids));
  EXPECT_EQ(gids, Gids{5});
}

// A primary group without a name, and no other: nothing to add, and no failure.
TEST(UserGroupsGet, AnAccountWhoseOnlyGroupHasNoNameYieldsNothing) {
  std::ofstream("/etc/passwd", std::ios::app)
      << "loner:x:2901:59999::/nonexistent:/usr/sbin/nologin\n";
  const User user = Account("loner");
  ASSERT_NE(user, nullptr);
  Gids gids{5};
  EXPECT_TRUE(UserGroupsGet(user.get(), gids));
  EXPECT_EQ(gids, Gids{5});
}

TEST(UserGroup, LookupsWorkUnderAnyIdentity) {
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kNobody,
                                    [] {
                                      unsigned int id = 0;
                                      std::string name;
                                      EXPECT_TRUE(UserToUID("alice", id));
                                      EXPECT_TRUE(UIDToUser(2001, name));
                                      EXPECT_TRUE(GroupToGID("friends", id));
                                      EXPECT_TRUE(GIDToGroup(3001, name));
                                      return 0;
                                    }),
            0);
}

}  // namespace
