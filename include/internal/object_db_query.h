// ObjectDB's query for one record type; each store instantiates it for its own.
#ifndef INTERNAL_OBJECT_DB_QUERY_H_
#define INTERNAL_OBJECT_DB_QUERY_H_

#include <internal/contained.h>
#include <internal/row_values.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/object_db.h>
#include <tuvosharing/result.h>

#include <string>
#include <utility>
#include <vector>

namespace TUVO::sharing::db {

// A filter serves one statement: clears it however the statement ends.
class ClearedAfterUse {
 public:
  explicit ClearedAfterUse(Condition& condition) : condition_(condition) {}
  ClearedAfterUse(const ClearedAfterUse&) = delete;
  ClearedAfterUse& operator=(const ClearedAfterUse&) = delete;
  ~ClearedAfterUse() { condition_.Clear(); }

 private:
  Condition& condition_;
};

template <typename Record>
bool ObjectDB::Query(std::vector<Record>& out) const {
  const ClearedAfterUse clear(*condition_);
  return Contained([&] {
    Result result;
    if (!db_->Execute(std::string("SELECT * FROM ") + table_ + condition_->GetSQL(), result) ||
        !result.IsGood()) {
      return false;
    }
    std::vector<Row> rows;
    for (Row row; result.NextRow(row);) {
      rows.push_back(row);
    }
    // Rows that memory does not suffice for are a failure, not rows that are not there. Room is
    // made once: a vector that grows copies every record each time.
    std::vector<Record> records;
    records.reserve(rows.size());
    for (const Row& row : rows) {
      RowValues(row).ForgetEarlier();  // or all records would be there beside all texts
      records.emplace_back();
      if (!records.back().FromRow(row)) {
        records.pop_back();
      }
    }
    out = std::move(records);
    return true;
  });
}

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_OBJECT_DB_QUERY_H_
