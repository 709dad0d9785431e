// The file that export writes and import reads: JSON values, one a line. The first names the format
// and its version, the last tells how many links stand between, so that a file that was cut off is
// none.
#ifndef PROGRAMS_CLI_LINK_FILE_H_
#define PROGRAMS_CLI_LINK_FILE_H_

#include <cstddef>
#include <string>
#include <vector>

#include "cli/link_row.h"

namespace cli {

std::string FirstLine();
std::string LineOf(const LinkRow& row);
std::string LastLine(long long links);

// The links of the file at `fd`, the first of them in line 2. Throws Failure, which names the line,
// when it is not whole, or not what export writes.
std::vector<LinkRow> ReadLinkFile(int fd);

// The line of the file that the link at `index` stands in.
inline std::string LineText(std::size_t index) {
  return "line " + std::to_string(index + 2);
}

}  // namespace cli

#endif  // PROGRAMS_CLI_LINK_FILE_H_
