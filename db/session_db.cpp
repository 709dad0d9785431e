#include <internal/contained.h>
#include <internal/escaped.h>
#include <internal/lookup.h>
#include <internal/object_db_query.h>
#include <internal/purge.h>
#include <internal/session_db_private.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/object.h>
#include <tuvosharing/session_db.h>

namespace TUVO::sharing::db {

template bool ObjectDB::Query<record::Session>(std::vector<record::Session>& out) const;

SessionDBPrivate::SessionDBPrivate(BaseDB& db) : ObjectDB(db, "session") {}

bool SessionDBPrivate::Delete(int id) {
  return ObjectDB::Delete(id);
}

bool SessionDBPrivate::CreateWithSessionId(record::Session& session) {
  static RANDOM::TUVORandom random;
  int attempt = 0;
  bool created = false;
  do {
    ++attempt;
    created = Contained([&] {
      std::string session_id;
      random.getString(RANDOM::POOL_URL_FRIENDLY, static_cast<unsigned int>(SHARING_SESSION_LENGTH),
                       session_id);
      session.set_session_id(session_id);
      return Create(session.GetObject());
    });
  } while (SHARING_MAX_RETRY_TIMES >= attempt && !created);
  return created;
}

bool SessionDBPrivate::GetBySessionId(const std::string& sessionId,
                                      record::Session& session) const {
  return Contained([&] {
    return FetchFirst(GetDB(),
                      std::string("SELECT * FROM ") + GetTable() + " WHERE session_id = '" +
                          Escaped(GetDB(), sessionId) + "'",
                      session);
  });
}

bool SessionDBPrivate::DeleteBySessionId(const std::string& sessionId) {
  return Contained([&] {
    return GetDB().Execute(std::string("DELETE FROM ") + GetTable() + " WHERE session_id = '" +
                               Escaped(GetDB(), sessionId) + "'",
                           nullptr);
  });
}

bool SessionDBPrivate::PurgeExpired(float probability) {
  return PurgeTimedOut(GetDB(), GetTable(), probability);
}

SessionDB::SessionDB(BaseDB& db) : p_(std::make_unique<SessionDBPrivate>(db)) {}

SessionDB::~SessionDB() = default;

bool SessionDB::Create(record::Session& session) {
  return p_->Create(session.GetObject());
}

bool SessionDB::Update(const record::Session& session) {
  return p_->Update(session.GetCObject());
}

bool SessionDB::Delete(int id) {
  return p_->Delete(id);
}

bool SessionDB::Delete(const record::Session& session) {
  return p_->Delete(session.get_id());
}

bool SessionDB::GetById(int id, record::Session& session) const {
  return p_->GetById(id, session.GetObject());
}

Condition& SessionDB::GetCondition() const {
  return p_->GetCondition();
}

bool SessionDB::Count(int& count) const {
  return p_->Count(count);
}

bool SessionDB::Query(std::vector<record::Session>& sessions) const {
  return p_->Query(sessions);
}

bool SessionDB::CreateWithSessionId(record::Session& session) {
  return p_->CreateWithSessionId(session);
}

bool SessionDB::GetBySessionId(const std::string& sessionId, record::Session& session) const {
  return p_->GetBySessionId(sessionId, session);
}

bool SessionDB::DeleteBySessionId(const std::string& sessionId) {
  return p_->DeleteBySessionId(sessionId);
}

bool SessionDB::PurgeExpired(float probability) {
  return p_->PurgeExpired(probability);
}

}  // namespace TUVO::sharing::db
