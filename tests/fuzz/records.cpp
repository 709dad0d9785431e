// What is stored comes back: records of any texts and numbers are created, changed and found again
// through the stores, with everything else in the file as it was.
//
// Input: the record (0 link, 1 session, 2 token), then its values, a line each; then, for a link,
// the values to change it to.
#include <json/reader.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/token.h>
#include <tuvosharing/token_db.h>

#include <algorithm>
#include <memory>
#include <string>
#include <vector>

#include "fixed_time.h"
#include "lines.h"
#include "links_database.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;

// Rows that nothing here may touch.
void Reset() {
  fuzz::Run(
      "BEGIN;DELETE FROM token;DELETE FROM session;DELETE FROM entry;DELETE FROM sqlite_sequence;"
      "INSERT INTO entry VALUES (1,'kept','kept',1,1,0,0,0,0,0,'{}');"
      "INSERT INTO session VALUES (1,'kept',1,'kept',1);"
      "INSERT INTO token VALUES (1,1,1,1);COMMIT");
}

std::string Kept() {
  return fuzz::Column("SELECT id || hash || project_name || data AS c FROM entry WHERE id = 1") +
         fuzz::Column("SELECT id || session_id || ip AS c FROM session WHERE id = 1") +
         fuzz::Column(
             "SELECT id || entry_id || session_id || timeout AS c FROM token WHERE id = 1") +
         fuzz::Column("SELECT count(*) AS c FROM sqlite_schema");
}

int Int(fuzz::Lines* lines) {
  return static_cast<int>(lines->Number());
}

std::vector<std::string> Names(fuzz::Lines* lines) {
  std::vector<std::string> names;
  for (std::size_t count = lines->Choice(4); count != 0; --count) {
    names.push_back(lines->Text());
  }
  return names;
}

std::vector<unsigned int> Ids(fuzz::Lines* lines) {
  std::vector<unsigned int> ids;
  for (std::size_t count = lines->Choice(4); count != 0; --count) {
    ids.push_back(static_cast<unsigned int>(lines->Number()));
  }
  return ids;
}

// So deep may a link's document be that is loaded again, the object that holds it counted.
constexpr int kDeepest = 100;

// A document, or an object of the text when it is none.
Json::Value Object(fuzz::Lines* lines) {
  const std::string text = lines->Text();
  Json::CharReaderBuilder builder;
  builder["allowSpecialFloats"] = true;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  if (reader->parse(text.data(), text.data() + text.size(), &value, nullptr)) {
    return value;
  }
  Json::Value object(Json::objectValue);
  object[text] = text;
  return object;
}

void Fill(fuzz::Lines* lines, Entry* entry) {
  entry->set_hash(lines->Text());
  entry->set_project_name(lines->Text());
  entry->set_enabled(lines->Flag());
  entry->set_owner_uid(static_cast<unsigned int>(lines->Number()));
  entry->set_start_at(static_cast<long>(lines->Number()));
  entry->set_expire_at(static_cast<long>(lines->Number()));
  entry->set_expire_times(Int(lines));
  entry->set_use_count(Int(lines));
  entry->set_auto_gc(lines->Flag());
  entry->set_enable_match_ip(lines->Flag());
  entry->set_protect_type(static_cast<Entry::ProtectType>(lines->Choice(3)));
  entry->set_protect_title(lines->Text());
  const std::string password = lines->Text();
  const bool hash = lines->Flag();
  entry->set_protect_password(password, hash,
                              static_cast<Entry::PasswordEncryptAlgo>(lines->Choice(2)));
  entry->set_protect_users(Names(lines));
  if (lines->Flag()) {
    entry->set_protect_uids(Ids(lines));
  }
  entry->set_protect_groups(Names(lines));
  if (lines->Flag()) {
    entry->set_protect_gids(Ids(lines));
  }
  entry->set_redirect_type(static_cast<Entry::RedirectType>(lines->Choice(3)));
  entry->set_redirect_uri(lines->Text());
  entry->set_app(Object(lines));
  entry->set_private_data(Object(lines));
}

void Fill(fuzz::Lines* lines, Session* session) {
  session->set_session_id(lines->Text());
  session->set_uid(static_cast<unsigned int>(lines->Number()));
  session->set_ip(lines->Text());
  session->set_timeout(static_cast<long>(lines->Number()));
}

