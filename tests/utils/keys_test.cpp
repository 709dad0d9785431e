// The exported names, their types and their texts: other programs and existing files depend on all
// three.
#include <gtest/gtest.h>
#include <tuvosharing/keys.h>

#include <cstdint>
#include <cstring>
#include <iterator>
#include <map>
#include <string>
#include <type_traits>

namespace {

using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)

struct Key {
  const char* name;
  const char* const* variable;
  const char* text;
};

// Takes nothing but a variable of exactly this type.
constexpr const char* const* Variable(const char*& variable) {
  return &variable;
}

#define KEY(name, text) \
  { #name, Variable(TUVO::sharing::name), text }

constexpr Key kKeys[] = {
    KEY(SZK_UID_, "uid"),
    KEY(SZK_SESSION_ID_, "session_id"),
    KEY(SZK_TIMEOUT, "timeout"),
    KEY(SZK_IP_, "ip"),
    KEY(SZK_ENTRY_ID, "entry_id"),
    KEY(SZK_DATA, "data"),
    KEY(SZK_PRIVATE_DATA, "private_data"),
    KEY(SZK_APP, "app"),
    KEY(SZK_PLUGINS, "plugins"),
    KEY(SZK_REDIRECT_URI, "redirect_uri"),
    KEY(SZK_REDIRECT_TYPE, "redirect_type"),
    KEY(SZK_PROTECT_GROUPS, "protect_groups"),
    KEY(SZK_PROTECT_EXTRA_GROUPS, "protect_extra_groups"),
    KEY(SZK_PROTECT_GIDS, "protect_gids"),
    KEY(SZK_PROTECT_USERS, "protect_users"),
    KEY(SZK_PROTECT_EXTRA_USERS, "protect_extra_users"),
    KEY(SZK_PROTECT_UIDS, "protect_uids"),
    KEY(SZK_PROTECT_PASSWORD_SALT, "protect_password_salt"),
    KEY(SZK_PROTECT_PASSWORD_ALGO_MD5, "md5"),
    KEY(SZK_PROTECT_PASSWORD_ALGO_DEFAULT, "default"),
    KEY(SZK_PROTECT_PASSWORD_ALGO, "protect_password_algo"),
    KEY(SZK_PROTECT_PASSWORD, "protect_password"),
    KEY(SZK_PROTECT_TITLE, "protect_title"),
    KEY(SZK_PROTECT_TYPE, "protect_type"),
    KEY(SZK_ENABLE_MATCH_IP, "enable_match_ip"),
    KEY(SZK_USE_COUNT, "use_count"),
    KEY(SZK_EXPIRE_TIMES, "expire_times"),
    KEY(SZK_EXPIRE_AT, "expire_at"),
    KEY(SZK_START_AT, "start_at"),
    KEY(SZK_OWNER_USER, "owner_user"),
    KEY(SZK_OWNER_UID, "owner_uid"),
    KEY(SZK_AUTO_GC, "auto_gc"),
    KEY(SZK_ENABLED_, "enabled"),
    KEY(SZK_PROJECT_NAME, "project_name"),
    KEY(SZK_ZOR_PASSWORD, "zor_password"),
    KEY(SZK_ZOR_USERNAME, "zor_username"),
    KEY(SZK_PASSWORD_, "password"),
    KEY(SZK_SHARING_SID, "sharing_sid"),
    KEY(SZK_SHARING_ID, "sharing_id"),
    KEY(SZK_HASH, "hash"),
    KEY(SZK_ID_, "id"),
    KEY(SZK_REDIRECT_REDIRECT_ALWAYS, "always"),
    KEY(SZK_REDIRECT_REDIRECT_URLPARAM, "url_param"),
    KEY(SZK_REDIRECT_REDIRECT_NONE, "none"),
    KEY(SZK_PROTECT_PROTECT_USER, "user"),
    KEY(SZK_PROTECT_PROTECT_PASSWORD, "password"),
    KEY(SZK_PROTECT_PROTECT_NONE, "none"),
    KEY(SZK_JSCONFIG, "jsconfig"),
    KEY(SZK_ASSISTANT, "assistant"),
    KEY(SZK_EXTERNAL_IP_, "external_ip"),
    KEY(SZK_ACTION, "action"),
    KEY(SZF_SHARING_DB_PATH, "/usr/tuvo/etc/private/session/sharing.db"),
    {"SZ_X_SHARING_HEADER", Variable(::SZ_X_SHARING_HEADER), "HTTP_X_TUVO_SHARING"},
};

#undef KEY

TEST(Keys, EveryConstantHasItsText) {
  for (const Key& key : kKeys) {
    EXPECT_STREQ(*key.variable, key.text) << key.name;
  }
}

TEST(Keys, TextsAreVariablesOfTypePointerToConstantText) {
  static_assert(std::is_same_v<decltype(TUVO::sharing::SZK_HASH), const char*>);
  static_assert(std::is_same_v<decltype(TUVO::sharing::SZF_SHARING_DB_PATH), const char*>);
  static_assert(std::is_same_v<decltype(::SZ_X_SHARING_HEADER), const char*>);
  for (const Key& key : kKeys) {
    EXPECT_NE(*key.variable, nullptr) << key.name;
  }
}

TEST(Keys, LimitsHaveTheirValuesAndAreConstant32BitIntegers) {
  static_assert(std::is_same_v<decltype(SHARING_HASH_LENGTH), const std::int32_t>);
  static_assert(std::is_same_v<decltype(SHARING_SESSION_LENGTH), const std::int32_t>);
  static_assert(std::is_same_v<decltype(SHARING_MAX_RETRY_TIMES), const std::int32_t>);
  static_assert(std::is_same_v<decltype(SHARING_PASS_HASH_LENGTH), const std::int32_t>);
  EXPECT_EQ(SHARING_HASH_LENGTH, 9);
  EXPECT_EQ(SHARING_SESSION_LENGTH, 32);
  EXPECT_EQ(SHARING_MAX_RETRY_TIMES, 50);
  EXPECT_EQ(SHARING_PASS_HASH_LENGTH, 6);
}

TEST(Keys, ExactlyTwoTextsAreSharedByTwoConstantsEach) {
  std::map<std::string, int> uses;
  for (const Key& key : kKeys) {
    ++uses[*key.variable];
  }
  std::map<std::string, int> shared;
  for (const auto& [text, count] : uses) {
    if (count > 1) {
      shared[text] = count;
    }
  }
  EXPECT_EQ(shared, (std::map<std::string, int>{{"none", 2}, {"password", 2}}));
}

TEST(Keys, SharedTextsCompareEqual) {
  EXPECT_EQ(std::strcmp(SZK_PASSWORD_, SZK_PROTECT_PROTECT_PASSWORD), 0);
  EXPECT_EQ(std::strcmp(SZK_PROTECT_PROTECT_NONE, SZK_REDIRECT_REDIRECT_NONE), 0);
}

// What the constants hold when this is made.
struct Copies {
  Copies()
      : limits{SHARING_HASH_LENGTH, SHARING_SESSION_LENGTH, SHARING_MAX_RETRY_TIMES,
               SHARING_PASS_HASH_LENGTH} {
    for (std::size_t i = 0; i < std::size(kKeys); ++i) {
      texts[i] = *kKeys[i].variable;
    }
  }

  const char* texts[std::size(kKeys)];
  std::int32_t limits[4];
};

// Before every other object of the program, those of the library included.
__attribute__((init_priority(101))) const Copies kFirst;

TEST(Keys, AreReadyBeforeAnyCodeOfTheProgramRuns) {
  for (std::size_t i = 0; i < std::size(kKeys); ++i) {
    EXPECT_STREQ(kFirst.texts[i], kKeys[i].text) << kKeys[i].name;
  }
  EXPECT_EQ(kFirst.limits[0], 9);
  EXPECT_EQ(kFirst.limits[1], 32);
  EXPECT_EQ(kFirst.limits[2], 50);
  EXPECT_EQ(kFirst.limits[3], 6);
}

}  // namespace
