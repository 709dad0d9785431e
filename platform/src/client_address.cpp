#include "client_address.h"

#include <arpa/inet.h>
#include <netinet/in.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <iterator>
#include <variant>

namespace tuvo_platform {

namespace {

using Address = std::variant<in_addr, in6_addr>;

constexpr size_t kNetworkBytes = 8;  // of an IPv6 address: /64

std::string ToText(int family, const void* address) {
  std::array<char, INET6_ADDRSTRLEN> text{};
  inet_ntop(family, address, text.data(), text.size());
  return text.data();
}

// Only a link-local address has a zone; the interface's name says nothing about the client.
std::optional<std::string> WithoutZone(const std::string& text, bool* had_zone) {
  const size_t percent = text.find('%');
  *had_zone = percent != std::string::npos;
  if (*had_zone && percent + 1 == text.size()) {
    return std::nullopt;
  }
  return text.substr(0, percent);
}

std::optional<Address> ParseIpv6(const std::string& text) {
  bool had_zone = false;
  const std::optional<std::string> plain = WithoutZone(text, &had_zone);
  in6_addr address{};
  if (!plain || inet_pton(AF_INET6, plain->c_str(), &address) != 1 ||
      (had_zone && !IN6_IS_ADDR_LINKLOCAL(&address))) {
    return std::nullopt;
  }
  if (IN6_IS_ADDR_V4MAPPED(&address)) {
    in_addr mapped{};
    std::memcpy(&mapped, &address.s6_addr[12], sizeof mapped);
    return mapped;
  }
  return address;
}

std::optional<Address> Parse(const char* text) {
  if (text == nullptr) {
    return std::nullopt;
  }
  in_addr address{};
  if (inet_pton(AF_INET, text, &address) == 1) {
    return address;
  }
  return ParseIpv6(text);
}

}  // namespace

std::optional<std::string> CanonicalAddress(const char* text) {
  const std::optional<Address> address = Parse(text);
  if (!address) {
    return std::nullopt;
  }
  if (const auto* ipv4 = std::get_if<in_addr>(&*address)) {
    return ToText(AF_INET, ipv4);
  }
  return ToText(AF_INET6, &std::get<in6_addr>(*address));
}

std::optional<std::string> VisitorNetwork(const char* text) {
  std::optional<Address> address = Parse(text);
  if (!address) {
    return std::nullopt;
  }
  if (const auto* ipv4 = std::get_if<in_addr>(&*address)) {
    return ToText(AF_INET, ipv4);
  }
  auto& ipv6 = std::get<in6_addr>(*address);
  std::fill(std::begin(ipv6.s6_addr) + kNetworkBytes, std::end(ipv6.s6_addr), uint8_t{0});
  return ToText(AF_INET6, &ipv6) + "/64";
}

}  // namespace tuvo_platform
