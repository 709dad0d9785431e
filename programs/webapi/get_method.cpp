#include "owner/qr_code.h"
#include "webapi/link_answer.h"
#include "webapi/link_api.h"
#include "webapi/named_link.h"

namespace webapi {

owner::MaybeProblem GetMethod(Turn* turn) {
  TUVO::sharing::db::BaseDB* db = nullptr;
  TUVO::sharing::record::Entry link;
  if (owner::MaybeProblem problem = FindNamedLink(*turn, &db, &link)) {
    return problem;
  }
  AnswerLink(link, turn);
  if (turn->arguments["qr"].asBool()) {
    turn->data["qr_svg"] = owner::QrCodeSvg(turn->data["url"].asString());
  }
  return std::nullopt;
}

}  // namespace webapi
