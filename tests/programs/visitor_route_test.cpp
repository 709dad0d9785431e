#include "visitor/route.h"

#include <gtest/gtest.h>

#include <string>

namespace visitor {
namespace {

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
