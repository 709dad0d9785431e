#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pwd.h>
#include <tuvoplatform/account.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/failing_allocations.h"

namespace {

int interruptions = 0;  // how many of the next lookups by name a signal interrupts
int lookups = 0;
size_t largest_buffer = 0;

}  // namespace

// Stands in front of the C library's for this program and the library that it tests.
extern "C" __attribute__((visibility("default"))) int getpwnam_r(const char* name, passwd* record,
                                                                 char* buffer, size_t size,
                                                                 passwd** found) {
  ++lookups;
  largest_buffer = std::max(largest_buffer, size);
  if (interruptions > 0) {
    --interruptions;
    *found = nullptr;
    return EINTR;
  }
  static const auto real = reinterpret_cast<decltype(&getpwnam_r)>(dlsym(RTLD_NEXT, "getpwnam_r"));
  return real(name, record, buffer, size, found);
}

namespace {

constexpr unsigned int kNoId = 4294967295U;

struct FreeUser {
  void operator()(TUVOUSER* user) const { TUVOUserFree(user); }
};
struct FreeGroup {
  void operator()(TUVOGROUP* group) const { TUVOGroupFree(group); }
};
struct FreeHash {
  void operator()(TLIBSZHASH* hash) const { TLIBCSzHashFree(hash); }
};
using User = std::unique_ptr<TUVOUSER, FreeUser>;
using Group = std::unique_ptr<TUVOGROUP, FreeGroup>;
using Hash = std::unique_ptr<TLIBSZHASH, FreeHash>;

// Adds lines to the account files, which are the test's own.
void Append(const char* path, const std::string& lines) {
  ASSERT_NE(nullptr, std::getenv("TUVO_PRIVATE_ROOT")) << "run this under scripts/private-root";
  std::ofstream file(path, std::ios::app);
  file << lines;
  ASSERT_TRUE(file.flush());
}

User UserByName(const std::string& name) {
  TUVOUSER* user = reinterpret_cast<TUVOUSER*>(&interruptions);
  const int code = TUVOUserGet(name.c_str(), &user);
  EXPECT_EQ(user != nullptr ? 0 : -1, code) << name;
  return User(user);
}

User UserByUid(unsigned int uid) {
  TUVOUSER* user = reinterpret_cast<TUVOUSER*>(&interruptions);
  const int code = TUVOUserGetByUID(uid, &user);
  EXPECT_EQ(user != nullptr ? 0 : -1, code) << uid;
  return User(user);
}

Group GroupByGid(unsigned int gid) {
  TUVOGROUP* group = reinterpret_cast<TUVOGROUP*>(&interruptions);
  const int code = TUVOGroupGetByGID(gid, &group);
  EXPECT_EQ(group != nullptr ? 0 : -1, code) << gid;
  return Group(group);
}

std::vector<std::string> GroupNames(const char* user) {
  const Hash hash(TLIBGroupInfoHashGet(user, 1, 0));
  if (hash == nullptr) {
    return {"(null)"};
  }
  return {hash->rgszItem, hash->rgszItem + hash->nItem};
}

using Names = std::vector<std::string>;

TEST(Account, LoginNamesNeedNoConversion) {
  char real[16] = "untouched";
  EXPECT_EQ(0, TUVOUserLoginNameConvert("alice", real, sizeof real));
  EXPECT_EQ(0, TUVOUserLoginNameConvert("nobody-here", real, sizeof real));
  EXPECT_STREQ("untouched", real);
}

TEST(Account, LoginNameConversionRefusesNull) {
  char real[16] = "untouched";
  EXPECT_EQ(-1, TUVOUserLoginNameConvert(nullptr, real, sizeof real));
  EXPECT_EQ(-1, TUVOUserLoginNameConvert("alice", nullptr, 16));
}

TEST(Account, UserIsFoundByName) {
  const User user = UserByName("alice");
  ASSERT_NE(nullptr, user);
  EXPECT_STREQ("alice", user->szName);
  EXPECT_EQ(2001U, user->nUid);
  EXPECT_EQ(2001U, user->nGid);
}

TEST(Account, UserIsFoundByUid) {
  const User user = UserByUid(2002);
  ASSERT_NE(nullptr, user);
  EXPECT_STREQ("bob", user->szName);
  EXPECT_EQ(2002U, user->nUid);
  const User root = UserByUid(0);
  ASSERT_NE(nullptr, root);
  EXPECT_STREQ("root", root->szName);
}

TEST(Account, UserRecordBeginsWithNameAndUid) {
  const User user = UserByName("carol");
  ASSERT_NE(nullptr, user);
  struct Beginning {
    char* name;
    unsigned int uid;
  };
  const auto* beginning = reinterpret_cast<const Beginning*>(user.get());
  EXPECT_STREQ("carol", beginning->name);
  EXPECT_EQ(2003U, beginning->uid);
}

TEST(Account, UidAndPrimaryGroupAreToldApart) {
  Append("/etc/passwd", "apart:x:2061:3061::/:/bin/false\n");
  for (const User& user : {UserByName("apart"), UserByUid(2061)}) {
    ASSERT_NE(nullptr, user);
    EXPECT_EQ(2061U, user->nUid);
    EXPECT_EQ(3061U, user->nGid);
  }
}

TEST(Account, UnknownUsersAreNotFound) {
  for (const char* name : {"nobody-here", "", "2001", "alice:x", "Alice", " alice", "alice\n"}) {
    EXPECT_EQ(nullptr, UserByName(name)) << name;
  }
  EXPECT_EQ(nullptr, UserByUid(54321));
  EXPECT_EQ(nullptr, UserByUid(kNoId));
}

TEST(Account, NullArgumentsAreAnsweredLikeUnknownNames) {
  TUVOUSER* user = reinterpret_cast<TUVOUSER*>(&interruptions);
  EXPECT_EQ(-1, TUVOUserGet(nullptr, &user));
  EXPECT_EQ(nullptr, user);
  EXPECT_EQ(-1, TUVOUserGet("alice", nullptr));
  EXPECT_EQ(-1, TUVOUserGetByUID(2001, nullptr));
  unsigned int gid = 7;
  EXPECT_EQ(-1, TUVOGroupGetGID(nullptr, &gid));
  EXPECT_EQ(7U, gid);
  EXPECT_EQ(-1, TUVOGroupGetGID("friends", nullptr));
  EXPECT_EQ(-1, TUVOGroupGetByGID(3001, nullptr));
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet(nullptr, 1, 0));
}

