#include "owner/settings.h"

#include <gtest/gtest.h>
#include <tuvosharing/keys.h>

#include <string>

namespace owner {
namespace {

using TUVO::sharing::record::Entry;

constexpr std::time_t kNow = 1700000000;

Json::Value Given(const std::string& json) {
  Json::Value value;
  EXPECT_TRUE(ReadJson(json, &value)) << json;
  return value;
}

std::string Text(size_t length) {
  return std::string(length, 'x');
}

// What comes of the arguments on a link, as both programs take them.
MaybeProblem Apply(const Json::Value& arguments, Entry* link) {
  if (MaybeProblem problem = CheckArguments(arguments, SettingArguments())) {
    return problem;
  }
  Settings settings;
  if (MaybeProblem problem = ReadSettings(arguments, kNow, &settings)) {
    return problem;
  }
  return ApplySettings(settings, link);
}

MaybeProblem Apply(const char* json, Entry* link) {
  return Apply(Given(json), link);
}

Entry Link() {
  Entry link;
  link.set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
  return link;
}

// The problem of one argument on a fresh link: its field, empty when there is none.
std::string FaultyField(const Json::Value& arguments, Error error = Error::kBadValue) {
  Entry link = Link();
  const MaybeProblem problem = Apply(arguments, &link);
  if (!problem) {
    return "";
  }
  EXPECT_EQ(problem->error, error) << problem->message;
  EXPECT_FALSE(problem->message.empty());
  return problem->field;
}

std::string FaultyField(const char* json, Error error = Error::kBadValue) {
  return FaultyField(Given(json), error);
}

Json::Value One(const char* name, const Json::Value& value) {
  Json::Value arguments;
  arguments[name] = value;
  return arguments;
}

TEST(OwnerSettings, EverySettingReachesTheLink) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"owner_user":"bob","project_name":"photo","hash":"a-b_C9","enabled":false,
                      "start_at":"+1d","expire_at":"+2d","expire_times":7,"use_count":3,
                      "auto_gc":false,"enable_match_ip":false,"protect_type":"user",
                      "protect_title":"Titel \u00e9","protect_users":["alice"],
                      "protect_groups":["friends"],"redirect_type":"url_param",
                      "redirect_uri":"https://example.org/x","app":{"a":1},
                      "private_data":{"b":2}})",
                  &link),
            std::nullopt);
  EXPECT_EQ(link.get_owner_uid(), 2002U);
  EXPECT_EQ(link.get_project_name(), "photo");
  EXPECT_EQ(link.get_hash(), "a-b_C9");
  EXPECT_FALSE(link.get_enabled());
  EXPECT_EQ(link.get_start_at(), kNow + 86400);
  EXPECT_EQ(link.get_expire_at(), kNow + 2 * 86400);
  EXPECT_EQ(link.get_expire_times(), 7);
  EXPECT_EQ(link.get_use_count(), 3);
  EXPECT_FALSE(link.get_auto_gc());
  EXPECT_FALSE(link.get_enable_match_ip());
  EXPECT_EQ(link.get_protect_type(), Entry::PROTECT_USER);
  EXPECT_EQ(link.get_protect_title(), "Titel \xC3\xA9");
  EXPECT_EQ(link.get_protect_uids(), std::vector<unsigned int>{2001});
  EXPECT_EQ(link.get_protect_gids(), std::vector<unsigned int>{3001});
  EXPECT_EQ(link.get_redirect_type(), Entry::REDIRECT_URLPARAM);
  EXPECT_EQ(link.get_redirect_uri(), "https://example.org/x");
  EXPECT_EQ(link.get_app(), Given(R"({"a":1})"));
  EXPECT_EQ(link.get_private_data(), Given(R"({"b":2})"));
  EXPECT_TRUE(link.IsLegal());
}

TEST(OwnerSettings, WhatIsLeftOutStays) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_password":"secret","expire_times":7,"use_count":3,
                      "protect_title":"t","redirect_type":"always","redirect_uri":"/x",
                      "private_data":{"b":2}})",
                  &link),
            std::nullopt);
  const auto before = link.GetFieldMap();
  ASSERT_EQ(Apply("{}", &link), std::nullopt);
  EXPECT_EQ(link.GetFieldMap(), before);
}

TEST(OwnerSettings, UnknownOwnerIsRefused) {
  EXPECT_EQ(FaultyField(R"({"owner_user":"mallory"})"), "owner_user");
  EXPECT_EQ(FaultyField(R"({"owner_user":""})"), "owner_user");
}

