// ObjectDB's query for one record type; each store instantiates it for its own.
#ifndef INTERNAL_OBJECT_DB_QUERY_H_
#define INTERNAL_OBJECT_DB_QUERY_H_

#include <internal/contained.h>
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
    // Rows that memory does not suffice for are a failure, not rows that are not there.
    std::vector<Record> records;
    Row row;
    while (result.NextRow(row)) {
      Record record;
      if (record.FromRow(row)) {
        records.push_back(record);
      }
    }
    out = std::move(records);
    return true;
  });
}

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_OBJECT_DB_QUERY_H_
