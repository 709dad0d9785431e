// Times as owners write them.
#ifndef PROGRAMS_OWNER_MOMENT_H_
#define PROGRAMS_OWNER_MOMENT_H_

#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace owner {

// The last second that the database file's 32-bit times can hold, in January 2038.
constexpr std::time_t kLastMoment = 2147483647;

// What a date without a time of day stands for.
enum class DayPart { kFirstSecond, kLastSecond };

// Reads "2026-12-31", "2026-12-31 23:59" or "2026-12-31 23:59:59" (a "T" may stand for the blank)
// as local time, or a span counted from `now`: "+" and a number, then s, m, h, d or w; a day is
// 86400 seconds. Nothing for any other text, for dates that do not exist, and for times before 1970
// or behind kLastMoment.
std::optional<std::time_t> ParseMoment(std::string_view text, std::time_t now, DayPart part);

// "2026-12-31 23:59:59" in local time; empty for 0, which is "not set".
std::string MomentText(std::time_t moment);

}  // namespace owner

#endif  // PROGRAMS_OWNER_MOMENT_H_
