#include "common/config.h"
#include "owner/file_link.h"
#include "owner/link_store.h"
#include "owner/settings.h"
#include "webapi/database.h"
#include "webapi/link_answer.h"
#include "webapi/link_api.h"
#include "webapi/ownership.h"

namespace webapi {

namespace {

using owner::MaybeProblem;
using TUVO::sharing::record::Entry;

constexpr const char* kId = "id";

MaybeProblem ReadChange(const Turn& turn, owner::LinkName* name, owner::Settings* settings) {
  name->id = turn.arguments[kId].asInt();
  if (name->id < 1) {
    return owner::Fault(owner::Error::kBadValue, "must be at least 1", kId);
  }
  if (MaybeProblem problem = CheckOwner(turn.account, turn.arguments)) {
    return problem;
  }
  return owner::ReadSettings(turn.arguments, turn.now, settings);
}

// Looks at the file that the link will lead to, while nobody has to wait for it.
MaybeProblem LookBefore(const owner::LinkName& name, const owner::Settings& settings,
                        TUVO::sharing::db::BaseDB& db, Turn* turn, owner::FileLook* look) {
  Entry link;
  if (MaybeProblem problem = owner::FindLink(db, name, ScopeOf(turn->account), &link)) {
    return problem;
  }
  turn->link = link.get_id();
  if (MaybeProblem problem = owner::ApplySettings(settings, &link)) {
    return problem;
  }
  return owner::LookAtFile(common::ReadConfig().share_folders, link, turn->account.administrator,
                           look);
}

}  // namespace

MaybeProblem SetMethod(Turn* turn) {
  owner::LinkName name;
  owner::Settings settings;
  if (MaybeProblem problem = ReadChange(*turn, &name, &settings)) {
    return problem;
  }
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (MaybeProblem problem = OpenDatabase(&db)) {
    return problem;
  }
  owner::FileLook look;
  const bool touches_file = owner::TouchesFile(settings);
  if (touches_file) {
    if (MaybeProblem problem = LookBefore(name, settings, *db, turn, &look)) {
      return problem;
    }
  }
  Entry link;
  const auto change = [&](Entry* found) {
    turn->link = found->get_id();
    MaybeProblem problem = owner::ApplySettings(settings, found);
    return problem || !touches_file ? problem : owner::UseLook(look, found);
  };
  if (MaybeProblem problem = owner::ChangeLink(*db, name, ScopeOf(turn->account), change, &link)) {
    return problem;
  }
  turn->note_change();
  AnswerLink(link, turn);
  return std::nullopt;
}

}  // namespace webapi
