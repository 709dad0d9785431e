#include "visitor/route.h"

#include <gtest/gtest.h>

#include <string>

namespace visitor {
namespace {

TEST(VisitorRoute, HashHasThreeToSixtyFourCharacters) {
  EXPECT_FALSE(IsHashText(""));
  EXPECT_FALSE(IsHashText("ab"));
  EXPECT_TRUE(IsHashText("abc"));
  EXPECT_TRUE(IsHashText(std::string(64, 'a')));
  EXPECT_FALSE(IsHashText(std::string(65, 'a')));
}

TEST(VisitorRoute, HashHasUrlFriendlyCharactersOnly) {
  EXPECT_TRUE(IsHashText("azAZ09-_"));
  const std::string friendly = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_";
  for (int c = 0; c < 256; ++c) {
    const std::string text = std::string("abc") + static_cast<char>(c);
    EXPECT_EQ(IsHashText(text), friendly.find(static_cast<char>(c)) != std::string::npos) << c;
  }
}

TEST(VisitorRoute, SessionIdIsCheckedLikewise) {
  EXPECT_TRUE(IsSessionIdText("2eFNmFsTr2NeU4uRWiGL116UWrRyOk-_"));
  EXPECT_FALSE(IsSessionIdText(""));
  EXPECT_FALSE(IsSessionIdText("a'b"));
  EXPECT_FALSE(IsSessionIdText(std::string(65, 'a')));
}

TEST(VisitorRoute, PathOfALink) {
  const Route route = ParseRoute("/AbC-_9");
  EXPECT_EQ(route.place, Place::kLink);
  EXPECT_EQ(route.hash, "AbC-_9");
}

TEST(VisitorRoute, PathOfALogoutPage) {
  const Route route = ParseRoute("/AbC/logout");
  EXPECT_EQ(route.place, Place::kLogout);
  EXPECT_EQ(route.hash, "AbC");
}

TEST(VisitorRoute, LinkMayBeCalledLogout) {
  EXPECT_EQ(ParseRoute("/logout").place, Place::kLink);
  EXPECT_EQ(ParseRoute("/logout/logout").place, Place::kLogout);
}

TEST(VisitorRoute, OtherPathsLeadNowhere) {
  for (const char* path : {"", "/", "abc", "/ab", "/abc/", "//abc", "/abc/logout/", "/abc/Logout",
                           "/abc/def", "/abc/logout/logout", "/../abc", "/a.c", "//logout"}) {
    const Route route = ParseRoute(path);
    EXPECT_EQ(route.place, Place::kNowhere) << path;
    EXPECT_EQ(route.hash, "") << path;
  }
  EXPECT_EQ(ParseRoute(std::string_view("/abc\0def", 8)).place, Place::kNowhere);
}

TEST(VisitorRoute, AddressesAreReadBack) {
  EXPECT_EQ(LinkPath("abc"), "/sharing/abc");
  EXPECT_EQ(LogoutPath("abc"), "/sharing/abc/logout");
}

}  // namespace
}  // namespace visitor
