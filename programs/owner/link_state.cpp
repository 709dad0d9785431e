#include "owner/link_state.h"

#include <array>
#include <utility>

namespace owner {

namespace {

using TUVO::sharing::record::Entry;

constexpr std::array<std::pair<LinkState, const char*>, 5> kTexts = {
    {{LinkState::kDisabled, "disabled"},
     {LinkState::kExpired, "expired"},
     {LinkState::kUsedUp, "used_up"},
     {LinkState::kNotYet, "not_yet"},
     {LinkState::kLive, "live"}}};

// As the records read it: a row without a value counts as enabled.
constexpr const char* kEnabled = "(enabled IS NULL OR enabled = '' OR enabled = 1)";

std::string Past(const std::string& now) {
  return "(expire_at > 0 AND expire_at < " + now + ")";
}

std::string Future(const std::string& now) {
  return "(start_at > 0 AND start_at > " + now + ")";
}

constexpr const char* kUsedUpClause = "(expire_times > 0 AND use_count >= expire_times)";

// A comparison with NULL is neither true nor false: such a row is of the state without it.
std::string Not(const std::string& clause) {
  return "IFNULL(NOT " + clause + ", 1)";
}

}  // namespace

LinkState StateOf(const Entry& link, std::time_t now) {
  if (!link.get_enabled()) {
    return LinkState::kDisabled;
  }
  if (link.get_expire_at() > 0 && link.get_expire_at() < now) {
    return LinkState::kExpired;
  }
  // The limit as the login has it: with the last use the link is used up.
  if (link.get_expire_times() > 0 && link.get_use_count() >= link.get_expire_times()) {
    return LinkState::kUsedUp;
  }
  return link.get_start_at() > now ? LinkState::kNotYet : LinkState::kLive;
}

std::string StateText(LinkState state) {
  for (const auto& [known, text] : kTexts) {
    if (known == state) {
      return text;
    }
  }
  return {};
}

std::optional<LinkState> StateOfText(std::string_view text) {
  for (const auto& [state, known] : kTexts) {
    if (known == text) {
      return state;
    }
  }
  return std::nullopt;
}

std::string StateClause(LinkState state, std::time_t now) {
  const std::string moment = std::to_string(now);
  std::string clause = std::string("(") + kEnabled;
  if (state == LinkState::kDisabled) {
    return "(NOT " + std::string(kEnabled) + ")";
  }
  if (state == LinkState::kExpired) {
    return clause + " AND " + Past(moment) + ")";
  }
  clause += " AND " + Not(Past(moment));
  if (state == LinkState::kUsedUp) {
    return clause + " AND " + kUsedUpClause + ")";
  }
  clause += " AND " + Not(kUsedUpClause);
  return clause + " AND " + (state == LinkState::kNotYet ? Future(moment) : Not(Future(moment))) +
         ")";
}

std::string EndedClause(std::time_t now) {
  return "(" + Past(std::to_string(now)) + " OR " + kUsedUpClause + ")";
}

}  // namespace owner
