#include "webapi/same_origin.h"

#include <algorithm>
#include <string_view>

namespace webapi {

namespace {

struct Place {
  std::string host;  // in lower case
  std::string port;
};

std::string Lower(std::string_view text) {
  std::string lower(text);
  for (char& c : lower) {
    c = c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  }
  return lower;
}

bool IsDigits(std::string_view text) {
  return !text.empty() && text.size() <= 5 &&
         std::all_of(text.begin(), text.end(), [](char c) { return c >= '0' && c <= '9'; });
}

// Names, and the addresses of either kind, these in brackets.
bool IsHost(std::string_view host) {
  constexpr std::string_view kName = "abcdefghijklmnopqrstuvwxyz0123456789.-_";
  constexpr std::string_view kAddress = "abcdef0123456789:.";
  if (host.size() > 2 && host.front() == '[' && host.back() == ']') {
    return host.substr(1, host.size() - 2).find_first_not_of(kAddress) == std::string_view::npos;
  }
  return !host.empty() && host.find_first_not_of(kName) == std::string_view::npos;
}

// Reads "host" or "host:port".
std::optional<Place> PlaceOf(std::string_view text, bool https) {
  const size_t bracket = text.find(']');
  const size_t colon = text.find(':', bracket == std::string_view::npos ? 0 : bracket);
  Place place{Lower(text.substr(0, colon)), https ? "443" : "80"};
  if (colon != std::string_view::npos) {
    place.port = text.substr(colon + 1);
  }
  if (!IsHost(place.host) || !IsDigits(place.port)) {
    return std::nullopt;
  }
  return place;
}

bool IsOwnOrigin(std::string_view origin, std::string_view host, bool https) {
  const std::string_view scheme = https ? "https://" : "http://";
  if (Lower(origin.substr(0, scheme.size())) != scheme) {
    return false;
  }
  const std::optional<Place> from = PlaceOf(origin.substr(scheme.size()), https);
  const std::optional<Place> to = PlaceOf(host, https);
  return from && to && from->host == to->host && from->port == to->port;
}

}  // namespace

bool IsSameOrigin(const OriginHeaders& headers) {
  if (headers.fetch_site && *headers.fetch_site != "same-origin" && *headers.fetch_site != "none") {
    return false;
  }
  return !headers.origin || IsOwnOrigin(*headers.origin, headers.host, headers.https);
}

}  // namespace webapi
