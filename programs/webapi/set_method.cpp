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
  Entry link;
  const auto change = [&](Entry* found) {
    turn->link = found->get_id();
    MaybeProblem problem = owner::ApplySettings(settings, found);
    if (!problem && owner::TouchesFile(settings)) {
      problem = owner::CheckFileLink(common::ReadConfig().share_folders, found,
                                     turn->account.administrator);
    }
    return problem;
  };
  if (MaybeProblem problem = owner::ChangeLink(*db, name, ScopeOf(turn->account), change, &link)) {
    return problem;
  }
  AnswerLink(link, turn);
  return std::nullopt;
}

}  // namespace webapi
