#include "owner/link_store.h"
#include "owner/settings.h"
#include "webapi/database.h"
#include "webapi/link_api.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem DeleteExpiredMethod(Turn* turn) {
  const bool only_count = turn->arguments.get("dry_run", false).asBool();
  turn->is_event = !only_count;
  if (owner::MaybeProblem problem = CheckOwner(turn->account, turn->arguments)) {
    return problem;
  }
  owner::Settings settings;
  if (owner::MaybeProblem problem = owner::ReadSettings(turn->arguments, turn->now, &settings)) {
    return problem;
  }
  owner::Scope scope = ScopeOf(turn->account);
  if (!scope) {
    scope = settings.owner_uid;
  }
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (owner::MaybeProblem problem = OpenDatabase(&db)) {
    return problem;
  }
  const auto act = only_count ? owner::CountExpiredLinks : owner::DeleteExpiredLinks;
  int deleted = 0;
  if (owner::MaybeProblem problem = act(*db, scope, settings.project_name.value_or(""), &deleted)) {
    return problem;
  }
  turn->data["deleted"] = deleted;
  return std::nullopt;
}

}  // namespace webapi
