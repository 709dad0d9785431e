// Row numbers as SQLite has them: 64 bits, whatever the library's own are. Rows beyond those are
// damage that somebody has to be able to see.
#ifndef PROGRAMS_CLI_ROW_ID_H_
#define PROGRAMS_CLI_ROW_ID_H_

#include <tuvosharing/row.h>

#include <cstdint>
#include <optional>
#include <string>

namespace cli {

using RowId = std::int64_t;

// The number in the row's column "id".
RowId RowIdOf(const TUVO::sharing::db::Row& row);

// Whether the library knows rows of this number.
bool IsUsualId(RowId id);

// The condition for the rows behind `last` in the column `column`; for all when there is no last.
std::string BehindRow(const std::string& column, const std::optional<RowId>& last);

}  // namespace cli

#endif  // PROGRAMS_CLI_ROW_ID_H_
