#include "owner/link_state.h"

#include <array>
#include <limits>
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

// As the records read it: a row without a value counts as enabled. The text is that which the
// platform hands them, up to a zero byte.
constexpr const char* kEnabled = "(printf('%s', enabled) IN ('', '1'))";

// The number that the records read from a column of that type, whatever another program has put
// there: a text's leading digits, and 0 for one without, for NULL and for a number that does not
// fit. To SQL itself every text is greater than every number: a count that is the empty text would
// have used up any limit. (A conversion that does not fit 64 bits ends at their limits.)
template <typename T>
std::string NumberIn(const std::string& column) {
  const std::string fits = " BETWEEN " + std::to_string(std::numeric_limits<T>::min()) + " AND " +
                           std::to_string(std::numeric_limits<T>::max());
  const std::string read = "CAST(printf('%s', " + column + ") AS INTEGER)";
  const std::string plain = "typeof(" + column + ") = 'integer'";
  return "(CASE WHEN " + plain + " AND " + column + fits + " THEN " + column + " WHEN " + plain +
         " OR " + read + " IN (-9223372036854775808, 9223372036854775807) THEN 0 WHEN " + read +
         fits + " THEN " + read + " ELSE 0 END)";
}

std::string Past(const std::string& now) {
  const std::string end = NumberIn<long>("expire_at");
  return "(" + end + " > 0 AND " + end + " < " + now + ")";
}

std::string Future(const std::string& now) {
  return "(" + NumberIn<long>("start_at") + " > " + now + ")";
}

std::string UsedUp() {
  const std::string limit = NumberIn<int>("expire_times");
  return "(" + limit + " > 0 AND " + NumberIn<int>("use_count") + " >= " + limit + ")";
}

std::string Not(const std::string& clause) {
  return "(NOT " + clause + ")";
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
    return Not(kEnabled);
  }
  if (state == LinkState::kExpired) {
    return clause + " AND " + Past(moment) + ")";
  }
  clause += " AND " + Not(Past(moment));
  if (state == LinkState::kUsedUp) {
    return clause + " AND " + UsedUp() + ")";
  }
  clause += " AND " + Not(UsedUp());
  return clause + " AND " + (state == LinkState::kNotYet ? Future(moment) : Not(Future(moment))) +
         ")";
}

std::string EndedClause(std::time_t now) {
  return "(" + Past(std::to_string(now)) + " OR " + UsedUp() + ")";
}

}  // namespace owner
