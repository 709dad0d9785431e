// The command line: which command, with which options.
#ifndef PROGRAMS_CLI_COMMAND_LINE_H_
#define PROGRAMS_CLI_COMMAND_LINE_H_

#include <functional>

#include "cli/exit_status.h"

namespace cli {

// Reads the arguments and answers what is to be done. Nothing when there is nothing left to do:
// help or version were asked for, and printed. Throws Failure.
std::function<ExitStatus()> ReadCommandLine(int argc, const char* const* argv);

}  // namespace cli

#endif  // PROGRAMS_CLI_COMMAND_LINE_H_
