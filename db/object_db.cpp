#include <internal/contained.h>
#include <internal/log.h>
#include <internal/lookup.h>
#include <internal/object_db_query.h>
#include <tuvosharing/object.h>
#include <tuvosharing/object_db.h>

namespace TUVO::sharing::db {

namespace {

bool IsLegal(const record::Object& obj) {
  return Contained([&] { return obj.IsLegal(); });
}

}  // namespace

ObjectDB::ObjectDB(BaseDB& db, const char* table)
    : db_(&db), table_(table), condition_(std::make_unique<Condition>(db)) {}

ObjectDB::~ObjectDB() {
  db_->ExecuteWALCheckPoint();
}

bool ObjectDB::Create(record::Object& obj) {
  if (!IsLegal(obj)) {
    SHARING_LOG_PID("obj invalid\n");
    return false;
  }
  if (!Contained([&] { return db_->Insert(table_, obj.GetFieldList()); })) {
    SHARING_LOG_PID("insert failed\n");
    return false;
  }
  int id = 0;
  if (!db_->GetLastInsertId(id)) {
    return false;
  }
  obj.set_id(id);
  return true;
}

bool ObjectDB::Update(const record::Object& obj) {
  if (!IsLegal(obj)) {
    SHARING_LOG_PID("obj invalid\n");
    return false;
  }
  if (!Contained([&] { return db_->Update(table_, obj.GetFieldMap(), obj.get_id()); })) {
    SHARING_LOG_PID("update failed\n");
    return false;
  }
  return true;
}

bool ObjectDB::Delete(int id) {
  if (!Contained([&] { return db_->Delete(table_, id); })) {
    SHARING_LOG_PID("delete failed\n");
    return false;
  }
  return true;
}

bool ObjectDB::Delete(const record::Object& obj) {
  return Delete(obj.get_id());
}

bool ObjectDB::GetById(int id, record::Object& obj) const {
  return Contained([&] {
    return FetchFirst(
        *db_, std::string("SELECT * FROM ") + table_ + " WHERE id = " + std::to_string(id), obj);
  });
}

bool ObjectDB::Count(int& count) const {
  const ClearedAfterUse clear(*condition_);
  return Contained([&] {
    Result result;
    Row row;
    if (!db_->Execute(std::string("SELECT COUNT(*) AS c FROM ") + table_ + condition_->GetSQL(),
                      result) ||
        !result.IsGood() || !result.NextRow(row)) {
      return false;
    }
    count = row.GetField("c").AsInt(0);
    return true;
  });
}

Condition& ObjectDB::GetCondition() const {
  return *condition_;
}

}  // namespace TUVO::sharing::db