void Fill(fuzz::Lines* lines, Token* token) {
  token->set_entry_id(static_cast<int>(lines->Choice(3)));
  token->set_session_id(static_cast<int>(lines->Choice(3)));
  token->set_timeout(static_cast<long>(lines->Number()));
}

template <typename Record>
std::string Shown(const Record& record) {
  std::string text = std::to_string(record.get_id());
  for (const std::string& field : record.GetFieldList()) {
    text += "|" + std::string(field.c_str());  // a zero byte ends what is stored in a column
  }
  return text;
}

bool LeavesZero(const std::vector<std::string>& fields) {
  for (const std::string& field : fields) {
    // Nothing is left of a text that begins with a zero byte.
    if (!field.empty() && field.front() == '\0') {
      return true;
    }
  }
  return false;
}

// How many values are open in one another at most.
int Depth(const Json::Value& value) {
  int deepest = 0;
  for (const Json::Value& member : value) {
    deepest = std::max(deepest, Depth(member));
  }
  return deepest + 1;
}

// Whether a legal record has to load again as legal.
bool MustLoad(const Entry& entry) {
  return std::max(Depth(entry.get_app()), Depth(entry.get_private_data())) < kDeepest &&
         !LeavesZero(entry.GetFieldList());
}

bool MustLoad(const Session& session) {
  return !LeavesZero(session.GetFieldList());
}

bool MustLoad(const Token& /*token*/) {
  return true;
}

void CheckFound(EntryDB* store, const Entry& entry) {
  const std::string hash = entry.get_hash().c_str();
  Entry found;
  Require(store->GetByHash(entry.get_hash(), found), "a link is found by its hash");
  RequireEqual(Shown(found), Shown(entry), "a link that is found by its hash");
  if (hash == entry.get_hash() && entry.get_protect_type() == Entry::PROTECT_PASSWORD) {
    RequireEqual(found.get_protect_password() + found.get_protect_password_salt(),
                 entry.get_protect_password() + entry.get_protect_password_salt(),
                 "a link's password is kept");
  }
}

void CheckFound(SessionDB* store, const Session& session) {
  Session found;
  Require(store->GetBySessionId(session.get_session_id(), found),
          "a session is found by its identifier");
  RequireEqual(Shown(found), Shown(session), "a session that is found by its identifier");
}

void CheckFound(TokenDB* /*store*/, const Token& /*token*/) {}

template <typename Store, typename Record>
void CheckStored(Store* store, const Record& record) {
  Record found;
  const bool loaded = store->GetById(record.get_id(), found);
  if (!MustLoad(record)) {
    return;
  }
  Require(loaded, "a record that was stored loads");
  RequireEqual(Shown(found), Shown(record), "a record that was stored");
  CheckFound(store, record);
}

template <typename Store, typename Record>
void Check(fuzz::Lines* lines) {
  Store store(fuzz::Links());
  Record record;
  Fill(lines, &record);
  const bool created = store.Create(record);
  Require(record.IsLegal() || !created, "only legal records are created");
  Require((record.get_id() != 0) == created, "a record that was created has its id");
  if (!created) {
    return;
  }
  CheckStored(&store, record);
  if (!lines->AtEnd()) {
    Record changed = record;
    Fill(lines, &changed);
    const bool updated = store.Update(changed);
    Require(changed.IsLegal() || !updated, "only legal records are written");
    CheckStored(&store, updated ? changed : record);
  }
  Require(store.Delete(record), "a record is deleted");
  Record gone;
  Require(!store.GetById(record.get_id(), gone) && gone.get_id() == 0,
          "a deleted record is not there");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  Reset();
  static const std::string kept = Kept();
  fuzz::Lines lines(data, size);
  const std::size_t kind = lines.Choice(3);
  if (kind == 0) {
    Check<EntryDB, Entry>(&lines);
  } else if (kind == 1) {
    Check<SessionDB, Session>(&lines);
  } else {
    Check<TokenDB, Token>(&lines);
  }
  RequireEqual(Kept(), kept, "other rows, and the schema, stay");
  return 0;
}
