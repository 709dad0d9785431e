#include "visitor/route.h"

#include <algorithm>

namespace visitor {

namespace {

constexpr size_t kMinHash = 3;
constexpr size_t kMaxText = 64;
constexpr std::string_view kLogoutSuffix = "/logout";

bool IsUrlFriendly(char c) {
  return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') || c == '-' ||
         c == '_';
}

bool IsUrlFriendlyText(std::string_view text, size_t min) {
  return text.size() >= min && text.size() <= kMaxText &&
         std::all_of(text.begin(), text.end(), IsUrlFriendly);
}

bool EndsWith(std::string_view text, std::string_view end) {
  return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

}  // namespace

bool IsHashText(std::string_view text) {
  return IsUrlFriendlyText(text, kMinHash);
}

bool IsSessionIdText(std::string_view text) {
  return IsUrlFriendlyText(text, 1);
}

Route ParseRoute(std::string_view path_info) {
  if (path_info.empty() || path_info.front() != '/') {
    return {};
  }
  path_info.remove_prefix(1);
  Place place = Place::kLink;
  if (EndsWith(path_info, kLogoutSuffix)) {
    path_info.remove_suffix(kLogoutSuffix.size());
    place = Place::kLogout;
  }
  if (!IsHashText(path_info)) {
    return {};
  }
  return {place, std::string(path_info)};
}

std::string LinkPath(std::string_view hash) {
  return std::string(kMountPath) + "/" + std::string(hash);
}

std::string LogoutPath(std::string_view hash) {
  return LinkPath(hash) + std::string(kLogoutSuffix);
}

}  // namespace visitor
