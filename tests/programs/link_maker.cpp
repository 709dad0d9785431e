// Creates a link as the tests of the programs want it: reads a JSON object with members of the
// link's JSON form from standard input, and prints the link's hash. A member "password" is the
// link's password in the clear. Of a list of such objects all are created, in that order.
#include <json/json.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <iostream>
#include <string>
#include <vector>

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

std::vector<std::string> Texts(const Json::Value& array) {
  std::vector<std::string> texts;
  for (const Json::Value& item : array) {
    texts.push_back(item.asString());
  }
  return texts;
}

Entry::ProtectType ProtectTypeOf(const std::string& text) {
  if (text == "password") {
    return Entry::PROTECT_PASSWORD;
  }
  return text == "user" ? Entry::PROTECT_USER : Entry::PROTECT_NONE;
}

Entry::RedirectType RedirectTypeOf(const std::string& text) {
  if (text == "always") {
    return Entry::REDIRECT_ALWAYS;
  }
  return text == "url_param" ? Entry::REDIRECT_URLPARAM : Entry::REDIRECT_NONE;
}

Entry EntryOf(const Json::Value& wanted) {
  Entry entry;
  entry.set_project_name(wanted.get("project_name", "file").asString())
      .set_owner_user(wanted.get("owner_user", "alice").asString())
      .set_enabled(wanted.get("enabled", true).asBool())
      .set_start_at(static_cast<long>(wanted.get("start_at", 0).asInt64()))
      .set_expire_at(static_cast<long>(wanted.get("expire_at", 0).asInt64()))
      .set_expire_times(wanted.get("expire_times", 0).asInt())
      .set_use_count(wanted.get("use_count", 0).asInt())
      .set_auto_gc(wanted.get("auto_gc", true).asBool())
      .set_enable_match_ip(wanted.get("enable_match_ip", true).asBool())
      .set_protect_type(ProtectTypeOf(wanted.get("protect_type", "none").asString()))
      .set_protect_title(wanted.get("protect_title", "").asString())
      .set_protect_users(Texts(wanted["protect_users"]))
      .set_protect_groups(Texts(wanted["protect_groups"]))
      .set_redirect_type(RedirectTypeOf(wanted.get("redirect_type", "none").asString()))
      .set_redirect_uri(wanted.get("redirect_uri", "").asString())
      .set_app(wanted.get("app", Json::Value(Json::objectValue)));
  if (wanted.isMember("password")) {
    entry.set_protect_password(wanted["password"].asString(), true, Entry::ENCRYPT_ALGO_DEFAULT);
  }
  return entry;
}

bool Create(const Json::Value& wanted) {
  Entry entry = EntryOf(wanted);
  if (!EntryDB(SharingDB::Instance()).CreateWithHash(entry)) {
    std::cerr << "the link could not be created\n";
    return false;
  }
  std::cout << entry.get_hash() << '\n';
  return true;
}

}  // namespace

int main() {
  Json::Value wanted;
  std::cin >> wanted;
  if (wanted.isArray()) {
    return std::all_of(wanted.begin(), wanted.end(), Create) ? 0 : 1;
  }
  return Create(wanted) ? 0 : 1;
}
