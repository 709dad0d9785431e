// The system log's lines about what the commands change.
#ifndef PROGRAMS_CLI_CHANGE_LOG_H_
#define PROGRAMS_CLI_CHANGE_LOG_H_

#include "owner/problem.h"

namespace cli {

// One line: what was done by the user who runs the program, or why it was not. `link` is the link's
// row number, 0 for none or several.
void LogChange(const char* event, int link, const owner::MaybeProblem& problem);

}  // namespace cli

#endif  // PROGRAMS_CLI_CHANGE_LOG_H_
