// Owners for what the database interface hands out, and short ways to ask for a value.
#ifndef TESTS_PLATFORM_DATABASE_HANDLES_H_
#define TESTS_PLATFORM_DATABASE_HANDLES_H_

#include <tuvoplatform/database.h>

#include <memory>
#include <string>

namespace tuvo_test {

struct CloseDb {
  void operator()(TUVODB* db) const { TUVODBClose(db); }
};
using Db = std::unique_ptr<TUVODB, CloseDb>;

struct FreeResult {
  void operator()(DBResult* result) const { TUVODBFreeResult(result); }
};
using Rows = std::unique_ptr<DBResult, FreeResult>;

inline Db Connect(const std::string& path) {
  return Db(TUVODBConnect("", "", "", path.c_str()));
}

inline int Execute(const Db& db, const std::string& sql) {
  return TUVODBExecute(db.get(), sql.c_str(), nullptr);
}

// The rows of `sql`; null when it failed or cannot return rows.
inline Rows Query(const Db& db, const std::string& sql) {
  DBResult* result = nullptr;
  TUVODBExecute(db.get(), sql.c_str(), &result);
  return Rows(result);
}

// The column `value` of the first row of `sql`, "(no result)" when there is no result at all.
inline std::string Value(const Db& db, const std::string& sql) {
  const Rows rows = Query(db, sql);
  return rows == nullptr ? "(no result)" : TUVODBFetchField(rows.get(), 0, "value");
}

inline std::string Error(const Db& db) {
  return TUVODBErrorGet(db.get());
}

}  // namespace tuvo_test

#endif  // TESTS_PLATFORM_DATABASE_HANDLES_H_
