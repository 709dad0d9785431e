// The rows of one statement, held as text.
#ifndef PLATFORM_SRC_DATABASE_RESULT_H_
#define PLATFORM_SRC_DATABASE_RESULT_H_

#include <tuvoplatform/database.h>

#include <cstddef>
#include <functional>
#include <map>
#include <string>
#include <vector>

struct sqlite3_stmt;

// All texts lie in one buffer and a cell is an offset into it: a purge or a listing reads rows by
// the hundred thousand, and an allocation for every cell would cost more than the reading.
struct DBResult_tag {
 public:
  // Takes the column names of `statement`, which has been stepped at least once: the first step may
  // prepare the statement anew, with other columns.
  explicit DBResult_tag(sqlite3_stmt* statement);

  // Copies the row that `statement` stands on. Throws std::bad_alloc or std::length_error when it
  // does not fit.
  void AddRow(sqlite3_stmt* statement);

  // Stores the index of the next row in `*row` and moves on; false when there is none.
  bool NextRow(unsigned int* row);

  // The text of a cell; empty when there is no such row or column.
  const char* Field(unsigned int row, const char* name) const;

 private:
  const int columns_;
  std::map<std::string, std::size_t, std::less<>> column_of_;  // the first of equal names
  std::string text_;                                           // zero-terminated cell texts
  std::vector<std::size_t> cells_;                             // row by row, offsets into text_
  unsigned int rows_ = 0;
  unsigned int next_ = 0;
};

#endif  // PLATFORM_SRC_DATABASE_RESULT_H_
