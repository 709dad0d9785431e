// What a store asks of a record.
#ifndef TUVOSHARING_OBJECT_H_
#define TUVOSHARING_OBJECT_H_

#include <json/forwards.h>
#include <tuvosharing/export.h>

#include <map>
#include <string>
#include <vector>

namespace TUVO::sharing {
namespace db {
class Row;
}

namespace record {

// A row of one table. Value texts are bare: quoting and escaping is the database layer's business.
class TUVOSHARING_API Object {
 public:
  virtual ~Object();

  // The column values as text, in table column order, without the id.
  virtual std::vector<std::string> GetFieldList() const = 0;

  // The same values by column name.
  virtual std::map<std::string, std::string> GetFieldMap() const = 0;

  // Whether the record may be stored and, after a read, used. Logs the first reason against it.
  virtual bool IsLegal() const = 0;

  // Writes the record's public members into `value`.
  virtual void ToJSON(Json::Value& value) const = 0;

  // Loads every column and answers IsLegal(): false with the fields loaded all the same.
  virtual bool FromRow(const db::Row& row) = 0;

  // The row's id in its table; 0 while it is not stored.
  int get_id() const { return id_; }
  void set_id(int id) { id_ = id; }

 protected:
  // Usable, not stored, without a key.
  Object();
  // Copies and moves take all three members; a moved-from object keeps its numbers.
  Object(const Object&);
  Object(Object&&) noexcept;
  Object& operator=(const Object&);
  Object& operator=(Object&&) noexcept;

  bool blValid_ = true;  // false while the record is known to be unusable
  int id_ = 0;           // the row's id
  std::string key_;      // the record's unique random text, if its kind has one
};

}  // namespace record
}  // namespace TUVO::sharing

#endif  // TUVOSHARING_OBJECT_H_
