#include "sharingurl/own_name.h"

#include <arpa/inet.h>
#include <net/if.h>
#include <netdb.h>
#include <netinet/in.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <cstdlib>
#include <iterator>
#include <memory>

#include "sharingurl/host.h"

namespace sharingurl {

namespace {

// First and last labels, in lower case, of names that every machine may give itself.
constexpr std::string_view kOwnBeginnings[] = {"localhost", "localhost4", "localhost6"};
constexpr std::string_view kOwnEnds[] = {"localhost", "localdomain", "localdomain4",
                                         "localdomain6"};

template <size_t Count>
bool IsOneOf(std::string_view text, const std::string_view (&all)[Count]) {
  return std::find(std::begin(all), std::end(all), text) != std::end(all);
}

std::string LowerCase(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) {
    if (c >= 'A' && c <= 'Z') {
      c = static_cast<char>(c - 'A' + 'a');
    }
  }
  return lower;
}

bool IsGlobal(const in_addr& address) {
  return IsUsable(address) && ntohl(address.s_addr) >> 24U != IN_LOOPBACKNET;
}

bool IsGlobal(const in6_addr& address) {
  return IsUsable(address) && !IN6_IS_ADDR_LOOPBACK(&address) && !IN6_IS_ADDR_V4MAPPED(&address);
}

// The interface's address as it goes into an address, if it is of `family` and counts; else empty.
std::string GlobalAddress(const ifaddrs& interface, int family) {
  if (interface.ifa_addr == nullptr || interface.ifa_addr->sa_family != family ||
      (interface.ifa_flags & IFF_UP) == 0 || (interface.ifa_flags & IFF_LOOPBACK) != 0) {
    return "";
  }
  char text[INET6_ADDRSTRLEN] = {};
  if (family == AF_INET) {
    const in_addr& address = reinterpret_cast<const sockaddr_in*>(interface.ifa_addr)->sin_addr;
    return IsGlobal(address) && inet_ntop(family, &address, text, sizeof text) != nullptr ? text
                                                                                          : "";
  }
  const in6_addr& address = reinterpret_cast<const sockaddr_in6*>(interface.ifa_addr)->sin6_addr;
  return IsGlobal(address) && inet_ntop(family, &address, text, sizeof text) != nullptr
             ? "[" + std::string(text) + "]"
             : "";
}

std::string HostName() {
  char name[HOST_NAME_MAX + 1] = {};
  return gethostname(name, sizeof name) == 0 ? name : "";
}

// The name that the resolver knows the host by; empty when it does not.
std::string ResolvedName(const std::string& name) {
  addrinfo hints{};
  hints.ai_flags = AI_CANONNAME;
  hints.ai_socktype = SOCK_STREAM;
  addrinfo* found = nullptr;
  if (name.empty() || getaddrinfo(name.c_str(), nullptr, &hints, &found) != 0) {
    return "";
  }
  const std::unique_ptr<addrinfo, decltype(&freeaddrinfo)> guard(found, &freeaddrinfo);
  // The name that the machine gave itself counts more than the one that it is an alias for.
  if (IsFullName(name)) {
    return name;
  }
  return found->ai_canonname != nullptr ? found->ai_canonname : "";
}

}  // namespace

bool IsFullName(std::string_view name) {
  if (!IsHostName(name) || name.find('.') == std::string_view::npos) {
    return false;
  }
  const std::string lower = LowerCase(name);
  const std::string_view text = lower;
  return !IsOneOf(text.substr(0, text.find('.')), kOwnBeginnings) &&
         !IsOneOf(text.substr(text.rfind('.') + 1), kOwnEnds);
}

std::string FirstGlobalAddress(const ifaddrs* interfaces) {
  for (const int family : {AF_INET, AF_INET6}) {
    for (const ifaddrs* each = interfaces; each != nullptr; each = each->ifa_next) {
      std::string address = GlobalAddress(*each, family);
      if (!address.empty()) {
        return address;
      }
    }
  }
  return "";
}

std::string OwnName() {
  // Somebody waits for the answer, and there is another one when no server has any.
  setenv("RES_OPTIONS", "timeout:1 attempts:1", 1);
  const std::string name = HostName();
  std::string full = ResolvedName(name);
  if (IsFullName(full)) {
    return full;
  }
  ifaddrs* interfaces = nullptr;
  if (getifaddrs(&interfaces) == 0) {
    const std::unique_ptr<ifaddrs, decltype(&freeifaddrs)> guard(interfaces, &freeifaddrs);
    std::string address = FirstGlobalAddress(interfaces);
    if (!address.empty()) {
      return address;
    }
  }
  return HostInAddress(name).value_or("");
}

}  // namespace sharingurl
