// The rows of one statement, held as text.
#ifndef PLATFORM_SRC_DATABASE_RESULT_H_
#define PLATFORM_SRC_DATABASE_RESULT_H_

#include <tuvoplatform/database.h>

#include <cstddef>
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

  // To be called behind the last row: gives back the room that was made for more rows.
  void Finish();

  // Stores the index of the next row in `*row` and moves on; false when there is none.
  bool NextRow(unsigned int* row);

  // The text of a cell, valid as long as the result; empty when there is no such row or column. Of
  // columns of the same name it is the first one's.
  const char* Field(unsigned int row, const char* name);

 private:
  void AddText(const char* text);
  const char* Text(std::size_t row, std::size_t column) const;
  std::size_t ColumnOf(const char* name) const;

  const std::size_t columns_;
  std::string text_;                // zero-terminated texts
  std::vector<std::size_t> cells_;  // offsets into text_: the columns' names, then row by row
  unsigned int rows_ = 0;
  unsigned int next_ = 0;
  bool names_differ_ = true;
  std::size_t expected_ = 0;  // columns are mostly asked for in their order
};

#endif  // PLATFORM_SRC_DATABASE_RESULT_H_
