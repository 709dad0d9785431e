// What the command's exit status says. The numbers are documented in its manual page.
#ifndef PROGRAMS_CLI_EXIT_STATUS_H_
#define PROGRAMS_CLI_EXIT_STATUS_H_

#include "owner/problem.h"

namespace cli {

enum class ExitStatus : int {
  kDone = 0,
  kFailed = 1,  // the database or the system
  kUsage = 2,   // options, a value, or a file that is not what it should be
  kDamage = 3,  // what is stored is damaged
  kNoSuchLink = 4,
  kTaken = 5,       // a hash, or a file that is there already
  kNotAllowed = 6,  // to this user, or this file
  kBusy = 7,        // other programs keep writing
};

ExitStatus StatusOf(owner::Error error);

// The code of what ends with that status when nothing says it more exactly.
owner::Error UsualErrorOf(ExitStatus status);

}  // namespace cli

#endif  // PROGRAMS_CLI_EXIT_STATUS_H_
