// Answers that a plain Linux account database never gives: names that are converted, errors of
// another kind, lists with empty and repeated names. This program is the platform itself, hence it
// is one of its own.
#include <gtest/gtest.h>
#include <syslog.h>
#include <tuvoplatform/account.h>
#include <tuvosharing/user_group.h>

#include <cstdio>
#include <cstring>
#include <map>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"

namespace {

constexpr int kNoSuchUser = -1;

struct Platform {
  std::map<std::string, std::string> conversions;
  int convert_failure = 0;
  bool convert_writes_all_the_same = false;
  unsigned int buffer_size = 0;  // as last passed
  bool buffer_was_zero = false;
  std::map<std::string, unsigned int> users;
  int failure = kNoSuchUser;       // the answer for a user that is not there
  bool record_on_failure = false;  // a record all the same
  bool no_groups_answer = false;
  std::vector<std::string> groups;
  std::optional<int> groups_count;  // when set, the count that the list tells
  std::map<std::string, unsigned int> gids;
  int group_failure = 2;           // the answer for a group that is not there
  std::vector<std::string> asked;  // names asked for, in order
  int records = 0;                 // handed out and not freed
  int lists = 0;
};

Platform platform;

TUVOUSER* NewUser(const std::string& name, unsigned int uid) {
  ++platform.records;
  return new TUVOUSER{strdup(name.c_str()), uid, 0};
}

}  // namespace

extern "C" {

int TUVOUserLoginNameConvert(const char* name, char* real, unsigned int size) {
  platform.buffer_size = size;
  platform.buffer_was_zero = true;
  for (unsigned int i = 0; i < size; ++i) {
    platform.buffer_was_zero = platform.buffer_was_zero && real[i] == '\0';
  }
  const auto found = platform.conversions.find(name);
  if (found == platform.conversions.end()) {
    if (platform.convert_writes_all_the_same) {
      std::snprintf(real, size, "half");
    }
    return platform.convert_failure;
  }
  std::snprintf(real, size, "%s", found->second.c_str());
  return static_cast<int>(found->second.size());
}

int TUVOUserGet(const char* name, TUVOUSER** user) {
  platform.asked.emplace_back(name);
  const auto found = platform.users.find(name);
  if (found != platform.users.end()) {
    *user = NewUser(found->first, found->second);
    return 0;
  }
  *user = platform.record_on_failure ? NewUser("half", 1) : nullptr;
  return platform.failure;
}

int TUVOUserGetByUID(unsigned int uid, TUVOUSER** user) {
  for (const auto& [name, id] : platform.users) {
    if (id == uid) {
      *user = NewUser(name, id);
      return 0;
    }
  }
  *user = platform.record_on_failure ? NewUser("half", uid) : nullptr;
  return platform.failure;
}

void TUVOUserFree(TUVOUSER* user) {
  if (user != nullptr) {
    --platform.records;
    free(user->szName);
    delete user;
  }
}

int TUVOGroupGetGID(const char* name, unsigned int* gid) {
  platform.asked.emplace_back(name);
  const auto found = platform.gids.find(name);
  if (found == platform.gids.end()) {
    *gid = 12345;  // what a failure leaves there is not to be believed
    return platform.group_failure;
  }
  *gid = found->second;
  return 0;
}

int TUVOGroupGetByGID(unsigned int gid, TUVOGROUP** group) {
  for (const auto& [name, id] : platform.gids) {
    if (id == gid) {
      ++platform.records;
      *group = new TUVOGROUP{strdup(name.c_str()), gid};
      return 0;
    }
  }
  *group = nullptr;
  if (platform.record_on_failure) {
    ++platform.records;
    *group = new TUVOGROUP{strdup("half"), gid};
  }
  return platform.failure;
}

void TUVOGroupFree(TUVOGROUP* group) {
  if (group != nullptr) {
    --platform.records;
    free(group->szName);
    delete group;
  }
}

TLIBSZHASH* TLIBGroupInfoHashGet(const char* user, int kind, int flags) {
  platform.asked.push_back(std::string(user) + "/" + std::to_string(kind) + "/" +
                           std::to_string(flags));
  if (platform.no_groups_answer) {
    return nullptr;
  }
  ++platform.lists;
  auto* list = new TLIBSZHASH{};
  list->nItem = platform.groups_count.value_or(static_cast<int>(platform.groups.size()));
  list->rgszItem = new char*[platform.groups.size()];
  for (size_t i = 0; i < platform.groups.size(); ++i) {
    list->rgszItem[i] = strdup(platform.groups[i].c_str());
  }
  return list;
}

void TLIBCSzHashFree(TLIBSZHASH* list) {
  --platform.lists;
  for (size_t i = 0; i < platform.groups.size(); ++i) {
    free(list->rgszItem[i]);
  }
  delete[] list->rgszItem;
  delete list;
}

}  // extern "C"

