#include "cli/database.h"

#include <tuvosharing/row.h>

#include <cstdlib>

#include "cli/failure.h"

namespace cli {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;

SharingDB& Database() {
  SharingDB& db = SharingDB::Instance();
  if (!db.IsGood()) {
    throw Failure(ExitStatus::kFailed, "the database cannot be opened; the system log says why");
  }
  return db;
}

Result Query(BaseDB& db, const std::string& sql) {
  Result result;
  if (!db.Execute(sql, result)) {
    throw Failure(ExitStatus::kFailed, "the database failed: " + db.GetLastError());
  }
  return result;
}

long long Number(BaseDB& db, const std::string& sql) {
  Result result = Query(db, sql);
  Row row;
  if (!result.NextRow(row)) {
    throw Failure(ExitStatus::kFailed, "the database has no answer");
  }
  return std::strtoll(row.GetField("value").AsString("").c_str(), nullptr, 10);
}

}  // namespace cli