// The system's own look-up would end the process.
TEST(Account, NamesOfTenMebibytesAreNobodys) {
  const std::string name(10U << 20U, 'x');
  TUVOUSER* user = nullptr;
  EXPECT_EQ(TUVOUserGet(name.c_str(), &user), -1);
  EXPECT_EQ(user, nullptr);
  unsigned int gid = 0;
  EXPECT_EQ(TUVOGroupGetGID(name.c_str(), &gid), -1);
  EXPECT_EQ(TLIBGroupInfoHashGet(name.c_str(), 1, 0), nullptr);
  lookups = 0;
  EXPECT_EQ(TUVOUserGet(std::string(1025, 'x').c_str(), &user), -1);
  EXPECT_EQ(lookups, 0);
  EXPECT_EQ(TUVOUserGet(std::string(1024, 'x').c_str(), &user), -1);
  EXPECT_EQ(lookups, 1);
}

TEST(Account, FreeingNullIsAccepted) {
  TUVOUserFree(nullptr);
  TUVOGroupFree(nullptr);
  TLIBCSzHashFree(nullptr);
}

TEST(Account, GidIsFoundByGroupName) {
  unsigned int gid = 0;
  EXPECT_EQ(0, TUVOGroupGetGID("friends", &gid));
  EXPECT_EQ(3001U, gid);
}

