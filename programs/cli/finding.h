// What the check of the database has found.
#ifndef PROGRAMS_CLI_FINDING_H_
#define PROGRAMS_CLI_FINDING_H_

#include <string>
#include <vector>

namespace cli {

struct Finding {
  std::string kind;     // "file", "integrity", "foreign_key", "schema", "journal" or "row"
  std::string subject;  // a path, or "entry #7"; may be empty
  std::string reason;
};

using Findings = std::vector<Finding>;

}  // namespace cli

#endif  // PROGRAMS_CLI_FINDING_H_
