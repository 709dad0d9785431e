#include "common/redirect_target.h"

#include <gtest/gtest.h>

namespace common {
namespace {

TEST(CommonRedirectTarget, WebAddressesPass) {
  for (const char* uri : {"http://example.org", "https://example.org/a?b=c#d",
                          "HTTPS://user@example.org:8443/", "https://[2001:db8::1]/"}) {
    EXPECT_EQ(RedirectTarget(uri), uri);
    EXPECT_TRUE(NamesHost(uri));
  }
}

TEST(CommonRedirectTarget, PathsPass) {
  for (const char* uri : {"/", "/a/b?c#d", "a/b", "../a", "./a:b", "?x=1", "#top", "/a:b"}) {
    EXPECT_EQ(RedirectTarget(uri), uri);
    EXPECT_FALSE(NamesHost(uri));
  }
}

TEST(CommonRedirectTarget, OtherSchemesDoNot) {
  for (const char* uri :
       {"javascript:alert(1)", "data:text/html,x", "file:///etc/passwd", "ftp://example.org/",
        "JaVaScRiPt:x", "a:b", ":x", " javascript:x", "http:example.org", "https:/example.org"}) {
    EXPECT_EQ(RedirectTarget(uri), std::nullopt) << uri;
  }
}

TEST(CommonRedirectTarget, HostsInDisguiseDoNot) {
  for (const char* uri : {"//evil.example", "///evil.example", "/\\evil.example",
                          "\\\\evil.example", "\\/evil.example", "http://", "https:///evil.example",
                          "http://:80/", "http://user@/", "http:\\\\evil.example"}) {
    EXPECT_EQ(RedirectTarget(uri), std::nullopt) << uri;
  }
}

TEST(CommonRedirectTarget, ControlCharactersDoNot) {
  for (const char* uri : {"/a\r\nX: y", "/a\nb", "/a\tb", "\x01/a", "/a\x7f"}) {
    EXPECT_EQ(RedirectTarget(uri), std::nullopt) << uri;
  }
  EXPECT_EQ(RedirectTarget(std::string_view("/a\0b", 4)), std::nullopt);
  EXPECT_EQ(RedirectTarget(""), std::nullopt);
}

TEST(CommonRedirectTarget, WhatCannotStandInAnAddressIsEncodedOnce) {
  EXPECT_EQ(RedirectTarget("/ü \"<>^`{|}"), "/%C3%BC%20%22%3C%3E%5E%60%7B%7C%7D");
  EXPECT_EQ(RedirectTarget("/%C3%BC"), "/%C3%BC");
}

}  // namespace
}  // namespace common
