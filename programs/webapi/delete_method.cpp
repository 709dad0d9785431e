#include "owner/link_store.h"
#include "webapi/database.h"
#include "webapi/link_api.h"
#include "webapi/link_name.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem DeleteMethod(Turn* turn) {
  owner::LinkName name;
  if (owner::MaybeProblem problem = ReadLinkName(turn->arguments, &name)) {
    return problem;
  }
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (owner::MaybeProblem problem = OpenDatabase(&db)) {
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
