// The operations that the stores of all tables share.
#ifndef TUVOSHARING_OBJECT_DB_H_
#define TUVOSHARING_OBJECT_DB_H_

#include <tuvosharing/export.h>

#include <memory>
#include <vector>

namespace TUVO::sharing {
namespace record {
class Object;
}

namespace db {

class BaseDB;
class Condition;

// Knows no table's columns: it works through the operations of the record base. Operations answer
// true on success; a refused record or a failed insert, update or delete writes a line to the log.
// They throw nothing: lack of memory is a failure.
class TUVOSHARING_API ObjectDB {
 public:
  ObjectDB(const ObjectDB&) = delete;
  ObjectDB& operator=(const ObjectDB&) = delete;
  // Checkpoints the database's write-ahead log, so that every short-lived store leaves a short log.
  virtual ~ObjectDB();

  // Inserts a legal record and sets its id; a refused or failed one keeps the id it had.
  virtual bool Create(record::Object& obj);
  // Writes every column of a legal record to the row with its id; true also when there is no such
  // row.
  virtual bool Update(const record::Object& obj);
  // Deletes a row; true also when there is no such row. The second form is the first with the
  // record's id.
  virtual bool Delete(int id);
  virtual bool Delete(const record::Object& obj);
  // Loads row `id`. False when there is none (`obj` untouched), and when the row loads as not legal
  // (`obj` filled).
  virtual bool GetById(int id, record::Object& obj) const;
  // The number of rows under the condition, which is cleared in any case. `count` is untouched on
  // failure.
  virtual bool Count(int& count) const;

  // The filter of the next Count or Query. Owned by the store.
  Condition& GetCondition() const;

  // Replaces `out` by the rows under the condition, which is cleared in any case. Rows that load as
  // not legal are left out; true also when no row is left. `out` is untouched on failure. Exists
  // for Entry, Session and Token.
  template <typename Record>
  bool Query(std::vector<Record>& out) const;

 protected:
  // `db` must outlive the store; `table` is a literal.
  ObjectDB(BaseDB& db, const char* table);

 private:
  BaseDB* db_;
  const char* table_;
  int flag_ = 1;  // 1 in every store; kept for derived stores, read by nothing here
  std::unique_ptr<Condition> condition_;

 protected:
  // The database that the store works on.
  BaseDB& GetDB() const { return *db_; }
  // The table's name.
  const char* GetTable() const { return table_; }
  // 1 in every store.
  int GetFlag() const { return flag_; }
};

}  // namespace db
}  // namespace TUVO::sharing

#endif  // TUVOSHARING_OBJECT_DB_H_
