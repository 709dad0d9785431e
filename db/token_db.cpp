#include <internal/contained.h>
#include <internal/lookup.h>
#include <internal/object_db_query.h>
#include <internal/purge.h>
#include <internal/token_db_private.h>
#include <tuvosharing/object.h>
#include <tuvosharing/token_db.h>

namespace TUVO::sharing::db {

template bool ObjectDB::Query<record::Token>(std::vector<record::Token>& out) const;

TokenDBPrivate::TokenDBPrivate(BaseDB& db) : ObjectDB(db, "token") {}

bool TokenDBPrivate::Delete(int id) {
  return ObjectDB::Delete(id);
}

bool TokenDBPrivate::GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                                       record::Token& token) const {
  return Contained([&] {
    return FetchFirst(GetDB(),
                      std::string("SELECT * FROM ") + GetTable() +
                          " WHERE session_id = " + std::to_string(session.get_id()) +
                          " AND entry_id = " + std::to_string(entry.get_id()),
                      token);
  });
}

bool TokenDBPrivate::PurgeByEntry(const record::Entry& entry) {
  return Contained([&] {
    return GetDB().Execute(std::string("DELETE FROM ") + GetTable() +
                               " WHERE entry_id = " + std::to_string(entry.get_id()),
                           nullptr);
  });
}

bool TokenDBPrivate::PurgeExpired(float probability) {
  return PurgeTimedOut(GetDB(), GetTable(), probability);
}

TokenDB::TokenDB(BaseDB& db) : p_(std::make_unique<TokenDBPrivate>(db)) {}

TokenDB::~TokenDB() = default;

bool TokenDB::Create(record::Token& token) {
  return p_->Create(token.GetObject());
}

bool TokenDB::Update(const record::Token& token) {
  return p_->Update(token.GetCObject());
}

bool TokenDB::Delete(int id) {
  return p_->Delete(id);
}

bool TokenDB::Delete(const record::Token& token) {
  return p_->Delete(token.get_id());
}

bool TokenDB::GetById(int id, record::Token& token) const {
  return p_->GetById(id, token.GetObject());
}

Condition& TokenDB::GetCondition() const {
  return p_->GetCondition();
}

bool TokenDB::Count(int& count) const {
  return p_->Count(count);
}

bool TokenDB::Query(std::vector<record::Token>& tokens) const {
  return p_->Query(tokens);
}

bool TokenDB::GetBySessionEntry(const record::Session& session, const record::Entry& entry,
                                record::Token& token) const {
  return p_->GetBySessionEntry(session, entry, token);
}

bool TokenDB::PurgeByEntry(const record::Entry& entry) {
  return p_->PurgeByEntry(entry);
}

bool TokenDB::PurgeExpired(float probability) {
  return p_->PurgeExpired(probability);
}

}  // namespace TUVO::sharing::db
