#include "create.h"

#include <json/value.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <ctime>
#include <iostream>

namespace demo {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr const char* kPassword = "tea and biscuits";
constexpr int kThreeUses = 3;
constexpr long kOneDay = 86400;

Entry FileLink(const std::string& path, const std::string& owner) {
  Json::Value app(Json::objectValue);
  app["path"] = path;
  Entry entry;
  entry.set_project_name("file").set_owner_user(owner).set_app(app);
  return entry;
}

bool Create(const char* kind, Entry entry) {
  EntryDB store(SharingDB::Instance());
  if (!store.CreateWithHash(entry)) {
    std::cerr << "the link \"" << kind << "\" could not be created; the system log says why\n";
    return false;
  }
  std::cout << kind << '\t' << entry.get_hash() << '\n';
  return true;
}

}  // namespace

bool CreateLinks(const std::string& path, const std::string& owner) {
  const Entry open = FileLink(path, owner);

  Entry password = open;
  password.set_protect_type(Entry::PROTECT_PASSWORD)
      .set_protect_title("The summer report")
      .set_protect_password(kPassword, true, Entry::ENCRYPT_ALGO_DEFAULT);

  Entry accounts = open;
  accounts.set_protect_type(Entry::PROTECT_USER)
      .set_protect_title("The summer report, for colleagues")
      .set_protect_users({"alice"})
      .set_protect_groups({"administrators"});

  Entry limited = open;
  // Not purged once used up: its address goes on saying so.
  limited.set_protect_title("For three readers").set_expire_times(kThreeUses).set_auto_gc(false);

  Entry timed = open;
  timed.set_protect_title("Until tomorrow").set_expire_at(std::time(nullptr) + kOneDay);

  Entry ended = open;
  ended.set_auto_gc(false).set_expire_at(std::time(nullptr) - kOneDay);

  Entry redirect = open;
  redirect.set_protect_title("Leads on to another web site")
      .set_redirect_type(Entry::REDIRECT_ALWAYS)
      .set_redirect_uri("https://www.debian.org/");

  Entry other = open;
  other.set_project_name("album").set_protect_title("Pictures");

  return Create("open", open) && Create("password", password) && Create("accounts", accounts) &&
         Create("limited", limited) && Create("timed", timed) && Create("ended", ended) &&
         Create("redirect", redirect) && Create("other", other);
}

}  // namespace demo
