#include "webapi/info_api.h"

#include "common/config.h"
#include "owner/moment.h"

namespace webapi {

namespace {

constexpr const char* kPath = "/webapi/entry.cgi";

Json::Value ArgumentsJson(const Method& method) {
  Json::Value json(Json::objectValue);
  for (const owner::Argument& argument : method.arguments) {
    json[argument.name]["type"] = owner::KindText(argument.kind);
    json[argument.name]["needed"] = argument.needed;
  }
  return json;
}

Json::Value ApisJson() {
  Json::Value json(Json::objectValue);
  for (const Api& api : Apis()) {
    Json::Value& one = json[api.name];
    one["path"] = kPath;
    one["min_version"] = api.min_version;
    one["max_version"] = api.max_version;
    for (const Method& method : api.methods) {
      one["methods"][method.name]["changes"] = method.changes;
      one["methods"][method.name]["arguments"] = ArgumentsJson(method);
    }
  }
  return json;
}

owner::MaybeProblem Query(Turn* turn) {
  Json::Value& data = turn->data;
  data["apis"] = ApisJson();
  data["account"]["user"] = turn->account.name;
  data["account"]["uid"] = turn->account.uid;
  data["account"]["administrator"] = turn->account.administrator;
  data["now"] = owner::MomentText(turn->now);
  data["share_folders"] = Json::Value(Json::arrayValue);
  for (const std::string& folder : common::ReadConfig().share_folders) {
    data["share_folders"].append(folder);
  }
  return std::nullopt;
}

}  // namespace

Api InfoApi() {
  return {"TUVO.API.Info", 1, 1, {{"query", false, {}, Query}}};
}

}  // namespace webapi