namespace {

using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)
using tuvo_test::SyslogListener;
using Gids = std::set<unsigned int>;
using Texts = std::vector<std::string>;

class UserGroupPlatform : public testing::Test {
 protected:
  UserGroupPlatform() {
    platform = Platform{};
    platform.users = {{"alice", 2001}, {"DOMAIN\\alice", 3001}};
    platform.conversions = {{"alice@domain", "DOMAIN\\alice"}, {"who@domain", "DOMAIN\\who"}};
    platform.gids = {{"one", 11}, {"two", 12}, {"three", 13}};
  }
  ~UserGroupPlatform() override {
    EXPECT_EQ(platform.records, 0) << "records not freed";
    EXPECT_EQ(platform.lists, 0) << "lists not freed";
  }

  static bool Groups(const Texts& names, Gids& gids) {
    platform.groups = names;
    std::string name = "alice";
    TUVOUSER user{name.data(), 2001, 0};
    return UserGroupsGet(&user, gids);
  }
};

TEST_F(UserGroupPlatform, AConvertedNameIsTakenInPlaceOfTheGivenOne) {
  EXPECT_EQ(GetRealUsername("alice@domain"), "DOMAIN\\alice");
}

TEST_F(UserGroupPlatform, TheBufferForTheConvertedNameIs493ZeroBytes) {
  GetRealUsername("alice");
  EXPECT_EQ(platform.buffer_size, 493U);
  EXPECT_TRUE(platform.buffer_was_zero);
}

TEST_F(UserGroupPlatform, AnAnswerOfZeroOrBelowLeavesTheNameAsItIs) {
  platform.convert_writes_all_the_same = true;
  for (const int answer : {0, -1}) {
    platform.convert_failure = answer;
    EXPECT_EQ(GetRealUsername("alice"), "alice") << answer;
  }
}

TEST_F(UserGroupPlatform, AnAnswerOfOneIsAConversion) {
  platform.conversions["alice"] = "b";
  EXPECT_EQ(GetRealUsername("alice"), "b");
}

TEST_F(UserGroupPlatform, NullIsNeverHandedToTheConversion) {
  EXPECT_EQ(GetRealUsername(nullptr), "");
  EXPECT_EQ(platform.buffer_size, 0U);
}

TEST_F(UserGroupPlatform, ALongConvertedNameFillsTheBuffer) {
  platform.conversions["long"] = std::string(492, 'x');
  EXPECT_EQ(GetRealUsername("long"), std::string(492, 'x'));
}

TEST_F(UserGroupPlatform, AUserIsLookedUpUnderTheConvertedName) {
  unsigned int uid = 0;
  EXPECT_TRUE(UserToUID("alice@domain", uid));
  EXPECT_EQ(uid, 3001U);
  TUVOUSER* user = nullptr;
  EXPECT_TRUE(UserGet("alice@domain", user));
  EXPECT_EQ(user->nUid, 3001U);
  TUVOUserFree(user);
}

TEST_F(UserGroupPlatform, TheLineOfAnUnknownUserShowsTheConvertedName) {
  SyslogListener listener;
  TUVOUSER* user = nullptr;
  EXPECT_FALSE(UserGet("who@domain", user));
  const int line = tuvo_test::SourceLine("utils/utils_user_group.cpp", "\"No such user [%s]\"");
  EXPECT_EQ(
      tuvo_test::TakeWritten(listener),
      Texts{"user.err utils_user_group:" + std::to_string(line) + " No such user [DOMAIN\\who]"});
}

TEST_F(UserGroupPlatform, AnErrorOtherThanMinusOneCountsAsSuccessInSilence) {
  SyslogListener listener;
  for (const int answer : {1, -2, 22}) {
    platform.failure = answer;
    TUVOUSER* user = nullptr;
    EXPECT_TRUE(UserGet("mallory", user)) << answer;
    EXPECT_EQ(user, nullptr);
  }
  EXPECT_EQ(listener.TakeTexts(), Texts{});
}

TEST_F(UserGroupPlatform, EveryAnswerButZeroIsNoUid) {
  for (const int answer : {-1, 1, -2, 22}) {
    platform.failure = answer;
    unsigned int uid = 77;
    EXPECT_FALSE(UserToUID("mallory", uid)) << answer;
    EXPECT_EQ(uid, 77U);
  }
}

