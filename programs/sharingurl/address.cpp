#include "sharingurl/address.h"

#include <strings.h>

#include <algorithm>
#include <charconv>

#include "sharingurl/host.h"

namespace sharingurl {

namespace {

constexpr unsigned int kHighestPort = 65535;
constexpr size_t kLongestPath = 1024;

// Takes `prefix` from the beginning of the text. Schemes are the same in any case.
bool TakeScheme(std::string_view prefix, std::string_view& text) {
  if (text.size() < prefix.size() || strncasecmp(text.data(), prefix.data(), prefix.size()) != 0) {
    return false;
  }
  text.remove_prefix(prefix.size());
  return true;
}

bool IsPathCharacter(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
         std::string_view("-._~/").find(c) != std::string_view::npos;
}

// The path without a slash at its end. `path` is empty or begins with a slash.
std::optional<std::string> ReadPath(std::string_view path) {
  if (path.size() > kLongestPath || !std::all_of(path.begin(), path.end(), IsPathCharacter)) {
    return std::nullopt;
  }
  std::string whole;
  while (!path.empty()) {
    path.remove_prefix(1);  // the slash
    const std::string_view part = path.substr(0, path.find('/'));
    if (part == "." || part == "..") {
      return std::nullopt;
    }
    if (!part.empty()) {
      whole.append("/").append(part);
    }
    path.remove_prefix(part.size());
  }
  return whole;
}

// Where the port's colon is, npos without one. The colons of an IPv6 address are none: it has more
// than one and no brackets, or stands within its brackets.
size_t PortColon(std::string_view text) {
  const size_t colon = text.rfind(':');
  if (colon == std::string_view::npos) {
    return colon;
  }
  const bool bracketed = text.front() == '[';
  const bool is_port = bracketed ? text[colon - 1] == ']' : text.find(':') == colon;
  return is_port ? colon : std::string_view::npos;
}

bool ReadHostAndPort(std::string_view text, Address& address) {
  const size_t colon = PortColon(text);
  if (colon != std::string_view::npos) {
    const std::optional<int> port = ReadPort(text.substr(colon + 1), false);
    if (!port) {
      return false;
    }
    address.port = *port;
  }
  const std::string_view bare = text.substr(0, colon);
  if (address.https && bare.find(':') != std::string_view::npos && bare.front() != '[') {
    return false;  // the address of a page needs brackets, so its writer meant something else
  }
  const std::optional<std::string> host = HostInAddress(bare);
  if (!host) {
    return false;
  }
  address.host = *host;
  return true;
}

}  // namespace

std::optional<int> ReadPort(std::string_view text, bool or_zero) {
  unsigned int port = 0;  // a signed one would be read with its sign
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, port);
  if (error != std::errc() || stop != end || port > kHighestPort || (port == 0 && !or_zero)) {
    return std::nullopt;
  }
  return static_cast<int>(port);
}

std::optional<Address> ReadAddress(std::string_view text) {
  Address address;
  if (TakeScheme("https://", text)) {
    address.https = true;
  } else if (TakeScheme("http://", text)) {
    address.https = false;
  }
  if (!address.https && !text.empty() && text.back() == '/') {
    text.remove_suffix(1);  // as browsers show hosts
  }
  const size_t slash = address.https ? text.find('/') : std::string_view::npos;
  if (slash != std::string_view::npos) {
    const std::optional<std::string> path = ReadPath(text.substr(slash));
    if (!path) {
      return std::nullopt;
    }
    address.prefix = *path;
  }
  if (!ReadHostAndPort(text.substr(0, slash), address)) {
    return std::nullopt;
  }
  return address;
}

std::string LinkAddress(const Address& address, bool https, int port, std::string_view hash) {
  const bool whole = address.https.has_value();
  const bool secure = address.https.value_or(https);
  const int own_port = secure ? 443 : 80;
  // The port that was asked for is that of a server on this machine. A whole address without one is
  // that of a proxy or router before it, which may well listen elsewhere.
  const int asked = address.port != 0 || whole ? address.port : port;
  std::string text = (secure ? "https://" : "http://") + address.host;
  if (asked != 0 && asked != own_port) {
    text += ":" + std::to_string(asked);
  }
  return text.append(address.prefix).append("/sharing/").append(hash);
}

}  // namespace sharingurl