TEST(OwnerSettings, ProjectHasOneToSixtyFourPlainBytes) {
  EXPECT_EQ(FaultyField(One("project_name", Text(1))), "");
  EXPECT_EQ(FaultyField(One("project_name", Text(64))), "");
  EXPECT_EQ(FaultyField(One("project_name", Text(65))), "project_name");
  EXPECT_EQ(FaultyField(One("project_name", "")), "project_name");
  EXPECT_EQ(FaultyField(One("project_name", "a\nb")), "project_name");
}

TEST(OwnerSettings, HashHasThreeToSixtyFourUrlSafeCharacters) {
  EXPECT_EQ(FaultyField(One("hash", "ab-")), "");
  EXPECT_EQ(FaultyField(One("hash", Text(64))), "");
  EXPECT_EQ(FaultyField(One("hash", "ab")), "hash");
  EXPECT_EQ(FaultyField(One("hash", Text(65))), "hash");
  EXPECT_EQ(FaultyField(One("hash", "a/b")), "hash");
  EXPECT_EQ(FaultyField(One("hash", "a'b")), "hash");
  EXPECT_EQ(FaultyField(One("hash", "")), "hash");
}

TEST(OwnerSettings, EmptyTimesAreNone) {
  Entry link = Link();
  link.set_start_at(5).set_expire_at(9);
  ASSERT_EQ(Apply(R"({"start_at":"","expire_at":""})", &link), std::nullopt);
  EXPECT_EQ(link.get_start_at(), 0);
  EXPECT_EQ(link.get_expire_at(), 0);
}

TEST(OwnerSettings, TimesThatAreNoneAreRefused) {
  EXPECT_EQ(FaultyField(R"({"start_at":"soon"})"), "start_at");
  EXPECT_EQ(FaultyField(R"({"expire_at":"2026-02-30"})"), "expire_at");
}

TEST(OwnerSettings, DateAloneBeginsWithItsFirstAndEndsWithItsLastSecond) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"start_at":"2026-01-02","expire_at":"2026-01-02"})", &link), std::nullopt);
  EXPECT_EQ(link.get_expire_at() - link.get_start_at(), 86399);
}

TEST(OwnerSettings, EndMustLieBehindTheStart) {
  EXPECT_EQ(FaultyField(R"({"start_at":"+2d","expire_at":"+2d"})", Error::kConflict), "expire_at");
  EXPECT_EQ(FaultyField(R"({"start_at":"+2d","expire_at":"+1d"})", Error::kConflict), "expire_at");
  EXPECT_EQ(FaultyField(R"({"start_at":"+1d","expire_at":"+2d"})"), "");
  EXPECT_EQ(FaultyField(R"({"start_at":"+1d"})"), "");
}

TEST(OwnerSettings, EndIsComparedWithTheStartThatTheLinkHas) {
  Entry link = Link();
  link.set_start_at(static_cast<long>(kNow + 100));
  const MaybeProblem problem = Apply(R"({"expire_at":"+90s"})", &link);
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->field, "expire_at");
}

TEST(OwnerSettings, CountsAreNotNegative) {
  EXPECT_EQ(FaultyField(R"({"expire_times":-1})"), "expire_times");
  EXPECT_EQ(FaultyField(R"({"use_count":-1})"), "use_count");
  EXPECT_EQ(FaultyField(R"({"expire_times":2147483647,"use_count":2147483647})"), "");
}

TEST(OwnerSettings, NewLimitStartsTheCountAnew) {
  Entry link = Link();
  link.set_use_count(5);
  ASSERT_EQ(Apply(R"({"expire_times":7})", &link), std::nullopt);
  EXPECT_EQ(link.get_use_count(), 0);
}

TEST(OwnerSettings, CountGivenAlongWithANewLimitHolds) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"expire_times":7,"use_count":4})", &link), std::nullopt);
  EXPECT_EQ(link.get_use_count(), 4);
}

TEST(OwnerSettings, ChangedLimitKeepsTheCount) {
  Entry link = Link();
  link.set_expire_times(9).set_use_count(5);
  ASSERT_EQ(Apply(R"({"expire_times":7})", &link), std::nullopt);
  EXPECT_EQ(link.get_use_count(), 5);
}

TEST(OwnerSettings, TitleHasAtMost255PlainBytes) {
  EXPECT_EQ(FaultyField(One("protect_title", "")), "");
  EXPECT_EQ(FaultyField(One("protect_title", Text(255))), "");
  EXPECT_EQ(FaultyField(One("protect_title", Text(256))), "protect_title");
  EXPECT_EQ(FaultyField(One("protect_title", "a\tb")), "protect_title");
}

