#include "visitor/route.h"

#include "common/hash_text.h"

namespace visitor {

namespace {

constexpr std::string_view kLogoutSuffix = "/logout";

bool EndsWith(std::string_view text, std::string_view end) {
  return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

}  // namespace

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
  if (!common::IsHashText(path_info)) {
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
