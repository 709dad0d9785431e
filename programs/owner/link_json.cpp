#include "owner/link_json.h"

#include <tuvosharing/keys.h>

#include "owner/link_state.h"
#include "owner/moment.h"
#include "owner/text_check.h"

namespace owner {

namespace {

using TUVO::sharing::record::Entry;

Json::Value Repaired(const Json::Value& value) {
  if (value.isString()) {
    return RepairedUtf8(value.asString());
  }
  if (value.isArray()) {
    Json::Value list(Json::arrayValue);
    for (const Json::Value& item : value) {
      list.append(Repaired(item));
    }
    return list;
  }
  if (!value.isObject()) {
    return value;
  }
  Json::Value object(Json::objectValue);
  for (const std::string& name : value.getMemberNames()) {
    object[RepairedUtf8(name)] = Repaired(value[name]);
  }
  return object;
}

}  // namespace

Json::Value LinkJson(const Entry& link, std::time_t now) {
  Json::Value json;
  link.ToJSON(json);
  json[TUVO::sharing::SZK_ID_] = link.get_id();
  json[TUVO::sharing::SZK_OWNER_UID] = link.get_owner_uid();
  json["state"] = StateText(StateOf(link, now));
  return Repaired(json);
}

}  // namespace owner
