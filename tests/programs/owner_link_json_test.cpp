#include "owner/link_json.h"

#include <gtest/gtest.h>

#include "owner/argument.h"

namespace owner {
namespace {

using TUVO::sharing::record::Entry;

constexpr std::time_t kNow = 1700000000;

Entry Link() {
  Entry link;
  link.set_id(7).set_hash("Ab3dE5fG7").set_project_name("album").set_owner_uid(2001);
  link.set_app(Json::objectValue);
  return link;
}

TEST(OwnerLinkJson, HasTheDocumentedMembersAndNoOthers) {
  EXPECT_EQ(LinkJson(Link(), kNow).getMemberNames(),
            (std::vector<std::string>{"app",           "auto_gc",      "enable_match_ip",
                                      "enabled",       "expire_at",    "expire_times",
                                      "hash",          "id",           "owner_uid",
                                      "owner_user",    "project_name", "protect_groups",
                                      "protect_title", "protect_type", "protect_users",
                                      "redirect_type", "redirect_uri", "start_at",
                                      "state",         "use_count"}));
}

TEST(OwnerLinkJson, NamesTheRowTheOwnerAndTheState) {
  const Json::Value json = LinkJson(Link().set_expire_at(kNow - 1), kNow);
  EXPECT_EQ(json["id"].asInt(), 7);
  EXPECT_EQ(json["owner_uid"].asUInt(), 2001U);
  EXPECT_EQ(json["owner_user"].asString(), "alice");
  EXPECT_EQ(json["state"].asString(), "expired");
}

TEST(OwnerLinkJson, ShowsNeitherPasswordNorPrivateData) {
  Entry link = Link();
  link.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  Json::Value hidden;
  hidden["key"] = "hidden";
  link.set_private_data(hidden);
  const std::string text = WriteJson(LinkJson(link, kNow));
  EXPECT_EQ(text.find(link.get_protect_password()), std::string::npos);
  EXPECT_EQ(text.find(link.get_protect_password_salt()), std::string::npos);
  EXPECT_EQ(text.find("hidden"), std::string::npos);
}

TEST(OwnerLinkJson, StrayBytesOfOtherProgramsDoNotSpoilTheDocument) {
  Entry link = Link();
  Json::Value app;
  app["a"].append("x\xFF");
  app["\xFE"] = 1;
  link.set_app(app).set_protect_title("\xC3");
  const Json::Value json = LinkJson(link, kNow);
  EXPECT_EQ(json["protect_title"].asString(), "\xEF\xBF\xBD");
  EXPECT_EQ(json["app"]["a"][0].asString(), "x\xEF\xBF\xBD");
  EXPECT_TRUE(json["app"].isMember("\xEF\xBF\xBD"));
}

}  // namespace
}  // namespace owner
