// Owners' links in the database: made, found, changed, removed.
#ifndef PROGRAMS_OWNER_LINK_STORE_H_
#define PROGRAMS_OWNER_LINK_STORE_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry.h>

#include <functional>
#include <optional>
#include <string>

#include "owner/problem.h"

namespace owner {

// By which a link is named: its row id or, when that is 0, its hash.
struct LinkName {
  int id = 0;
  std::string hash;
};

// Whose links are there at all for somebody; no value: everybody's.
using Scope = std::optional<unsigned int>;

// Stores a new link. With an empty hash one is drawn; one that is set is taken as it is, and
// Error::kHashTaken returned when another link has it. On success `link` has its id and hash.
MaybeProblem CreateLink(TUVO::sharing::db::BaseDB& db, TUVO::sharing::record::Entry* link);

// Error::kNoSuchLink, also for links outside of the scope and rows that do not load as a link;
// `link` is then an empty one, here and in what follows.
MaybeProblem FindLink(TUVO::sharing::db::BaseDB& db, const LinkName& name, Scope scope,
                      TUVO::sharing::record::Entry* link);

// Reads the link, lets `change` change it, and writes it, as one step (transaction.h: `change` may
// be called again). Nothing is written when `change` returns a problem; a changed hash may be one
// that is taken. When the link then asks for a password that it did not ask for before, everybody
// who is in is signed out. On success `link` is the link as it was written.
MaybeProblem ChangeLink(TUVO::sharing::db::BaseDB& db, const LinkName& name, Scope scope,
                        const std::function<MaybeProblem(TUVO::sharing::record::Entry*)>& change,
                        TUVO::sharing::record::Entry* link);

// Deletes the link, and with it, through the schema, its visitors' tokens. `link` is what it was,
// also when it was found and could not be deleted.
MaybeProblem DeleteLink(TUVO::sharing::db::BaseDB& db, const LinkName& name, Scope scope,
                        TUVO::sharing::record::Entry* link);

// Deletes the links of the scope, and of the project unless that is empty, that are past their end
// or used up, those that are not collected automatically among them. `deleted` is how many.
MaybeProblem DeleteExpiredLinks(TUVO::sharing::db::BaseDB& db, Scope scope,
                                const std::string& project, int* deleted);

// How many that would delete at this moment; deletes nothing.
MaybeProblem CountExpiredLinks(TUVO::sharing::db::BaseDB& db, Scope scope,
                               const std::string& project, int* count);

}  // namespace owner

#endif  // PROGRAMS_OWNER_LINK_STORE_H_
