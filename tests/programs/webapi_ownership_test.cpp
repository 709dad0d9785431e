#include "webapi/ownership.h"

#include <gtest/gtest.h>

namespace webapi {
namespace {

const owner::Account kAlice{2001, "alice", false};
const owner::Account kCarol{2003, "carol", true};

bool May(const owner::Account& account, const std::string& owner_user) {
  Json::Value arguments(Json::objectValue);
  arguments["owner_user"] = owner_user;
  const owner::MaybeProblem problem = CheckOwner(account, arguments);
  if (problem) {
    EXPECT_EQ(problem->error, owner::Error::kForbidden);
    EXPECT_EQ(problem->field, "owner_user");
  }
  return !problem;
}

TEST(WebapiOwnership, AdministratorsScopeIsEverybody) {
  EXPECT_EQ(ScopeOf(kAlice), owner::Scope(2001U));
  EXPECT_EQ(ScopeOf(kCarol), owner::Scope());
}

TEST(WebapiOwnership, NobodyButAdministratorsNamesAnother) {
  EXPECT_TRUE(May(kAlice, "alice"));
  for (const char* name : {"bob", "carol", "root", "no-such", "", "2001", "alice\n"}) {
    EXPECT_FALSE(May(kAlice, name)) << name;
    EXPECT_TRUE(May(kCarol, name)) << name;
  }
}

TEST(WebapiOwnership, WithoutAnOwnerThereIsNothingToRefuse) {
  EXPECT_EQ(CheckOwner(kAlice, Json::Value(Json::objectValue)), std::nullopt);
}

}  // namespace
}  // namespace webapi
