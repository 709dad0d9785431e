#include "owner/moment.h"
#include "owner/text_check.h"
#include "owner/visitors.h"
#include "webapi/link_api.h"
#include "webapi/named_link.h"

namespace webapi {

namespace {

constexpr int kMostVisitors = 500;

Json::Value VisitorJson(const owner::Visitor& visitor) {
  Json::Value json(Json::objectValue);
  json["ip"] = owner::RepairedUtf8(visitor.ip);
  json["user"] = owner::RepairedUtf8(visitor.user);
  json["expires_at"] = owner::MomentText(visitor.expires_at);
  return json;
}

}  // namespace

owner::MaybeProblem SessionsMethod(Turn* turn) {
  TUVO::sharing::db::BaseDB* db = nullptr;
  TUVO::sharing::record::Entry link;
  if (owner::MaybeProblem problem = FindNamedLink(*turn, &db, &link)) {
    return problem;
  }
  std::vector<owner::Visitor> visitors;
  int total = 0;
  if (owner::MaybeProblem problem =
          owner::ListVisitors(*db, link, kMostVisitors, turn->now, &visitors, &total)) {
    return problem;
  }
  turn->data["total"] = total;
  turn->data["sessions"] = Json::Value(Json::arrayValue);
  for (const owner::Visitor& visitor : visitors) {
    turn->data["sessions"].append(VisitorJson(visitor));
  }
  return std::nullopt;
}

}  // namespace webapi
