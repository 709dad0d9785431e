#include "sharingurl/own_name.h"

#include <arpa/inet.h>
#include <gtest/gtest.h>
#include <net/if.h>
#include <netinet/in.h>

#include <deque>
#include <string>

namespace sharingurl {
namespace {

// A list as the system gives it.
class Interfaces {
 public:
  Interfaces& Add(const std::string& address, unsigned int flags = IFF_UP) {
    sockaddr_storage& storage = addresses_.emplace_back();
    auto& v4 = reinterpret_cast<sockaddr_in&>(storage);
    auto& v6 = reinterpret_cast<sockaddr_in6&>(storage);
    if (inet_pton(AF_INET, address.c_str(), &v4.sin_addr) == 1) {
      v4.sin_family = AF_INET;
    } else if (inet_pton(AF_INET6, address.c_str(), &v6.sin6_addr) == 1) {
      v6.sin6_family = AF_INET6;
    } else {
      storage.ss_family = AF_PACKET;
    }
    return Append(reinterpret_cast<sockaddr*>(&storage), flags);
  }

  Interfaces& AddWithoutAddress() { return Append(nullptr, IFF_UP); }

  std::string First() const {
    return FirstGlobalAddress(entries_.empty() ? nullptr : &entries_.front());
  }

 private:
  Interfaces& Append(sockaddr* address, unsigned int flags) {
    ifaddrs entry{};
    entry.ifa_addr = address;
    entry.ifa_flags = flags;
    entries_.push_back(entry);
    if (entries_.size() > 1) {
      entries_[entries_.size() - 2].ifa_next = &entries_.back();
    }
    return *this;
  }

  std::deque<sockaddr_storage> addresses_;
  std::deque<ifaddrs> entries_;
};

TEST(SharingUrlOwnName, AFullNameHasADotAndIsNotEveryMachines) {
  for (const char* name : {"nas.example.org", "nas.local", "localhosts.example", "a.localhosts",
                           "localhost6s.example", "localdomain.example"}) {
    EXPECT_TRUE(IsFullName(name)) << name;
  }
  for (const char* name :
       {"", "nas", "localhost", "localhost.example.org", "localhost6.example.org",
        "localhost4.localdomain4", "nas.localdomain6", "nas.localdomain4", "localhost.localdomain",
        "nas.localdomain", "nas.localhost", "nas.", ".nas", "192.0.2.7", "::1", "nas.exa mple",
        "nas.example\n", "(none)", "a.b<c"}) {
    EXPECT_FALSE(IsFullName(name)) << name;
  }
}

TEST(SharingUrlOwnName, EveryMachinesNamesAreThatInAnyCase) {
  for (const char* name : {"LOCALHOST.example.org", "nas.LocalDomain", "nas.LOCALHOST", "NAS.local",
                           "Localhost6.localdomain6", "nas.LOCALDOMAIN6"}) {
    EXPECT_EQ(IsFullName(name), std::string(name) == "NAS.local") << name;
  }
}

TEST(SharingUrlOwnName, WithoutInterfacesThereIsNoAddress) {
  EXPECT_EQ(Interfaces().First(), "");
}

TEST(SharingUrlOwnName, TheFirstGlobalAddressCounts) {
  EXPECT_EQ(Interfaces().Add("192.0.2.7").Add("192.0.2.8").First(), "192.0.2.7");
  EXPECT_EQ(Interfaces().Add("2001:db8::9").Add("2001:db8::8").First(), "[2001:db8::9]");
}

TEST(SharingUrlOwnName, Ipv4GoesBeforeIpv6) {
  EXPECT_EQ(Interfaces().Add("2001:db8::9").Add("10.0.0.7").First(), "10.0.0.7");
}

TEST(SharingUrlOwnName, AddressesOfAHomesNetworkCount) {
  for (const char* address : {"10.0.0.7", "172.16.0.1", "192.168.1.2", "100.64.0.1"}) {
    EXPECT_EQ(Interfaces().Add(address).First(), address);
  }
  EXPECT_EQ(Interfaces().Add("fd00::1").First(), "[fd00::1]");
}

TEST(SharingUrlOwnName, AddressesThatOthersCannotReachDoNotCount) {
  for (const char* address :
       {"0.0.0.0", "0.1.2.3", "127.0.0.1", "127.255.0.1", "169.254.1.1", "224.0.0.1", "239.1.1.1",
        "240.0.0.1", "254.1.1.1", "255.255.255.255", "::", "::1", "fe80::1", "febf::1", "ff02::1",
        "::ffff:192.0.2.7", "::ffff:0.0.0.0"}) {
    EXPECT_EQ(Interfaces().Add(address).First(), "") << address;
    EXPECT_EQ(Interfaces().Add(address).Add("192.0.2.7").First(), "192.0.2.7") << address;
  }
  EXPECT_EQ(Interfaces().Add("169.253.1.1").First(), "169.253.1.1");
}

TEST(SharingUrlOwnName, InterfacesThatAreDownOrLoopbackDoNotCount) {
  EXPECT_EQ(Interfaces().Add("192.0.2.7", 0).First(), "");
  EXPECT_EQ(Interfaces().Add("192.0.2.7", IFF_UP | IFF_LOOPBACK).First(), "");
  EXPECT_EQ(Interfaces().Add("192.0.2.7", IFF_LOOPBACK).Add("2001:db8::9").First(),
            "[2001:db8::9]");
}

TEST(SharingUrlOwnName, EntriesWithoutAddressAndOfOtherKindsArePassedOver) {
  EXPECT_EQ(Interfaces().AddWithoutAddress().Add("(packet)").Add("192.0.2.7").First(), "192.0.2.7");
}

// Whatever this machine is called: the answer can stand in an address.
TEST(SharingUrlOwnName, ThisMachinesOwnCanStandInAnAddress) {
  const std::string name = OwnName();
  EXPECT_EQ(name.find_first_of(" /?#@\n<>\"'"), std::string::npos) << name;
}

}  // namespace
}  // namespace sharingurl
