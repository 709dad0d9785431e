#include <internal/contained.h>
#include <internal/entry_db_private.h>
#include <internal/escaped.h>
#include <internal/lookup.h>
#include <internal/object_db_query.h>
#include <internal/user_id.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/object.h>
#include <tuvosharing/utils.h>

#include <ctime>

namespace TUVO::sharing::db {

namespace {

// After this many failed attempts the hash grows by one character.
constexpr int kAttemptsPerLength = 3;

// The clause of both purges, for the current second. A link is purged once its use count reaches
// its limit, one use before the link itself counts as used up.
std::string ExpiredClause() {
  return " ((expire_at != 0 AND expire_at < " + std::to_string(std::time(nullptr)) +
         ") OR (expire_times != 0 AND use_count >= expire_times))";
}

}  // namespace

template bool ObjectDB::Query<record::Entry>(std::vector<record::Entry>& out) const;

EntryDBPrivate::EntryDBPrivate(BaseDB& db) : ObjectDB(db, "entry") {}

bool EntryDBPrivate::Delete(int id) {
  return ObjectDB::Delete(id);
}

bool EntryDBPrivate::CreateWithHash(record::Entry& entry) {
  static RANDOM::TUVORandom random;
  auto length = static_cast<unsigned int>(SHARING_HASH_LENGTH);
  int attempt = 0;
  bool created = false;
  do {
    ++attempt;
    created = Contained([&] {
      std::string hash;
      random.getString(RANDOM::POOL_ALPHA_NUMERIC, length, hash);
      entry.set_hash(hash);
      return Create(entry.GetObject());
    });
    if (attempt % kAttemptsPerLength == 0) {
      ++length;
    }
  } while (SHARING_MAX_RETRY_TIMES >= attempt && !created);
  return created;
}

bool EntryDBPrivate::GetByHash(const std::string& hash, record::Entry& entry) const {
  return Contained([&] {
    return FetchFirst(GetDB(),
                      std::string("SELECT * FROM ") + GetTable() + " WHERE hash = '" +
                          Escaped(GetDB(), hash) + "'",
                      entry);
  });
}

bool EntryDBPrivate::DeleteByOwnerUid(unsigned int uid) {
  return Contained([&] {
    return GetDB().Execute(
        std::string("DELETE FROM ") + GetTable() + " WHERE owner_uid = " + std::to_string(uid),
        nullptr);
  });
}

bool EntryDBPrivate::PurgeExpired(float probability) {
  if (!IsProbabilityHit(probability)) {
    return true;
  }
  return Contained([&] {
    return GetDB().Execute(
        std::string("DELETE FROM ") + GetTable() + " WHERE auto_gc = 1 AND " + ExpiredClause(),
        nullptr);
  });
}

bool EntryDBPrivate::PurgeExpiredByOwnerProject(unsigned int uid, const std::string& project) {
  return Contained([&] {
    std::string sql = std::string("DELETE FROM ") + GetTable() + " WHERE";
    if (uid != UID_ERR) {
      sql += " owner_uid = " + std::to_string(uid) + " AND";
    }
    if (!project.empty()) {
      sql += " project_name = '" + Escaped(GetDB(), project) + "' AND";
    }
    return GetDB().Execute(sql + ExpiredClause(), nullptr);
  });
}

EntryDB::EntryDB(BaseDB& db) : p_(std::make_unique<EntryDBPrivate>(db)) {}

EntryDB::~EntryDB() = default;

bool EntryDB::Create(record::Entry& entry) {
  return p_->Create(entry.GetObject());
}

bool EntryDB::Update(const record::Entry& entry) {
  return p_->Update(entry.GetCObject());
}

bool EntryDB::Delete(int id) {
  return p_->Delete(id);
}

bool EntryDB::Delete(const record::Entry& entry) {
  return p_->Delete(entry.get_id());
}

bool EntryDB::GetById(int id, record::Entry& entry) const {
  return p_->GetById(id, entry.GetObject());
}

Condition& EntryDB::GetCondition() const {
  return p_->GetCondition();
}

bool EntryDB::Count(int& count) const {
  return p_->Count(count);
}

bool EntryDB::Query(std::vector<record::Entry>& entries) const {
  return p_->Query(entries);
}

bool EntryDB::CreateWithHash(record::Entry& entry) {
  return p_->CreateWithHash(entry);
}

bool EntryDB::GetByHash(const std::string& hash, record::Entry& entry) const {
  return p_->GetByHash(hash, entry);
}

bool EntryDB::GetByToken(const record::Token& token, record::Entry& entry) const {
  return p_->GetById(token.get_entry_id(), entry.GetObject());
}

bool EntryDB::DeleteByOwnerUid(unsigned int uid) {
  return p_->DeleteByOwnerUid(uid);
}

bool EntryDB::PurgeExpired(float probability) {
  return p_->PurgeExpired(probability);
}

bool EntryDB::PurgeExpiredByOwnerProject(unsigned int uid, const std::string& project) {
  return p_->PurgeExpiredByOwnerProject(uid, project);
}

}  // namespace TUVO::sharing::db
