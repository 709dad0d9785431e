#include "webapi/named_link.h"

#include "webapi/database.h"
#include "webapi/link_name.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem OpenForNamedLink(const Turn& turn, TUVO::sharing::db::BaseDB** db,
                                     owner::LinkName* name) {
  if (owner::MaybeProblem problem = ReadLinkName(turn.arguments, name)) {
    return problem;
  }
  return OpenDatabase(db);
}

owner::MaybeProblem FindNamedLink(const Turn& turn, TUVO::sharing::db::BaseDB** db,
                                  TUVO::sharing::record::Entry* link) {
  owner::LinkName name;
  if (owner::MaybeProblem problem = OpenForNamedLink(turn, db, &name)) {
    return problem;
  }
  return owner::FindLink(**db, name, ScopeOf(turn.account), link);
}

}  // namespace webapi
