#include "webapi/named_link.h"

#include "owner/link_store.h"
#include "webapi/database.h"
#include "webapi/link_name.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem FindNamedLink(const Turn& turn, TUVO::sharing::db::BaseDB** db,
                                  TUVO::sharing::record::Entry* link) {
  owner::LinkName name;
  if (owner::MaybeProblem problem = ReadLinkName(turn.arguments, &name)) {
    return problem;
  }
  if (owner::MaybeProblem problem = OpenDatabase(db)) {
    return problem;
  }
  return owner::FindLink(**db, name, ScopeOf(turn.account), link);
}

}  // namespace webapi
