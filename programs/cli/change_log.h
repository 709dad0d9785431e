// One line in the system log for each change, and for each that was refused.
#ifndef PROGRAMS_CLI_CHANGE_LOG_H_
#define PROGRAMS_CLI_CHANGE_LOG_H_

#include <functional>

#include "cli/exit_status.h"
#include "owner/problem.h"

namespace cli {

// Logs what was done, or that it was refused. `link` is 0 when there is none, or several.
void LogChange(const char* event, int link, const owner::MaybeProblem& problem);

// Runs a command that changes something. When it fails without having logged anything, that is
// logged as a refusal, with the failure's code. The answer no (Declined) and a signal are none.
ExitStatus LogRefusal(const char* event, const std::function<ExitStatus()>& command);

}  // namespace cli

#endif  // PROGRAMS_CLI_CHANGE_LOG_H_
