// What makes a row of links none that loads.
#ifndef PROGRAMS_CLI_DAMAGE_H_
#define PROGRAMS_CLI_DAMAGE_H_

#include <tuvosharing/row.h>

#include <optional>
#include <string>

namespace cli {

// The column, or the part of its data, that is at fault in a row that LinkRowSelection (link_row.h)
// has selected; nothing when the row is a link. Its number is not looked at. Export, check and
// delete go by this alone: what one of them leaves out the others know.
std::optional<std::string> DamageOf(const TUVO::sharing::db::Row& row);

}  // namespace cli

#endif  // PROGRAMS_CLI_DAMAGE_H_
