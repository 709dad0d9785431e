#include "webapi/registry.h"

#include <gtest/gtest.h>

#include <set>

#include "owner/settings.h"

namespace webapi {
namespace {

// The code that looking for the method comes to; 0: it is there.
int CodeOf(const std::string& api, int version, const std::string& method) {
  Call call;
  call.api = api;
  call.version = version;
  call.method = method;
  const Method* found = nullptr;
  const owner::MaybeProblem problem = FindMethod(call, &found);
  EXPECT_EQ(problem.has_value(), found == nullptr);
  return problem ? static_cast<int>(problem->error) : 0;
}

const Method* Of(const std::string& method) {
  Call call;
  call.api = "TUVO.Sharing.Link";
  call.version = 1;
  call.method = method;
  const Method* found = nullptr;
  EXPECT_FALSE(FindMethod(call, &found));
  return found;
}

TEST(WebapiRegistry, ApiThenVersionThenMethod) {
  EXPECT_EQ(CodeOf("TUVO.Sharing.Link", 1, "get"), 0);
  EXPECT_EQ(CodeOf("TUVO.API.Info", 1, "query"), 0);
  EXPECT_EQ(CodeOf("no-such", 9, "no-such"), 102);
  EXPECT_EQ(CodeOf("tuvo.api.info", 1, "query"), 102);
  EXPECT_EQ(CodeOf("", 1, "query"), 102);
  for (const int version : {-1, 0, 2}) {
    EXPECT_EQ(CodeOf("TUVO.Sharing.Link", version, "no-such"), 104) << version;
  }
  EXPECT_EQ(CodeOf("TUVO.Sharing.Link", 1, "query"), 103);
  EXPECT_EQ(CodeOf("TUVO.API.Info", 1, "get"), 103);
  EXPECT_EQ(CodeOf("TUVO.API.Info", 1, ""), 103);
}

TEST(WebapiRegistry, WhatChangesSomethingSaysSo) {
  for (const char* method : {"create", "set", "delete", "delete_expired", "sign_out"}) {
    EXPECT_TRUE(Of(method)->changes) << method;
  }
  for (const char* method : {"get", "list", "sessions"}) {
    EXPECT_FALSE(Of(method)->changes) << method;
  }
}

TEST(WebapiRegistry, CreateTakesEverySettingAndNeedsTheProject) {
  ASSERT_EQ(Of("create")->arguments.size(), owner::SettingArguments().size());
  for (const owner::Argument& argument : Of("create")->arguments) {
    EXPECT_EQ(argument.needed, argument.name == std::string("project_name")) << argument.name;
  }
}

TEST(WebapiRegistry, SetTakesEverySettingAndNeedsTheId) {
  ASSERT_EQ(Of("set")->arguments.size(), owner::SettingArguments().size() + 1);
  for (const owner::Argument& argument : Of("set")->arguments) {
    EXPECT_EQ(argument.needed, argument.name == std::string("id")) << argument.name;
  }
}

TEST(WebapiRegistry, NoArgumentHasANameOfTheRequestsOwn) {
  for (const Api& api : Apis()) {
    for (const Method& method : api.methods) {
      std::set<std::string> names = {"api", "version", "method"};
      for (const owner::Argument& argument : method.arguments) {
        EXPECT_TRUE(names.insert(argument.name).second) << method.name << " " << argument.name;
      }
    }
  }
}

}  // namespace
}  // namespace webapi
