// Rows that are none of what their table holds.
#ifndef PROGRAMS_CLI_CHECK_ROWS_H_
#define PROGRAMS_CLI_CHECK_ROWS_H_

#include <functional>
#include <string>

#include <tuvosharing/result.h>

#include "cli/finding.h"

namespace cli {

// Runs a statement; throws when it fails.
using RunQuery = std::function<TUVO::sharing::db::Result(const std::string& sql)>;

// Links that do not load as legal, sessions and tokens that could not be anybody's, and rows whose
// numbers no program can name. That these
// have expired is no damage.
void CheckRows(const RunQuery& query, Findings* findings);

}  // namespace cli

#endif  // PROGRAMS_CLI_CHECK_ROWS_H_
