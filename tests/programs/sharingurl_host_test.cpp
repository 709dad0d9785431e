#include "sharingurl/host.h"

#include <gtest/gtest.h>

#include <string>

namespace sharingurl {
namespace {

// What HostInAddress makes of it; "-" for nothing.
std::string Host(const std::string& text) {
  return HostInAddress(text).value_or("-");
}

TEST(SharingUrlHost, NamesStandAsTheyAre) {
  for (const char* name : {"nas", "nas.example.org", "NAS-1.Example.ORG", "my_nas.local", "1a.b",
                           "1.2.3.4.example", "xn--mller-kva.example", "a", "0xg", "e1"}) {
    EXPECT_TRUE(IsHostName(name)) << name;
    EXPECT_EQ(Host(name), name);
  }
}

TEST(SharingUrlHost, NamesOfAnotherFormAreNone) {
  for (const char* name : {"",           ".",        "nas.",         ".nas",        "nas..example",
                           "-nas",       "nas-",     "nas.-example", "na s",        "nas/x",
                           "nas?x",      "nas#x",    "nas\\x",       "user@nas",    "nas%41",
                           "n\xc3\xa4s", "nas\n",    "\tnas",        "<nas>",       "nas\"",
                           "nas'",       "nas&amp;", "*.example",    "nas,example", "(none)",
                           "nas:"}) {
    EXPECT_FALSE(IsHostName(name)) << name;
    EXPECT_EQ(Host(name), "-") << name;
  }
}

TEST(SharingUrlHost, NoByteButThoseOfNamesIsTaken) {
  const std::string good = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_.";
  for (int c = 0; c < 256; ++c) {
    const std::string name = std::string("n") + static_cast<char>(c) + "s";
    EXPECT_EQ(IsHostName(name), good.find(static_cast<char>(c)) != std::string::npos) << c;
    EXPECT_EQ(HostInAddress(name).has_value(), IsHostName(name)) << c;
  }
}

TEST(SharingUrlHost, LengthsAreThoseOfTheNameSystem) {
  const std::string label(63, 'a');
  EXPECT_TRUE(IsHostName(label + ".example"));
  EXPECT_FALSE(IsHostName("a" + label + ".example"));
  const std::string longest = label + "." + label + "." + label + "." + std::string(61, 'b');
  ASSERT_EQ(longest.size(), 253U);
  EXPECT_TRUE(IsHostName(longest));
  EXPECT_FALSE(IsHostName(longest + "b"));
}

TEST(SharingUrlHost, FourNumbersAreAnIpv4Address) {
  for (const char* address : {"192.0.2.7", "1.0.0.0", "223.255.255.255", "127.0.0.1", "10.0.0.7"}) {
    EXPECT_FALSE(IsHostName(address));
    EXPECT_EQ(Host(address), address);
  }
}

TEST(SharingUrlHost, Ipv4AddressesThatNobodyElseCanOpenAreNothing) {
  for (const char* address : {"0.0.0.0", "0.255.255.255", "169.254.0.0", "169.254.255.255",
                              "224.0.0.0", "239.255.255.255", "240.0.0.1", "255.255.255.255"}) {
    EXPECT_EQ(Host(address), "-") << address;
    EXPECT_EQ(Host(std::string("::ffff:") + address), "-") << address;
  }
  EXPECT_EQ(Host("169.253.255.255"), "169.253.255.255");
  EXPECT_EQ(Host("169.255.0.0"), "169.255.0.0");
}

TEST(SharingUrlHost, Ipv6AddressesThatNobodyElseCanOpenAreNothing) {
  for (const char* address :
       {"::", "fe80::", "fe80::1", "febf::1", "ff00::", "ff02::1", "ffff::1"}) {
    EXPECT_EQ(Host(address), "-") << address;
    EXPECT_EQ(Host(std::string("[") + address + "]"), "-") << address;
  }
  for (const char* address : {"fe7f::1", "fec0::1", "feff::1", "fd00::1"}) {
    EXPECT_EQ(Host(address), std::string("[") + address + "]");
  }
}

// Browsers go to 127.0.0.1 for all of "127.1", "0x7f.1" and "2130706433".
TEST(SharingUrlHost, WhatOnlyBrowsersTakeForAnIpv4AddressIsNothing) {
  for (const char* text :
       {"127.1", "2130706433", "0x7f.1", "0x7F000001", "0X7f.1", "nas.0X7F", "0x", "1", "nas.1",
        "nas.0x7f", "256.1.1.1", "1.2.3", "1.2.3.4.5", "01.2.3.4", "1.2.3.4.", "1.2.3.0x4"}) {
    EXPECT_EQ(Host(text), "-") << text;
  }
}

TEST(SharingUrlHost, Ipv6AddressesStandShortestAndInBrackets) {
  EXPECT_EQ(Host("2001:db8::9"), "[2001:db8::9]");
  EXPECT_EQ(Host("[2001:db8::9]"), "[2001:db8::9]");
  EXPECT_EQ(Host("2001:0DB8:0:0:0:0:0:0009"), "[2001:db8::9]");
  EXPECT_EQ(Host("::1"), "[::1]");
  EXPECT_EQ(Host("::ffff:192.0.2.7"), "[::ffff:192.0.2.7]");
}

TEST(SharingUrlHost, WhatLooksLikeIpv6IsNothing) {
  for (const char* text :
       {"[", "[]", "[::1", "::1]", "[[::1]]", "[::1]x", "x[::1]", ":::", "1::2::3", "fe80::1%eth0",
        "[fe80::1%25eth0]", "[192.0.2.7]", "[nas]", "2001:db8::g", ":", "1:2:3:4:5:6:7:8:9"}) {
    EXPECT_EQ(Host(text), "-") << text;
  }
}

TEST(SharingUrlHost, NothingMayHideBehindANulByte) {
  EXPECT_EQ(Host(std::string("192.0.2.7\0", 10)), "-");
  EXPECT_EQ(Host(std::string("192.0.2.7\0.evil", 15)), "-");
  EXPECT_EQ(Host(std::string("::1\0<script>", 12)), "-");
  EXPECT_EQ(Host(std::string("[::1\0]", 6)), "-");
}

}  // namespace
}  // namespace sharingurl
