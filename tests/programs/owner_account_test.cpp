#include "owner/account.h"

#include <gtest/gtest.h>

namespace owner {
namespace {

TEST(OwnerAccount, MemberOfTheAdministratorsIsOne) {
  const std::optional<Account> carol = AccountOfName("carol");
  ASSERT_TRUE(carol);
  EXPECT_EQ(carol->uid, 2003U);
  EXPECT_EQ(carol->name, "carol");
  EXPECT_TRUE(carol->administrator);
}

TEST(OwnerAccount, OthersAreNot) {
  const std::optional<Account> alice = AccountOfName("alice");
  ASSERT_TRUE(alice);
  EXPECT_EQ(alice->uid, 2001U);
  EXPECT_FALSE(alice->administrator);
}

TEST(OwnerAccount, RootAndTheSystemAccountAreAdministrators) {
  EXPECT_TRUE(AccountOfUid(0).value().administrator);
  EXPECT_TRUE(AccountOfUid(1).value().administrator);
  EXPECT_FALSE(AccountOfUid(33).value().administrator);
}

TEST(OwnerAccount, IsFoundByItsUid) {
  EXPECT_EQ(AccountOfUid(2002).value().name, "bob");
}

TEST(OwnerAccount, UnknownOnesAreNone) {
  EXPECT_FALSE(AccountOfName("mallory"));
  EXPECT_FALSE(AccountOfName(""));
  EXPECT_FALSE(AccountOfUid(4711));
  EXPECT_FALSE(AccountOfUid(4294967295U));
}

TEST(OwnerAccount, NameIsNotReadUpToAZeroByte) {
  EXPECT_FALSE(AccountOfName(std::string("alice\0x", 7)));
}

}  // namespace
}  // namespace owner
