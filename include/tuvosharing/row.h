// A view of one row of a Result; must not outlive it.
#ifndef TUVOSHARING_ROW_H_
#define TUVOSHARING_ROW_H_

#include <tuvosharing/export.h>
#include <tuvosharing/field.h>

#include <string>

struct DBResult_tag;

namespace TUVO::sharing::db {

// What Result::NextRow fills: cheap to make, to copy and to point elsewhere.
class TUVOSHARING_API Row {
 public:
  // No row: every field reads as the empty text.
  Row();
  // Row number `row` of `result`, which is borrowed and never freed here.
  Row(DBResult_tag* result, unsigned int row);
  // A copy is a view of the same row.
  Row(const Row&) = default;
  Row& operator=(const Row&) = default;
  virtual ~Row();

  // True when there is a result behind the row.
  bool IsGood() const;

  // Point the view at another result (borrowed, null for none) or at another row of the same.
  void SetResult(DBResult_tag* result);
  void SetRow(unsigned int row);

  // The named column's text; empty for NULL, for an unknown column and when the row is not good.
  Field GetField(const std::string& name) const;

 private:
  friend class RowValues;

  DBResult_tag* result_;
  unsigned int row_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_ROW_H_
