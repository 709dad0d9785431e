// The rows of one statement, held as text.
#ifndef PLATFORM_SRC_DATABASE_RESULT_H_
#define PLATFORM_SRC_DATABASE_RESULT_H_

#include <tuvoplatform/database.h>

#include <cstddef>
#include <memory>
#include <vector>

struct sqlite3_stmt;

// Texts lie one behind the other in a few blocks: a purge or a listing reads rows by the hundred
// thousand, and an allocation for every cell would cost more than the reading. Blocks stay where
// they are while rows come in, and go one by one when rows are forgotten.
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

  // The text of a cell, valid as long as the result and until the row is forgotten; empty when
  // there is no such row or column. Of columns of the same name it is the first one's.
  const char* Field(unsigned int row, const char* name);

  // The rows before `row` are of no interest any more: they read as empty texts, and memory that
  // holds nothing else is freed.
  void Forget(unsigned int row);

 private:
  struct Block {
    std::unique_ptr<char[]> texts;
    unsigned int last_row;  // the last row that has a text in it
  };

  void AddText(const char* text);
  void AddBlock(std::size_t needed);
  const char* Text(std::size_t row, std::size_t column) const;
  std::size_t ColumnOf(const char* name) const;

  const std::size_t columns_;
  std::vector<const char*> cells_;  // the columns' names, then row by row
  std::vector<Block> blocks_;       // those with the names stay
  std::size_t forgotten_blocks_ = 0;
  std::size_t block_size_ = 0;  // of the last one
  char* free_ = nullptr;        // in the last one
  std::size_t left_ = 0;
  unsigned int rows_ = 0;
  unsigned int next_ = 0;
  unsigned int first_kept_ = 0;
  bool names_differ_ = true;
  std::size_t expected_ = 0;  // columns are mostly asked for in their order
};

#endif  // PLATFORM_SRC_DATABASE_RESULT_H_
