// The link that a request is about.
#ifndef PROGRAMS_WEBAPI_NAMED_LINK_H_
#define PROGRAMS_WEBAPI_NAMED_LINK_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/entry.h>

#include "owner/link_store.h"
#include "owner/problem.h"
#include "webapi/registry.h"

namespace webapi {

// Reads which link the request names, and points `*db` to the database for it. Whether there is
// such a link, and whether the account may see it, is not looked at.
owner::MaybeProblem OpenForNamedLink(const Turn& turn, TUVO::sharing::db::BaseDB** db,
                                     owner::LinkName* name);

// Loads the link that the request names, out of those that its account may see, and points `*db` to
// the database it is in.
owner::MaybeProblem FindNamedLink(const Turn& turn, TUVO::sharing::db::BaseDB** db,
                                  TUVO::sharing::record::Entry* link);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_NAMED_LINK_H_