TEST(OwnerSettings, PasswordHasOneTo128PlainBytes) {
  EXPECT_EQ(FaultyField(One("protect_password", Text(1))), "");
  EXPECT_EQ(FaultyField(One("protect_password", Text(128))), "");
  EXPECT_EQ(FaultyField(One("protect_password", Text(129))), "protect_password");
  EXPECT_EQ(FaultyField(One("protect_password", "")), "protect_password");
  EXPECT_EQ(FaultyField(One("protect_password", "a\nb")), "protect_password");
}

TEST(OwnerSettings, PasswordIsKeptAsASaltedDigest) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_password":"secret"})", &link), std::nullopt);
  EXPECT_EQ(link.get_protect_password_algo(), Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_EQ(link.get_protect_password().size(), 40U);
  EXPECT_TRUE(link.IsPasswordValid("secret"));
  EXPECT_FALSE(link.IsPasswordValid("Secret"));
}

TEST(OwnerSettings, PasswordMakesTheLinkOneForAPassword) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_password":"secret"})", &link), std::nullopt);
  EXPECT_EQ(link.get_protect_type(), Entry::PROTECT_PASSWORD);
}

TEST(OwnerSettings, UsersOrGroupsMakeTheLinkOneForAccounts) {
  Entry users = Link();
  ASSERT_EQ(Apply(R"({"protect_users":["alice"]})", &users), std::nullopt);
  EXPECT_EQ(users.get_protect_type(), Entry::PROTECT_USER);
  Entry groups = Link();
  ASSERT_EQ(Apply(R"({"protect_groups":["friends"]})", &groups), std::nullopt);
  EXPECT_EQ(groups.get_protect_type(), Entry::PROTECT_USER);
}

TEST(OwnerSettings, EmptyListsMeanNoProtection) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_users":[],"protect_groups":[]})", &link), std::nullopt);
  EXPECT_EQ(link.get_protect_type(), Entry::PROTECT_NONE);
}

TEST(OwnerSettings, PasswordAndUsersTogetherNeedATypeThatSaysWhichCounts) {
  EXPECT_EQ(FaultyField(R"({"protect_password":"s","protect_users":["alice"]})", Error::kConflict),
            "protect_type");
  EXPECT_EQ(
      FaultyField(R"({"protect_password":"s","protect_users":["alice"],"protect_type":"user"})"),
      "");
}

TEST(OwnerSettings, ProtectionByPasswordNeedsOne) {
  EXPECT_EQ(FaultyField(R"({"protect_type":"password"})", Error::kConflict), "protect_password");
}

TEST(OwnerSettings, ProtectionByPasswordMayKeepTheOneThatIsThere) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_password":"secret"})", &link), std::nullopt);
  ASSERT_EQ(Apply(R"({"protect_type":"none"})", &link), std::nullopt);
  ASSERT_EQ(Apply(R"({"protect_type":"password"})", &link), std::nullopt);
  EXPECT_TRUE(link.IsPasswordValid("secret"));
}

TEST(OwnerSettings, ProtectionByAccountNeedsSomebody) {
  EXPECT_EQ(FaultyField(R"({"protect_type":"user"})", Error::kConflict), "protect_users");
  EXPECT_EQ(FaultyField(R"({"protect_type":"user","protect_users":[]})", Error::kConflict),
            "protect_users");
}

TEST(OwnerSettings, LastAccountOfALinkForAccountsCannotBeTakenAway) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"protect_users":["alice"]})", &link), std::nullopt);
  const MaybeProblem problem = Apply(R"({"protect_users":[]})", &link);
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kConflict);
}

TEST(OwnerSettings, NamesThatStandForNobodyAreRefused) {
  EXPECT_EQ(FaultyField(R"({"protect_users":["alice","mallory"]})"), "protect_users");
  EXPECT_EQ(FaultyField(R"({"protect_groups":["nosuchgroup"]})"), "protect_groups");
  EXPECT_EQ(FaultyField(R"({"protect_users":[""]})"), "protect_users");
  EXPECT_EQ(FaultyField(R"({"protect_users":["a\nb"]})"), "protect_users");
}

TEST(OwnerSettings, NamesThatTheLinkHoldsMayStayWhenTheyAreGone) {
  Entry link = Link();
  link.set_protect_users({"alice", "longgone"}).set_protect_groups({"oldgroup"});
  link.set_protect_type(Entry::PROTECT_USER);
  ASSERT_EQ(Apply(R"({"protect_users":["longgone","bob"],"protect_groups":["oldgroup"]})", &link),
            std::nullopt);
  EXPECT_EQ(link.get_protect_users(), (std::vector<std::string>{"bob", "longgone"}));
}

