// Who is admitted to a link at the moment.
#ifndef PROGRAMS_OWNER_VISITORS_H_
#define PROGRAMS_OWNER_VISITORS_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry.h>

#include <ctime>
#include <string>
#include <vector>

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

}  // namespace owner

#endif  // PROGRAMS_OWNER_VISITORS_H_
