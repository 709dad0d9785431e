// Where a link stands in its life.
#ifndef PROGRAMS_OWNER_LINK_STATE_H_
#define PROGRAMS_OWNER_LINK_STATE_H_

#include <tuvosharing/entry.h>

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace owner {

// Several may apply; a link's state is the first of them in this order. Only kLive admits visitors.
enum class LinkState { kDisabled, kExpired, kUsedUp, kNotYet, kLive };

LinkState StateOf(const TUVO::sharing::record::Entry& link, std::time_t now);

// "disabled", "expired", "used_up", "not_yet", "live".
std::string StateText(LinkState state);
std::optional<LinkState> StateOfText(std::string_view text);

// The condition, in parentheses, that exactly the rows of that state meet: columns are read as the
// records read them, whatever is in them.
std::string StateClause(LinkState state, std::time_t now);

// The condition, in parentheses, that rows past their end or used up meet, whatever else they are:
// what is removed as ended. Unlike the library's own purges it takes a negative end or limit for
// none, and texts for the numbers that the records read from them, as everything does that shows
// links and lets visitors in.
std::string EndedClause(std::time_t now);

}  // namespace owner

#endif  // PROGRAMS_OWNER_LINK_STATE_H_
