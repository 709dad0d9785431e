#include "owner/link_store.h"
#include "owner/qr_code.h"
#include "webapi/database.h"
#include "webapi/link_answer.h"
#include "webapi/link_api.h"
#include "webapi/link_name.h"
#include "webapi/ownership.h"

namespace webapi {

owner::MaybeProblem GetMethod(Turn* turn) {
  owner::LinkName name;
  if (owner::MaybeProblem problem = ReadLinkName(turn->arguments, &name)) {
    return problem;
  }
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (owner::MaybeProblem problem = OpenDatabase(&db)) {
    return problem;
  }
  TUVO::sharing::record::Entry link;
  if (owner::MaybeProblem problem = owner::FindLink(*db, name, ScopeOf(turn->account), &link)) {
    return problem;
  }
  AnswerLink(link, turn);
  if (turn->arguments["qr"].asBool()) {
    turn->data["qr_svg"] = owner::QrCodeSvg(turn->data["url"].asString());
  }
  return std::nullopt;
}

}  // namespace webapi
