// Owners and modes of the database's files and folders.
#ifndef PROGRAMS_CLI_CHECK_FILES_H_
#define PROGRAMS_CLI_CHECK_FILES_H_

#include <string>

#include "cli/finding.h"

namespace cli {

// Looks at the database file, its companions, and the two folders above. False when there is no
// database file that can be read, which is a finding too.
bool CheckFiles(const std::string& database, Findings* findings);

}  // namespace cli

#endif  // PROGRAMS_CLI_CHECK_FILES_H_
