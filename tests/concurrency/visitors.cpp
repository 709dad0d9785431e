#include "concurrency/visitors.h"

#include <json/value.h>
#include <tuvosharing/login.h>
#include <tuvosharing/sharing_db.h>

#include <array>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <stdexcept>
#include <thread>

#include "concurrency/crew.h"

namespace tuvo_test {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr unsigned int kOwner = 2001;

_tag_sharing_login_params Params(const std::string& hash, const std::string& session_id) {
  return {hash.c_str(), nullptr, nullptr, nullptr,
          session_id.empty() ? nullptr : session_id.c_str()};
}

bool MetAnotherWriter(const SharingDB& db) {
  return db.GetLastError().find("locked") != std::string::npos;
}

bool ReadAndWrite(EntryDB& links, const std::string& hash,
                  const std::function<void(Entry&)>& change) {
  Entry link;
  if (!links.GetByHash(hash, link)) {
    return false;
  }
  change(link);
  return links.Update(link);
}

}  // namespace

void ClearSharingFolder() {
  for (const auto& file : std::filesystem::directory_iterator(kSharingFolder)) {
    std::filesystem::remove(file.path());
  }
}

void ServeAddress(const std::string& address) {
  clearenv();
  setenv("REMOTE_ADDR", address.c_str(), 1);
}

std::string AddressOf(int process) {
  return "192.0.2." + std::to_string(process + 1);
}

Entry OpenLink() {
  Entry link;
  link.set_project_name("photo").set_owner_uid(kOwner).set_app(Json::Value(Json::objectValue));
  link.set_auto_gc(false);
  return link;
}

std::string StoreLink(const std::function<void(Entry&)>& change) {
  const Shared<std::array<char, kNameRoom>> hash;
  const pid_t maker = Start(kRoot, [&] {
    Entry link = OpenLink();
    change(link);
    const bool stored = EntryDB(SharingDB::Instance()).CreateWithHash(link);
    std::strncpy(hash->data(), link.get_hash().c_str(), kNameRoom - 1);
    return stored ? 0 : 1;
  });
  if (Wait(maker) != 0) {
    throw std::runtime_error("no link");
  }
  return hash->data();
}

int Login(const std::string& hash, const std::string& brought, std::string& session_id) {
  _tag_sharing_login_params params = Params(hash, brought);
  return TUVO::TuvoSharingLogin(session_id, &params, false);
}

int Check(const std::string& hash, const std::string& session_id) {
  const _tag_sharing_login_params params = Params(hash, session_id);
  return TUVO::TuvoSharingIsAuthorized(&params);
}

bool ChangeLink(const std::string& hash, Reading reading,
                const std::function<void(Entry&)>& change) {
  SharingDB& db = SharingDB::Instance();
  EntryDB links(db);  // ends, and checkpoints, behind the transaction
  for (;;) {
    if (!db.Begin()) {
      return false;
    }
    if (reading == Reading::kAfterAWrite && !db.Execute("DELETE FROM entry WHERE 0")) {
      db.Execute("ROLLBACK");
      return false;
    }
    if (ReadAndWrite(links, hash, change)) {
      return db.Commit();
    }
    db.Execute("ROLLBACK");
    if (reading == Reading::kAfterAWrite || !MetAnotherWriter(db)) {
      return false;
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
}

}  // namespace tuvo_test
