// Links of the project "file".
#ifndef PROGRAMS_OWNER_FILE_LINK_H_
#define PROGRAMS_OWNER_FILE_LINK_H_

#include <tuvosharing/entry.h>

#include <string>
#include <vector>

#include "owner/problem.h"
#include "owner/settings.h"

namespace owner {

// Whether these settings decide which file a link leads to, or as whom it is read: after them
// CheckFileLink is due.
bool TouchesFile(const Settings& settings);

// For a link of the project "file": sees that its owner may share the file that `app` names, below
// one of `folders`, and puts the resolved path into its place. Links of other projects pass as they
// are. A process that cannot take the owner's identity looks with its own, for administrators; for
// anybody else that is Error::kForbidden. Makes and reaps a child (shareable_file.h).
MaybeProblem CheckFileLink(const std::vector<std::string>& folders,
                           TUVO::sharing::record::Entry* link, bool by_administrator = false);

}  // namespace owner

#endif  // PROGRAMS_OWNER_FILE_LINK_H_
