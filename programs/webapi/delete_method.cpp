#include "owner/link_store.h"
#include "webapi/link_api.h"
#include "webapi/named_link.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem DeleteMethod(Turn* turn) {
  owner::LinkName name;
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (owner::MaybeProblem problem = OpenForNamedLink(*turn, &db, &name)) {
    return problem;
  }
  TUVO::sharing::record::Entry link;
  owner::MaybeProblem problem = owner::DeleteLink(*db, name, ScopeOf(turn->account), &link);
  turn->link = link.get_id();
  if (problem) {
    return problem;
  }
  turn->data["deleted"] = 1;
  return std::nullopt;
}

}  // namespace webapi
