#include <internal/log.h>
#include <internal/run_as.h>
#include <internal/sharing_db_private.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/result.h>
#include <tuvosharing/sharing_db.h>

#include <fstream>
#include <sstream>

namespace TUVO::sharing::db {

namespace {

constexpr int kCurrentVersion = 2;
constexpr unsigned int kMode = 0660;
constexpr char kSchemaFolder[] = "/usr/tuvo/share/tuvosharing/db_schema";

}  // namespace

SharingDBPrivate::SharingDBPrivate(SharingDB* db) : pdb_(db), migrated_(Migration()) {}

bool SharingDBPrivate::Migration() {
  Result result;
  Row row;
  // clang-format off
  SHARING_RETURN_FALSE_IF(!pdb_->Execute("PRAGMA user_version", result));
  // clang-format on
  if (!result.NextRow(row) || !row.IsGood()) {
    SHARING_LOG_PID("user_version is not correct\n\n");
    return false;
  }
  // A file of a newer schema is left to those who know it: the loop is never entered. It counts by
  // the version reached, since the one after the greatest is no int.
  for (int version = row.GetField("user_version").AsInt(0); version < kCurrentVersion; ++version) {
    if (!MigrateTo(version + 1)) {
      SHARING_LOG_PID("cannot migrate from %d to %d\n\n", version, version + 1);
      return false;
    }
  }
  return true;
}

bool SharingDBPrivate::MigrateTo(int version) {
  const std::string path = std::string(kSchemaFolder) + "/" + std::to_string(version) + ".sql";
  std::ifstream file;
  IF_RUN_AS(kSystemUid, kSystemGid) {
    file.open(path);
  }
  else {
    SHARING_LOG_PID("failed to run as system\n\n");
    return false;
  }
  std::stringstream sstr;
  // An empty script is none to copy: copying nothing counts as a failure.
  if (file.is_open() && file.peek() != std::ifstream::traits_type::eof()) {
    sstr << file.rdbuf();
  }
  // A folder opens and fails on the first reading, a broken disk perhaps later.
  if (!file.is_open() || file.bad() || sstr.fail()) {
    SHARING_LOG_PID("file %s open failed %s.\n\n", path.c_str(), internal::ErrorText().c_str());
    return false;
  }
  // clang-format off
  // cppcheck-suppress stlcstrParam  ; the condition's text is logged and searched for
  SHARING_RETURN_FALSE_IF(!pdb_->Execute(sstr.str().c_str()));
  // clang-format on
  return true;
}

SharingDB& SharingDB::Instance() {
  static SharingDB instance;
  return instance;
}

SharingDB::SharingDB() : SharingDB(SZF_SHARING_DB_PATH) {}

SharingDB::SharingDB(const std::string& path)
    : BaseDB(path, kMode), p_(std::make_unique<SharingDBPrivate>(this)) {}

SharingDB::~SharingDB() = default;

bool SharingDB::IsGood() const {
  return p_->IsMigrated() && BaseDB::IsGood();
}

bool SharingDB::IsRoot() const {
  return BaseDB::IsRoot();
}

bool SharingDB::MoveRootDB() const {
  return BaseDB::MoveRootDB();
}

}  // namespace TUVO::sharing::db
