#include "client_address.h"

#include <gtest/gtest.h>

#include <string>

namespace tuvo_platform {
namespace {

std::string Canonical(const char* text) {
  return CanonicalAddress(text).value_or("none");
}
std::string Network(const char* text) {
  return VisitorNetwork(text).value_or("none");
}

TEST(ClientAddress, Ipv4StaysAsItIs) {
  EXPECT_EQ(Canonical("192.0.2.1"), "192.0.2.1");
  EXPECT_EQ(Canonical("255.255.255.255"), "255.255.255.255");
}

TEST(ClientAddress, Ipv6HasOneSpelling) {
  for (const char* text : {"2001:db8::1", "2001:DB8::1", "2001:0db8:0000:0000:0000:0000:0000:0001",
                           "2001:db8:0:0::1"}) {
    EXPECT_EQ(Canonical(text), "2001:db8::1") << text;
  }
}

TEST(ClientAddress, MappedIpv4IsIpv4) {
  EXPECT_EQ(Canonical("::ffff:192.0.2.1"), "192.0.2.1");
  EXPECT_EQ(Canonical("::FFFF:c000:0201"), "192.0.2.1");
  EXPECT_EQ(Canonical("0:0:0:0:0:ffff:192.0.2.1"), "192.0.2.1");
}

TEST(ClientAddress, ZoneOfALinkLocalAddressIsDropped) {
  EXPECT_EQ(Canonical("fe80::1%eth0"), "fe80::1");
  EXPECT_EQ(Canonical("fe80::1%2"), "fe80::1");
  EXPECT_EQ(Canonical("fe80::1"), "fe80::1");
}

TEST(ClientAddress, ZoneOfAnyOtherAddressIsRefused) {
  EXPECT_EQ(Canonical("2001:db8::1%eth0"), "none");
  EXPECT_EQ(Canonical("::ffff:192.0.2.1%eth0"), "none");
  EXPECT_EQ(Canonical("192.0.2.1%eth0"), "none");
  EXPECT_EQ(Canonical("fe80::1%"), "none");
}

TEST(ClientAddress, OtherTextsAreNoAddresses) {
  EXPECT_EQ(Canonical(nullptr), "none");
  for (const char* text :
       {"", " ", "192.0.2.1 ", " 192.0.2.1", "192.0.2", "192.0.2.256", "1", "0x7f.1", "192.0.2.01",
        "192.0.2.1:80", "[2001:db8::1]", "2001:db8::1::2", "2001:db8::12345", "localhost",
        "192.0.2.1, 198.51.100.1", "192.0.2.1\n"}) {
    EXPECT_EQ(Canonical(text), "none") << text;
  }
  EXPECT_EQ(Canonical(std::string(100000, '1').c_str()), "none");
}

TEST(ClientAddress, LongestAddressFitsTheUsualBuffer) {
  EXPECT_EQ(Canonical("2001:db81:2222:3333:4444:5555:6666:7777").size(), 39u);
}

TEST(ClientAddress, VisitorOfIpv4IsTheAddress) {
  EXPECT_EQ(Network("192.0.2.1"), "192.0.2.1");
  EXPECT_EQ(Network("::ffff:192.0.2.1"), "192.0.2.1");
}

TEST(ClientAddress, VisitorOfIpv6IsItsNetwork) {
  EXPECT_EQ(Network("2001:db8:1:2:3:4:5:6"), "2001:db8:1:2::/64");
  EXPECT_EQ(Network("2001:db8:1:2::"), "2001:db8:1:2::/64");
  EXPECT_EQ(Network("2001:db8:1:2:ffff:ffff:ffff:ffff"), "2001:db8:1:2::/64");
  EXPECT_EQ(Network("2001:db8:1:3::"), "2001:db8:1:3::/64");
  EXPECT_EQ(Network("::1"), "::/64");
  EXPECT_EQ(Network("fe80::1%eth0"), "fe80::/64");
}

TEST(ClientAddress, OtherTextsAreNoVisitors) {
  EXPECT_EQ(Network(nullptr), "none");
  EXPECT_EQ(Network("nobody"), "none");
}

}  // namespace
}  // namespace tuvo_platform
