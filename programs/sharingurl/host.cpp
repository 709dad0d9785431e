#include "sharingurl/host.h"

#include <arpa/inet.h>

#include <algorithm>
#include <cstdint>
#include <cstring>

namespace sharingurl {

namespace {

constexpr size_t kLongestName = 253;
constexpr size_t kLongestLabel = 63;

bool IsDigit(char c) {
  return c >= '0' && c <= '9';
}

bool IsHexDigit(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'f') || (c >= 'A' && c <= 'F');
}

bool IsLabelCharacter(char c) {
  return IsDigit(c) || (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || c == '-' || c == '_';
}

bool IsLabel(std::string_view label) {
  return !label.empty() && label.size() <= kLongestLabel && label.front() != '-' &&
         label.back() != '-' && std::all_of(label.begin(), label.end(), IsLabelCharacter);
}

// As browsers see it: decimal, or hexadecimal behind "0x".
bool IsNumber(std::string_view label) {
  if (label.size() >= 2 && label[0] == '0' && (label[1] == 'x' || label[1] == 'X')) {
    label.remove_prefix(2);
    return std::all_of(label.begin(), label.end(), IsHexDigit);
  }
  return std::all_of(label.begin(), label.end(), IsDigit);
}

bool IsUsableIpv4(std::string_view text) {
  in_addr address{};
  return inet_pton(AF_INET, std::string(text).c_str(), &address) == 1 && IsUsable(address);
}

std::optional<std::string> Ipv6(std::string_view text) {
  in6_addr address{};
  char shortest[INET6_ADDRSTRLEN] = {};
  if (inet_pton(AF_INET6, std::string(text).c_str(), &address) != 1 || !IsUsable(address) ||
      inet_ntop(AF_INET6, &address, shortest, sizeof shortest) == nullptr) {
    return std::nullopt;
  }
  return "[" + std::string(shortest) + "]";
}

}  // namespace

bool IsUsable(const in_addr& address) {
  const uint32_t number = ntohl(address.s_addr);
  const uint32_t first = number >> 24U;
  const bool link_local = number >> 16U == 0xa9feU;  // 169.254.0.0/16
  return first != 0 && first < 224 && !link_local;
}

bool IsUsable(const in6_addr& address) {
  if (IN6_IS_ADDR_V4MAPPED(&address)) {
    in_addr v4{};
    std::memcpy(&v4, &address.s6_addr[12], sizeof v4);
    return IsUsable(v4);
  }
  return !IN6_IS_ADDR_UNSPECIFIED(&address) && !IN6_IS_ADDR_LINKLOCAL(&address) &&
         !IN6_IS_ADDR_MULTICAST(&address);
}

bool IsHostName(std::string_view text) {
  if (text.empty() || text.size() > kLongestName) {
    return false;
  }
  for (;;) {
    const size_t dot = text.find('.');
    const std::string_view label = text.substr(0, dot);
    if (!IsLabel(label)) {
      return false;
    }
    if (dot == std::string_view::npos) {
      return !IsNumber(label);
    }
    text.remove_prefix(dot + 1);
  }
}

std::optional<std::string> HostInAddress(std::string_view text) {
  // The C functions below would read up to there, and pass what stands behind over.
  if (text.find('\0') != std::string_view::npos) {
    return std::nullopt;
  }
  if (text.size() >= 2 && text.front() == '[' && text.back() == ']') {
    return Ipv6(text.substr(1, text.size() - 2));
  }
  if (text.find(':') != std::string_view::npos) {
    return Ipv6(text);
  }
  if (IsHostName(text) || IsUsableIpv4(text)) {
    return std::string(text);
  }
  return std::nullopt;
}

}  // namespace sharingurl
