// The command behind the library's function that runs it.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <tuvosharing/send_webapi.h>
#include <unistd.h>

#include <filesystem>
#include <string>

#include "support/child.h"

namespace {

using TUVO::sharing::SendWebapi;
using tuvo_test::Ids;
using tuvo_test::RunInChildAs;

constexpr char kTool[] = "/usr/tuvo/bin/tuvowebapi";
constexpr const char* kLink = "TUVO.Sharing.Link";
constexpr Ids kAlice{2001, 2001, 2001, 2001, 2001, 2001};
constexpr Ids kBob{2002, 2002, 2002, 2002, 2002, 2002};

Json::Value Sent(const std::string& method, const Json::Value& params, int version = 1) {
  Json::Value reply;
  EXPECT_TRUE(SendWebapi(reply, kLink, version, method, params)) << method;
  return reply;
}

Json::Value Params(const std::string& name, const Json::Value& value) {
  Json::Value params(Json::objectValue);
  params[name] = value;
  return params;
}

class WebapiSendWebapi : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    // Set-user-id root, as it is installed for everybody. The build's own copy stays as it is.
    std::filesystem::copy_file(TUVO_WEBAPI, kTool);
    ASSERT_EQ(chown(kTool, 0, 0), 0);
    ASSERT_EQ(chmod(kTool, 04755), 0);
  }
  static void TearDownTestSuite() { std::filesystem::remove(kTool); }
};

TEST_F(WebapiSendWebapi, LinkFromItsCreationToItsEnd) {
  EXPECT_EQ(0, RunInChildAs(kAlice, [] {
              Json::Value settings(Json::objectValue);
              settings["project_name"] = "photos & \"more\" = 'x'";
              settings["expire_times"] = 5;
              settings["auto_gc"] = false;
              settings["protect_title"] = Json::Value();  // null is the empty text
              const Json::Value created = Sent("create", settings);
              EXPECT_TRUE(created["success"].asBool()) << created.toStyledString();
              const Json::Value link = created["data"]["link"];
              EXPECT_EQ(link["project_name"], settings["project_name"]);
              EXPECT_EQ(link["expire_times"], 5);
              EXPECT_EQ(link["auto_gc"], false);
              EXPECT_EQ(link["owner_user"], "alice");
              const Json::Value id = Params("id", link["id"]);
              EXPECT_EQ(Sent("get", id)["data"]["link"], link);
              EXPECT_EQ(Sent("list", Json::Value())["data"]["total"], 1);
              EXPECT_EQ(Sent("delete", id)["data"]["deleted"], 1);
              EXPECT_EQ(Sent("get", id)["error"]["code"], 205);
              return 0;
            }));
}

TEST_F(WebapiSendWebapi, AccountIsTheCallers) {
  EXPECT_EQ(0, RunInChildAs(kAlice, [] {
              Sent("create", Params("project_name", "x"));
              return Sent("list", Json::Value())["data"]["total"].asInt() == 1 ? 0 : 1;
            }));
  EXPECT_EQ(0, RunInChildAs(kBob, [] {
              return Sent("list", Json::Value())["data"]["total"].asInt() == 0 ? 0 : 1;
            }));
  EXPECT_GE(Sent("list", Json::Value())["data"]["total"].asInt(), 1);  // root
}

TEST_F(WebapiSendWebapi, RefusalsAreReplies) {
  EXPECT_EQ(Sent("no-such", Json::Value())["error"]["code"], 103);
  EXPECT_EQ(Sent("list", Json::Value(), 2)["error"]["code"], 104);
  EXPECT_EQ(Sent("list", Json::Value(), -1)["error"]["code"], 104);
  EXPECT_EQ(Sent("list", Params("nonsense", 1))["error"]["field"], "nonsense");
  EXPECT_EQ(Sent("list", Params("method", "get"))["error"]["code"], 101);
  EXPECT_EQ(Sent("list", Params("", "x"))["error"]["code"], 101);
}

TEST_F(WebapiSendWebapi, ListsAndObjectsTravelAsJson) {
  Json::Value settings = Params("project_name", "x");
  settings["protect_users"] = R"(["alice", "bob"])";
  settings["app"] = R"({"a": [1, null]})";
  const Json::Value link = Sent("create", settings)["data"]["link"];
  EXPECT_EQ(link["protect_users"].size(), 2U);
  EXPECT_EQ(link["app"]["a"][0], 1);
}

}  // namespace
