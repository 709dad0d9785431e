// Who is admitted to a link at the moment, and the end of it.
#ifndef PROGRAMS_OWNER_VISITORS_H_
#define PROGRAMS_OWNER_VISITORS_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry.h>

#include <ctime>
#include <string>
#include <vector>

#include "owner/link_store.h"
#include "owner/problem.h"

namespace owner {

// Nothing of the visitor's session that would open anything.
struct Visitor {
  std::string ip;
  std::string user;  // empty: a stranger, an account that is gone, a link that asks for none
  std::time_t expires_at = 0;
};

// At most `most` visitors whose token and session have not expired, those that end last first;
// `total` is the number of tokens that have not expired.
MaybeProblem ListVisitors(TUVO::sharing::db::BaseDB& db, const TUVO::sharing::record::Entry& link,
                          int most, std::time_t now, std::vector<Visitor>* visitors, int* total);

// Ends the admission of everybody who is in; whoever can prove himself may open the link anew. A
// login that has passed the link's protection already is not met: it admits its visitor behind
// this. `link` is the link, as soon as it was found; `count` how many of those admissions had not
// expired.
MaybeProblem SignOutVisitors(TUVO::sharing::db::BaseDB& db, const LinkName& name, Scope scope,
                             std::time_t now, TUVO::sharing::record::Entry* link, int* count);

}  // namespace owner

#endif  // PROGRAMS_OWNER_VISITORS_H_
