// How links are named on the command line.
#ifndef PROGRAMS_CLI_LINK_NAME_H_
#define PROGRAMS_CLI_LINK_NAME_H_

#include <string>
#include <vector>

#include "cli/row_id.h"
#include "owner/link_store.h"

namespace cli {

// "#7", a row number, or a hash. Throws Failure for any other text.
owner::LinkName LinkNameOf(const std::string& text);

// The links named in words and by `ids`, in that order; one that is named twice in the same way
// stands there once. Throws Failure when there is none.
std::vector<owner::LinkName> LinkNamesOf(const std::vector<std::string>& texts,
                                         const std::vector<std::string>& ids);

// Rows, named by their numbers alone, each once; numbers that no link has may be among them. Throws
// Failure when there is none, or one is named by a hash.
std::vector<RowId> RowIdsOf(const std::vector<std::string>& texts,
                            const std::vector<std::string>& ids);

// As the person named it.
std::string TextOf(const owner::LinkName& name);

}  // namespace cli

#endif  // PROGRAMS_CLI_LINK_NAME_H_