TEST(Account, UnknownGroupLeavesTheGidUntouched) {
  unsigned int gid = 7;
  for (const char* name : {"no-such-group", "", "3001"}) {
    EXPECT_EQ(-1, TUVOGroupGetGID(name, &gid));
    EXPECT_EQ(7U, gid);
  }
}

TEST(Account, GroupIsFoundByGid) {
  const Group group = GroupByGid(3002);
  ASSERT_NE(nullptr, group);
  EXPECT_STREQ("administrators", group->szName);
  EXPECT_EQ(3002U, group->nGid);
  EXPECT_EQ(nullptr, GroupByGid(54321));
  EXPECT_EQ(nullptr, GroupByGid(kNoId));
}

TEST(Account, GroupsOfAUserAreHisPrimaryAndAllOthers) {
  Names names = GroupNames("alice");
  std::sort(names.begin(), names.end());
  EXPECT_EQ((Names{"alice", "friends"}), names);
  EXPECT_EQ(Names{"bob"}, GroupNames("bob"));
}

TEST(Account, PrimaryGroupComesFirst) {
  EXPECT_EQ((Names{"alice", "friends"}), GroupNames("alice"));
  Append("/etc/passwd", "late:x:2051:3051::/:/bin/false\n");
  Append("/etc/group", "early:x:2052:late\nlate:x:3051:\n");
  EXPECT_EQ((Names{"late", "early"}), GroupNames("late"));
}

TEST(Account, GroupsOfAnUnknownUserAreNull) {
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet("nobody-here", 1, 0));
}

TEST(Account, OtherKindsAndFlagsAreNull) {
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet("alice", 0, 0));
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet("alice", 2, 0));
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet("alice", 1, 1));
}

TEST(Account, GroupsWithoutANameAreLeftOut) {
  Append("/etc/passwd", "lonely:x:2101:54321::/:/bin/false\nguest:x:2102:54321::/:/bin/false\n");
  Append("/etc/group", "guests:x:3101:guest\n");
  const Hash none(TLIBGroupInfoHashGet("lonely", 1, 0));
  ASSERT_NE(nullptr, none);
  EXPECT_EQ(0, none->nItem);
  EXPECT_EQ(Names{"guests"}, GroupNames("guest"));
}

TEST(Account, AllBitsSetIsNoIdEvenWhenTheFilesSaySo) {
  Append("/etc/passwd", "ghost:x:4294967295:2001::/:/bin/false\n");
  Append("/etc/group", "ghosts:x:4294967295:alice\n");
  EXPECT_EQ(nullptr, UserByName("ghost"));
  EXPECT_EQ(nullptr, UserByUid(kNoId));
  EXPECT_EQ(nullptr, GroupByGid(kNoId));
  unsigned int gid = 7;
  EXPECT_EQ(-1, TUVOGroupGetGID("ghosts", &gid));
  EXPECT_EQ(7U, gid);
  EXPECT_EQ(nullptr, TLIBGroupInfoHashGet("ghost", 1, 0));
  const Names names = GroupNames("alice");
  EXPECT_EQ(0, std::count(names.begin(), names.end(), "ghosts"));
}

TEST(Account, LargestIdsAreFound) {
  Append("/etc/passwd", "last:x:4294967294:4294967294::/:/bin/false\n");
  Append("/etc/group", "lasts:x:4294967294:\n");
  const User user = UserByUid(4294967294U);
  ASSERT_NE(nullptr, user);
  EXPECT_STREQ("last", user->szName);
  EXPECT_EQ(4294967294U, user->nGid);
  EXPECT_EQ(Names{"lasts"}, GroupNames("last"));
}

