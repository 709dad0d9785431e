#include <tuvosharing/keys.h>

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

MaybeProblem ReadNewSettings(const Turn& turn, owner::Settings* settings) {
  if (MaybeProblem problem = CheckOwner(turn.account, turn.arguments)) {
    return problem;
  }
  if (MaybeProblem problem = owner::ReadSettings(turn.arguments, turn.now, settings)) {
    return problem;
  }
  // A link that nobody can ever open is a slip. An existing one may be ended this way.
  if (settings->expire_at && *settings->expire_at != 0 && *settings->expire_at <= turn.now) {
    return owner::Fault(owner::Error::kBadValue, "must lie in the future",
                        TUVO::sharing::SZK_EXPIRE_AT);
  }
  if (!settings->owner_uid) {
    settings->owner_uid = turn.account.uid;
  }
  return std::nullopt;
}

MaybeProblem Store(Entry* link) {
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (MaybeProblem problem = OpenDatabase(&db)) {
    return problem;
  }
  return owner::CreateLink(*db, link);
}

}  // namespace

MaybeProblem CreateMethod(Turn* turn) {
  owner::Settings settings;
  Entry link;
  link.set_app(Json::Value(Json::objectValue));
  if (MaybeProblem problem = ReadNewSettings(*turn, &settings)) {
    return problem;
  }
  if (MaybeProblem problem = owner::ApplySettings(settings, &link)) {
    return problem;
  }
  if (MaybeProblem problem = owner::CheckFileLink(common::ReadConfig().share_folders, &link,
                                                  turn->account.administrator)) {
    return problem;
  }
  if (MaybeProblem problem = Store(&link)) {
    return problem;
  }
  turn->link = link.get_id();
  turn->note_change();
  AnswerLink(link, turn);
  return std::nullopt;
}

}  // namespace webapi