TEST_F(UserGroupPlatform, ARecordThatComesWithAFailureIsFreedAndNotUsed) {
  platform.record_on_failure = true;
  for (const int answer : {-1, 1, -2, 22}) {
    platform.failure = answer;
    unsigned int uid = 77;
    std::string name = "kept";
    EXPECT_FALSE(UserToUID("mallory", uid)) << answer;
    EXPECT_FALSE(UIDToUser(9999, name)) << answer;
    EXPECT_FALSE(GIDToGroup(9999, name)) << answer;
    EXPECT_EQ(uid, 77U);
    EXPECT_EQ(name, "kept");
  }
}

TEST_F(UserGroupPlatform, ASuccessWithoutARecordIsNone) {
  platform.failure = 0;
  unsigned int uid = 77;
  std::string name = "kept";
  EXPECT_FALSE(UserToUID("mallory", uid));
  EXPECT_FALSE(UIDToUser(9999, name));
  EXPECT_FALSE(GIDToGroup(9999, name));
  EXPECT_EQ(uid, 77U);
  EXPECT_EQ(name, "kept");
}

TEST_F(UserGroupPlatform, NamesForIdsAreNotConverted) {
  std::string name;
  EXPECT_TRUE(UIDToUser(3001, name));
  EXPECT_TRUE(GIDToGroup(11, name));
  EXPECT_EQ(platform.buffer_size, 0U);
}

TEST_F(UserGroupPlatform, EveryAnswerButZeroIsNoName) {
  std::string name = "kept";
  for (const int answer : {-1, 1, 22}) {
    platform.failure = answer;
    EXPECT_FALSE(UIDToUser(9999, name));
    EXPECT_FALSE(GIDToGroup(9999, name));
  }
  EXPECT_EQ(name, "kept");
  EXPECT_TRUE(UIDToUser(2001, name));
  EXPECT_EQ(name, "alice");
  EXPECT_TRUE(GIDToGroup(12, name));
  EXPECT_EQ(name, "two");
}

TEST_F(UserGroupPlatform, GroupNamesAreNotConverted) {
  platform.conversions["one"] = "two";
  unsigned int gid = 0;
  EXPECT_TRUE(GroupToGID("one", gid));
  EXPECT_EQ(gid, 11U);
  EXPECT_EQ(platform.buffer_size, 0U);
}

TEST_F(UserGroupPlatform, EveryAnswerButZeroIsNoGid) {
  for (const int answer : {-1, 1, 2}) {
    platform.group_failure = answer;
    unsigned int gid = 0;
    EXPECT_FALSE(GroupToGID("four", gid)) << answer;
  }
}

TEST_F(UserGroupPlatform, TheGroupsAreAskedForByNameOfAllSources) {
  Gids gids;
  EXPECT_TRUE(Groups({"two"}, gids));
  EXPECT_EQ(platform.asked, (Texts{"alice/1/0", "two"}));
}

TEST_F(UserGroupPlatform, EmptyAndUnknownGroupsAreSkippedAndRepeatedOnesCountOnce) {
  for (const int answer : {-1, 1, 2}) {
    platform.group_failure = answer;
    platform.asked.clear();
    Gids gids{99};
    EXPECT_TRUE(Groups({"three", "", "four", "one", "three"}, gids)) << answer;
    EXPECT_EQ(gids, (Gids{11, 13, 99})) << answer;
    EXPECT_EQ(platform.asked, (Texts{"alice/1/0", "three", "four", "one", "three"}));
  }
}

TEST_F(UserGroupPlatform, AnAccountInNoGroupYieldsNothing) {
  Gids gids{99};
  EXPECT_TRUE(Groups({}, gids));
  EXPECT_EQ(gids, Gids{99});
}

TEST_F(UserGroupPlatform, ACountBelowOneIsNoGroup) {
  for (const int count : {0, -1}) {
    platform.groups_count = count;
    Gids gids{99};
    EXPECT_TRUE(Groups({"one"}, gids)) << count;
    EXPECT_EQ(gids, Gids{99}) << count;
  }
}

TEST_F(UserGroupPlatform, WithoutAnAnswerTheGroupsFail) {
  platform.no_groups_answer = true;
  Gids gids{99};
  EXPECT_FALSE(Groups({"one"}, gids));
  EXPECT_EQ(gids, Gids{99});
}

}  // namespace