TEST(Account, EntriesLargerThanTheFirstBufferAreRead) {
  Append("/etc/passwd", "wordy:x:2201:2201:" + std::string(20000, 'g') + ":/:/bin/false\n");
  std::string line = "crowd:x:3201:";
  for (int i = 0; i < 5000; ++i) {
    line += "member" + std::to_string(i) + ",";
  }
  Append("/etc/group", line + "wordy\n");

  largest_buffer = 0;
  const User user = UserByName("wordy");
  ASSERT_NE(nullptr, user);
  EXPECT_EQ(2201U, user->nUid);
  EXPECT_GT(largest_buffer, 20000U);
  EXPECT_NE(nullptr, UserByUid(2201));
  unsigned int gid = 0;
  EXPECT_EQ(0, TUVOGroupGetGID("crowd", &gid));
  EXPECT_EQ(3201U, gid);
  const Group group = GroupByGid(3201);
  ASSERT_NE(nullptr, group);
  EXPECT_STREQ("crowd", group->szName);
  EXPECT_EQ(Names{"crowd"}, GroupNames("wordy"));
}

TEST(Account, UserInHundredsOfGroupsHasThemAll) {
  constexpr int kGroups = 700;
  Append("/etc/passwd", "popular:x:2301:2001::/:/bin/false\n");
  std::string lines;
  Names expected{"alice"};
  for (int i = 0; i < kGroups; ++i) {
    const std::string name = "club" + std::to_string(i);
    lines += name + ":x:" + std::to_string(4000 + i) + ":popular\n";
    expected.push_back(name);
  }
  Append("/etc/group", lines);
  Names names = GroupNames("popular");
  std::sort(names.begin(), names.end());
  std::sort(expected.begin(), expected.end());
  EXPECT_EQ(expected, names);
}

// How often `look_up`, which answers 0 on success, fails when single allocations do.
int FailuresWithoutMemory(const std::function<int()>& look_up) {
  for (int failing = 0;; ++failing) {
    tuvo_test::allocations_left = failing;
    const int code = look_up();
    tuvo_test::allocations_left = -1;
    if (code == 0) {
      return failing;
    }
    EXPECT_EQ(-1, code);
  }
}

TEST(Account, EveryLackOfMemoryIsAFailureAndNoException) {
  const auto user = [](const auto& get) {
    TUVOUSER* found = nullptr;
    const int code = get(&found);
    EXPECT_EQ(code == 0, found != nullptr);
    TUVOUserFree(found);
    return code;
  };
  EXPECT_LT(1, FailuresWithoutMemory([&] {
              return user([](TUVOUSER** found) { return TUVOUserGet("alice", found); });
            }));
  EXPECT_LT(1, FailuresWithoutMemory([&] {
              return user([](TUVOUSER** found) { return TUVOUserGetByUID(2001, found); });
            }));
  unsigned int gid = 0;
  EXPECT_LT(0, FailuresWithoutMemory([&] { return TUVOGroupGetGID("friends", &gid); }));
  EXPECT_LT(1, FailuresWithoutMemory([] {
              TUVOGROUP* found = nullptr;
              const int code = TUVOGroupGetByGID(3001, &found);
              EXPECT_EQ(code == 0, found != nullptr);
              TUVOGroupFree(found);
              return code;
            }));
  EXPECT_LT(5, FailuresWithoutMemory([] {
              const Hash names(TLIBGroupInfoHashGet("alice", 1, 0));
              return names != nullptr ? 0 : -1;
            }));
}

TEST(Account, InterruptedLookupIsTriedAgain) {
  interruptions = 3;
  lookups = 0;
  EXPECT_NE(nullptr, UserByName("alice"));
  EXPECT_EQ(4, lookups);
}

TEST(Account, EntryLargerThanAnyBufferIsNotFound) {
  Append("/etc/passwd", "endless:x:2401:2401:" + std::string(70U << 20U, 'g') + ":/:/bin/false\n");
  EXPECT_EQ(nullptr, UserByName("endless"));
}

}  // namespace
