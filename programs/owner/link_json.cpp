#include "owner/link_json.h"

#include <tuvosharing/keys.h>

#include "owner/link_state.h"
#include "owner/moment.h"
#include "owner/text_check.h"

namespace owner {

namespace {

using TUVO::sharing::record::Entry;

bool IsGoodText(const Json::Value& value) {
  const char* begin = nullptr;
  const char* end = nullptr;
  return !value.getString(&begin, &end) || IsUtf8({begin, static_cast<size_t>(end - begin)});
}

// Nearly always so, and then no second tree is made.
bool IsGood(const Json::Value& value) {
  if (value.isString()) {
    return IsGoodText(value);
  }
  for (auto member = value.begin(); member != value.end(); ++member) {
    if ((value.isObject() && !IsUtf8(member.name())) || !IsGood(*member)) {
      return false;
    }
  }
  return true;
}

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
  if (!IsGood(json)) {
    return Repaired(json);
  }
  return json;
}

}  // namespace owner
