// Fetching the one record that a statement names.
#ifndef INTERNAL_LOOKUP_H_
#define INTERNAL_LOOKUP_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>

#include <string>

namespace TUVO::sharing::db {

// Fills `record` (anything with FromRow) from the statement's first row and returns what FromRow
// answers. False, `record` untouched, when the statement fails or returns no row.
template <typename Record>
bool FetchFirst(BaseDB& db, const std::string& sql, Record& record) {
  Result result;
  Row row;
  return db.Execute(sql, result) && result.IsGood() && result.NextRow(row) && record.FromRow(row);
}

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_LOOKUP_H_
