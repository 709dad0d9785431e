// What one statement returned.
#ifndef TUVOSHARING_RESULT_H_
#define TUVOSHARING_RESULT_H_

#include <tuvosharing/export.h>
#include <tuvosharing/row.h>

struct DBResult_tag;

namespace TUVO::sharing::db {

// Owns the platform's result handle and walks its rows. Lives on the caller's stack for one
// statement.
class TUVOSHARING_API Result {
 public:
  // Holds no handle.
  Result();
  // Takes ownership of the handle; null is "none".
  explicit Result(DBResult_tag* result);
  // The source is left without a handle. A handle held by the target of an assignment is freed.
  Result(Result&& other) noexcept;
  Result& operator=(Result&& other) noexcept;
  Result(const Result&) = delete;
  Result& operator=(const Result&) = delete;
  // Frees the handle.
  virtual ~Result();

  // True when a handle is held: the statement could return rows, whether or not it returned any.
  bool IsGood() const;

  // Takes ownership of the handle. One that was held before is NOT freed: give each statement a
  // fresh Result.
  void SetResult(DBResult_tag* result);

  // Steps to the next row and points `row` at it; false, with `row` untouched, when there is none.
  bool NextRow(Row& row);

 private:
  unsigned int row_;
  DBResult_tag* result_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_RESULT_H_
