#include "owner/visitors.h"
#include "webapi/link_api.h"
#include "webapi/named_link.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem SignOutMethod(Turn* turn) {
  owner::LinkName name;
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (owner::MaybeProblem problem = OpenForNamedLink(*turn, &db, &name)) {
    return problem;
  }
  TUVO::sharing::record::Entry link;
  int count = 0;
  owner::MaybeProblem problem =
      owner::SignOutVisitors(*db, name, ScopeOf(turn->account), turn->now, &link, &count);
  turn->link = link.get_id();
  if (problem) {
    return problem;
  }
  turn->data["signed_out"] = count;
  return std::nullopt;
}

}  // namespace webapi
