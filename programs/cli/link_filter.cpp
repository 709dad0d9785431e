#include "cli/link_filter.h"

#include <tuvosharing/user_group.h>

#include <charconv>

#include "cli/failure.h"

namespace cli {

namespace {

constexpr std::size_t kLongestSearch = 64;

}  // namespace

unsigned int OwnerUidOf(const std::string& text) {
  unsigned int uid = 0;
  if (TUVO::sharing::UserToUID(text, uid)) {
    return uid;
  }
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, uid);
  if (text.empty() || error != std::errc() || stop != end) {
    throw Failure(ExitStatus::kUsage, "--owner: is no account of this system, and no number");
  }
  return uid;
}

owner::ListRequest RequestOf(const LinkFilter& filter) {
  owner::ListRequest request;
  if (!filter.owner.empty()) {
    request.owner_uid = OwnerUidOf(filter.owner);
  }
  request.project_name = filter.project;
  if (!filter.state.empty()) {
    request.state = owner::StateOfText(filter.state);
    if (!request.state) {
      throw Failure(ExitStatus::kUsage,
                    "--state: must be disabled, expired, used_up, not_yet or live");
    }
  }
  if (filter.search.size() > kLongestSearch) {
    throw Failure(ExitStatus::kUsage, "--search: must have at most 64 bytes");
  }
  request.search = filter.search;
  return request;
}

}  // namespace cli
