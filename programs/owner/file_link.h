// Links of the project "file".
#ifndef PROGRAMS_OWNER_FILE_LINK_H_
#define PROGRAMS_OWNER_FILE_LINK_H_

#include <json/value.h>
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

// A look at the file of a link that is not yet to be written: looking takes its time, and what the
// link's owner can delay must not happen while the database is locked.
struct FileLook {
  bool of_file = false;  // the link was one of the project "file"
  unsigned int owner_uid = 0;
  Json::Value app;
  Json::Value resolved_app;
};

// Looks as CheckFileLink does, and leaves the link as it is.
MaybeProblem LookAtFile(const std::vector<std::string>& folders,
                        const TUVO::sharing::record::Entry& link, bool by_administrator,
                        FileLook* look);

// Puts the resolved path into the link; Error::kBusy when the link has another project, owner or
// `app` than what was looked at.
MaybeProblem UseLook(const FileLook& look, TUVO::sharing::record::Entry* link);

}  // namespace owner

#endif  // PROGRAMS_OWNER_FILE_LINK_H_
