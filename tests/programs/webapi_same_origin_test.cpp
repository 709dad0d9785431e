#include "webapi/same_origin.h"

#include <gtest/gtest.h>

namespace webapi {
namespace {

bool Origin(const std::string& origin, const std::string& host, bool https = false) {
  return IsSameOrigin({std::nullopt, origin, host, https});
}

bool FetchSite(const std::string& value) {
  return IsSameOrigin({value, std::nullopt, "nas", false});
}

TEST(WebapiSameOrigin, ProgramsThatAreNoBrowsersPass) {
  EXPECT_TRUE(IsSameOrigin({std::nullopt, std::nullopt, "nas", false}));
  EXPECT_TRUE(IsSameOrigin({std::nullopt, std::nullopt, "", true}));
}

TEST(WebapiSameOrigin, FetchSiteIsOneOfTwo) {
  EXPECT_TRUE(FetchSite("same-origin"));
  EXPECT_TRUE(FetchSite("none"));
  for (const char* value : {"cross-site", "same-site", "", "SAME-ORIGIN", " none", "none, none"}) {
    EXPECT_FALSE(FetchSite(value)) << value;
  }
}

TEST(WebapiSameOrigin, OriginIsSchemeHostAndPort) {
  EXPECT_TRUE(Origin("http://nas", "nas"));
  EXPECT_TRUE(Origin("https://nas", "nas", true));
  EXPECT_FALSE(Origin("https://nas", "nas"));
  EXPECT_FALSE(Origin("http://nas", "nas", true));
  EXPECT_FALSE(Origin("http://nas", "nas:8080"));
  EXPECT_FALSE(Origin("http://nas:8080", "nas"));
  EXPECT_TRUE(Origin("http://nas:8080", "nas:8080"));
  EXPECT_FALSE(Origin("http://nas", "other"));
  EXPECT_FALSE(Origin("http://nas.evil.example", "nas"));
  EXPECT_FALSE(Origin("http://nas", "nas.evil.example"));
}

TEST(WebapiSameOrigin, SchemesHaveTheirPorts) {
  EXPECT_TRUE(Origin("http://nas:80", "nas"));
  EXPECT_TRUE(Origin("http://nas", "nas:80"));
  EXPECT_TRUE(Origin("https://nas:443", "nas", true));
  EXPECT_FALSE(Origin("http://nas:443", "nas"));
  EXPECT_FALSE(Origin("https://nas:80", "nas", true));
}

TEST(WebapiSameOrigin, CaseDoesNotCount) {
  EXPECT_TRUE(Origin("HTTP://NAS.Example", "nas.eXAMPLE"));
  EXPECT_TRUE(Origin("https://[2001:DB8::A]", "[2001:db8::a]", true));
}

TEST(WebapiSameOrigin, AddressesOfBothKinds) {
  EXPECT_TRUE(Origin("http://192.0.2.1:81", "192.0.2.1:81"));
  EXPECT_TRUE(Origin("http://[::1]", "[::1]"));
  EXPECT_TRUE(Origin("http://[::1]:81", "[::1]:81"));
  EXPECT_FALSE(Origin("http://[::1]:81", "[::1]"));
  EXPECT_FALSE(Origin("http://[::1]", "[::2]"));
}

TEST(WebapiSameOrigin, WhatIsNoOriginIsNotTheSame) {
  for (const char* origin : {"",
                             "null",
                             "nas",
                             "//nas",
                             "http:nas",
                             "http:/nas",
                             "http://",
                             "http://:80",
                             "http://nas:",
                             "http://nas:80x",
                             "http://nas:999999",
                             "http://nas/",
                             "http://nas/x",
                             "http://user@nas",
                             "http://nas http://nas",
                             "http://nas, http://nas",
                             "http://nas,http://nas",
                             "http://nas\n",
                             " http://nas",
                             "http://nas#x",
                             "http://nas?x",
                             "http://::1",
                             "http://[]",
                             "http://[nas]",
                             "http://[::1]x",
                             "http://[::1",
                             "http://nas]",
                             "ftp://nas",
                             "file://nas",
                             "chrome-extension://nas"}) {
    EXPECT_FALSE(Origin(origin, "nas")) << origin;
  }
}

TEST(WebapiSameOrigin, HostThatIsNoneIsNobodys) {
  for (const char* host : {"", ":80", "nas, nas", "nas nas", "nas/", "nas:", "a@nas", "\n"}) {
    EXPECT_FALSE(Origin(std::string("http://") + host, host)) << host;
    EXPECT_FALSE(Origin("http://nas", host)) << host;
  }
}

TEST(WebapiSameOrigin, BothHeadersCount) {
  EXPECT_TRUE(IsSameOrigin({"same-origin", "http://nas", "nas", false}));
  EXPECT_FALSE(IsSameOrigin({"cross-site", "http://nas", "nas", false}));
  EXPECT_FALSE(IsSameOrigin({"same-origin", "http://evil.example", "nas", false}));
}

}  // namespace
}  // namespace webapi
