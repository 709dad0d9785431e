#include "cli/setting_options.h"

#include <gtest/gtest.h>
#include <tuvosharing/entry.h>

#include <filesystem>
#include <fstream>
#include <set>
#include <string>

#include "cli/failure.h"

namespace cli {
namespace {

using TUVO::sharing::record::Entry;

constexpr std::time_t kNow = 1800000000;

SettingOptions Texts(const std::vector<std::pair<std::string, std::string>>& texts) {
  SettingOptions options;
  for (const auto& [argument, text] : texts) {
    options.texts[argument] = text;
  }
  return options;
}

TEST(CliSettingOptions, EverySettingHasAnOption) {
  std::set<std::string> covered = {"protect_password"};
  for (const ValueOption& option : ValueOptions()) {
    covered.insert(option.argument);
  }
  for (const ValueOption& option : ListOptions()) {
    covered.insert(option.argument);
  }
  for (const FlagOption& option : FlagOptions()) {
    covered.insert(option.argument);
  }
  std::set<std::string> settings;
  for (const owner::Argument& argument : owner::SettingArguments()) {
    settings.insert(argument.name);
  }
  EXPECT_EQ(covered, settings);
}

TEST(CliSettingOptions, ProblemsNameTheOption) {
  EXPECT_EQ(OptionOf("expire_times"), "--uses");
  EXPECT_EQ(OptionOf("protect_users"), "--users");
  EXPECT_EQ(OptionOf("enabled"), "--enabled");
  EXPECT_EQ(OptionOf("protect_password"), "--password");
  EXPECT_EQ(OptionOf("path"), "--path");
  EXPECT_EQ(OptionOf("something"), "something");
}

TEST(CliSettingOptions, TextsBecomeSettings) {
  const GivenSettings given = ReadGivenSettings(
      Texts({{"expire_times", "5"}, {"expire_at", "+1d"}, {"app", "{\"a\":1}"}}), "", kNow);
  EXPECT_EQ(given.settings.expire_times, 5);
  EXPECT_EQ(given.settings.expire_at, kNow + 86400);
  EXPECT_EQ((*given.settings.app)["a"], 1);
  EXPECT_FALSE(given.settings.project_name);
}

TEST(CliSettingOptions, MissingArgumentIsAFailure) {
  EXPECT_THROW(ReadGivenSettings({}, "project_name", kNow), Failure);
  EXPECT_NO_THROW(ReadGivenSettings({}, "", kNow));
}

TEST(CliSettingOptions, BadValuesAreFailures) {
  EXPECT_THROW(ReadGivenSettings(Texts({{"expire_times", "x"}}), "", kNow), Failure);
  EXPECT_THROW(ReadGivenSettings(Texts({{"expire_times", "-1"}}), "", kNow), Failure);
  EXPECT_THROW(ReadGivenSettings(Texts({{"app", "[]"}}), "", kNow), Failure);
  EXPECT_THROW(ReadGivenSettings(Texts({{"project_name", "a\xff"}}), "", kNow), Failure);
}

TEST(CliSettingOptions, FilesAreReadAsJson) {
  std::ofstream("/tmp/app.json") << "{\"a\": [1]}\n";
  SettingOptions options;
  options.app_file = "/tmp/app.json";
  EXPECT_EQ((*ReadGivenSettings(options, "", kNow).settings.app)["a"][0], 1);
  options.app_file = "/tmp/none.json";
  EXPECT_THROW(ReadGivenSettings(options, "", kNow), Failure);
}

TEST(CliSettingOptions, PathGoesIntoTheDataThatIsThere) {
  SettingOptions options;
  options.path = "/a/b";
  Entry link;
  Json::Value app;
  app["x"] = 1;
  link.set_app(app);
  EXPECT_FALSE(ApplyGivenSettings(ReadGivenSettings(options, "", kNow), &link));
  EXPECT_EQ(link.get_app()["x"], 1);
  EXPECT_EQ(link.get_app()["path"], "/a/b");
}

TEST(CliSettingOptions, PathGoesIntoTheDataThatIsGivenAlong) {
  SettingOptions options = Texts({{"app", "{\"y\":2}"}});
  options.path = "b";
  std::filesystem::current_path("/tmp");
  Entry link;
  Json::Value app;
  app["x"] = 1;
  link.set_app(app);
  EXPECT_FALSE(ApplyGivenSettings(ReadGivenSettings(options, "", kNow), &link));
  EXPECT_FALSE(link.get_app().isMember("x"));
  EXPECT_EQ(link.get_app()["y"], 2);
  EXPECT_EQ(link.get_app()["path"], "/tmp/b");
}

TEST(CliSettingOptions, PathProblemsNameThePath) {
  SettingOptions options = Texts({{"project_name", "file"}});
  options.path = "/etc/passwd";
  Entry link;
  link.set_owner_uid(2001);
  const GivenSettings given = ReadGivenSettings(options, "", kNow);
  EXPECT_FALSE(ApplyGivenSettings(given, &link));
  owner::FileLook look;
  const owner::MaybeProblem problem = LookAtGivenFile(given, {"/tmp"}, link, &look);
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, owner::Error::kFileNotAllowed);
  EXPECT_EQ(problem->field, "path");
}

TEST(CliSettingOptions, WhatDecidesWhichFileItIsTouchesTheFile) {
  SettingOptions options;
  EXPECT_FALSE(TouchesFile(ReadGivenSettings(Texts({{"protect_title", "x"}}), "", kNow)));
  for (const auto& [argument, text] :
       {std::pair("app", "{}"), {"project_name", "file"}, {"owner_user", "alice"}}) {
    EXPECT_TRUE(TouchesFile(ReadGivenSettings(Texts({{argument, text}}), "", kNow))) << argument;
  }
  options.path = "/a";
  EXPECT_TRUE(TouchesFile(ReadGivenSettings(options, "", kNow)));
}

TEST(CliSettingOptions, PasswordCanBeForgotten) {
  SettingOptions options;
  options.no_password = true;
  const GivenSettings given = ReadGivenSettings(options, "", kNow);
  Entry link;
  link.set_protect_password("secret", true, Entry::ENCRYPT_ALGO_DEFAULT);
  link.set_protect_type(Entry::PROTECT_PASSWORD);
  EXPECT_FALSE(ApplyGivenSettings(given, &link));
  EXPECT_EQ(link.get_protect_type(), Entry::PROTECT_NONE);
  EXPECT_EQ(link.get_protect_password(), "");
  link.set_protect_users({"alice"}).set_protect_type(Entry::PROTECT_USER);
  EXPECT_FALSE(ApplyGivenSettings(given, &link));
  EXPECT_EQ(link.get_protect_type(), Entry::PROTECT_USER);
}

TEST(CliSettingOptions, NothingGivenIsEmpty) {
  SettingOptions options;
  EXPECT_TRUE(options.empty());
  options.no_password = true;
  EXPECT_FALSE(options.empty());
  EXPECT_FALSE(Texts({{"hash", "x"}}).empty());
}

}  // namespace
}  // namespace cli