TEST(OwnerSettings, AtMostTwoHundredNames) {
  Json::Value names(Json::arrayValue);
  for (int i = 0; i < 200; ++i) {
    names.append("alice");
  }
  EXPECT_EQ(FaultyField(One("protect_users", names)), "");
  names.append("alice");
  EXPECT_EQ(FaultyField(One("protect_users", names)), "protect_users");
  EXPECT_EQ(FaultyField(One("protect_groups", names)), "protect_groups");
}

TEST(OwnerSettings, ChoicesAreOfTheirTexts) {
  EXPECT_EQ(FaultyField(R"({"protect_type":"secret"})"), "protect_type");
  EXPECT_EQ(FaultyField(R"({"protect_type":""})"), "protect_type");
  EXPECT_EQ(FaultyField(R"({"redirect_type":"Always"})"), "redirect_type");
}

TEST(OwnerSettings, RedirectNeedsATarget) {
  EXPECT_EQ(FaultyField(R"({"redirect_type":"always"})", Error::kConflict), "redirect_uri");
  EXPECT_EQ(FaultyField(R"({"redirect_type":"none"})"), "");
}

TEST(OwnerSettings, TargetOfARedirectCannotBeTakenAway) {
  Entry link = Link();
  ASSERT_EQ(Apply(R"({"redirect_type":"always","redirect_uri":"/x"})", &link), std::nullopt);
  const MaybeProblem problem = Apply(R"({"redirect_uri":""})", &link);
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->field, "redirect_uri");
}

TEST(OwnerSettings, TargetsAreWhatVisitorsCanBeSentTo) {
  EXPECT_EQ(FaultyField(One("redirect_uri", "https://example.org")), "");
  EXPECT_EQ(FaultyField(One("redirect_uri", "/photos/1")), "");
  EXPECT_EQ(FaultyField(One("redirect_uri", "javascript:alert(1)")), "redirect_uri");
  EXPECT_EQ(FaultyField(One("redirect_uri", "//example.org")), "redirect_uri");
  EXPECT_EQ(FaultyField(One("redirect_uri", "/a\r\nSet-Cookie: b")), "redirect_uri");
  EXPECT_EQ(FaultyField(One("redirect_uri", "/" + Text(2047))), "");
  EXPECT_EQ(FaultyField(One("redirect_uri", "/" + Text(2048))), "redirect_uri");
}

TEST(OwnerSettings, DocumentsHaveAtMost64KiB) {
  for (const char* name : {"app", "private_data"}) {
    Json::Value document;
    document["a"] = Text(65536 - 8);  // {"a":""} are eight bytes
    EXPECT_EQ(FaultyField(One(name, document)), "");
    document["a"] = Text(65536 - 7);
    EXPECT_EQ(FaultyField(One(name, document)), name);
  }
}

TEST(OwnerSettings, DocumentsHoldAtMost10000Values) {
  for (const char* name : {"app", "private_data"}) {
    Json::Value document;
    Json::Value& list = document["a"] = Json::Value(Json::arrayValue);
    list.resize(10000 - 2);  // the object and the list are values, too
    EXPECT_EQ(FaultyField(One(name, document)), "");
    list.append(0);
    EXPECT_EQ(FaultyField(One(name, document)), name);
  }
}

TEST(OwnerSettings, LinkOfAnOlderProgramThatDoesNotFitTogetherCanStillBeRenamed) {
  Entry link = Link();
  link.set_redirect_type(Entry::REDIRECT_ALWAYS);
  link.set_start_at(9).set_expire_at(5);
  EXPECT_EQ(Apply(R"({"protect_title":"new"})", &link), std::nullopt);
}

TEST(OwnerSettings, EverySettingHasTheNameOfItsKey) {
  std::vector<std::string> names;
  for (const Argument& argument : SettingArguments()) {
    names.emplace_back(argument.name);
    EXPECT_FALSE(argument.needed);
  }
  EXPECT_EQ(names, (std::vector<std::string>{
                       "owner_user", "project_name", "hash", "enabled", "start_at", "expire_at",
                       "expire_times", "use_count", "auto_gc", "enable_match_ip", "protect_type",
                       "protect_title", "protect_password", "protect_users", "protect_groups",
                       "redirect_type", "redirect_uri", "app", "private_data"}));
}

}  // namespace
}  // namespace owner
