#include "database_result.h"

#include <sqlite3.h>

#include <algorithm>
#include <cstring>
#include <limits>
#include <new>
#include <stdexcept>

namespace {

// For the many cells that are NULL or empty.
constexpr char kEmpty[] = "";

// Bytes of a block: the first one has room for a row of any table with its columns' names, and each
// further one for twice as much, up to a size where a block more or less does not matter.
constexpr std::size_t kFirstBlock = 1024;
constexpr std::size_t kLargestBlock = std::size_t{256} * 1024;

// The text of one column of the current row, never null. SQLite ends it with a zero whatever the
// column's type is.
const char* ColumnText(sqlite3_stmt* statement, int column) {
  const void* text = sqlite3_column_text(statement, column);
  if (text != nullptr) {
    return static_cast<const char*>(text);
  }
  // Null stands for NULL and, alas, for a conversion that ran out of memory.
  if (sqlite3_errcode(sqlite3_db_handle(statement)) == SQLITE_NOMEM) {
    throw std::bad_alloc();
  }
  return "";
}

}  // namespace

DBResult_tag::DBResult_tag(sqlite3_stmt* statement)
    : columns_(static_cast<std::size_t>(sqlite3_column_count(statement))) {
  cells_.reserve(2 * columns_);
  for (int column = 0; static_cast<std::size_t>(column) < columns_; ++column) {
    const char* name = sqlite3_column_name(statement, column);
    if (name == nullptr) {
      throw std::bad_alloc();
    }
    names_differ_ = names_differ_ && ColumnOf(name) == columns_;
    AddText(name);
  }
  forgotten_blocks_ = blocks_.size();
}

void DBResult_tag::AddRow(sqlite3_stmt* statement) {
  if (rows_ == std::numeric_limits<unsigned int>::max()) {
    throw std::length_error("too many rows");
  }
  for (int column = 0; static_cast<std::size_t>(column) < columns_; ++column) {
    AddText(ColumnText(statement, column));
  }
  ++rows_;
}

bool DBResult_tag::NextRow(unsigned int* row) {
  if (next_ == rows_) {
    return false;
  }
  *row = next_++;
  return true;
}

const char* DBResult_tag::Field(unsigned int row, const char* name) {
  const bool as_expected =
      names_differ_ && expected_ < columns_ && std::strcmp(Text(0, expected_), name) == 0;
  const std::size_t column = as_expected ? expected_ : ColumnOf(name);
  expected_ = column + 1;
  if (column >= columns_ || row >= rows_ || row < first_kept_) {
    return kEmpty;
  }
  return Text(std::size_t{row} + 1, column);
}

void DBResult_tag::Forget(unsigned int row) {
  first_kept_ = std::max(first_kept_, row);
  while (forgotten_blocks_ < blocks_.size() && blocks_[forgotten_blocks_].last_row < first_kept_) {
    blocks_[forgotten_blocks_++].texts.reset();
  }
}

void DBResult_tag::AddText(const char* text) {
  const std::size_t size = std::strlen(text) + 1;  // a zero within the value ends it
  if (size == 1) {
    cells_.push_back(kEmpty);
    return;
  }
  if (size > left_) {
    AddBlock(size);
  }
  blocks_.back().last_row = rows_;
  cells_.push_back(static_cast<const char*>(std::memcpy(free_, text, size)));
  free_ += size;
  left_ -= size;
}

void DBResult_tag::AddBlock(std::size_t needed) {
  const std::size_t size =
      std::max(needed, std::clamp(2 * block_size_, kFirstBlock, kLargestBlock));
  blocks_.push_back({std::unique_ptr<char[]>(new char[size]), rows_});
  free_ = blocks_.back().texts.get();
  left_ = block_size_ = size;
}

const char* DBResult_tag::Text(std::size_t row, std::size_t column) const {
  return cells_[row * columns_ + column];
}

// The first column of that name among those known so far; columns_ when there is none.
std::size_t DBResult_tag::ColumnOf(const char* name) const {
  const std::size_t known = std::min(cells_.size(), columns_);
  std::size_t column = 0;
  while (column < known && std::strcmp(Text(0, column), name) != 0) {
    ++column;
  }
  return column < known ? column : columns_;
}

int TUVODBFetchRow(DBResult_tag* result, unsigned int* row) {
  return result != nullptr && row != nullptr && result->NextRow(row) ? 0 : -1;
}

const char* TUVODBFetchField(DBResult_tag* result, unsigned int row, const char* name) {
  return result != nullptr && name != nullptr ? result->Field(row, name) : "";
}

void TUVODBForgetRows(DBResult_tag* result, unsigned int row) {
  if (result != nullptr) {
    result->Forget(row);
  }
}

void TUVODBFreeResult(DBResult_tag* result) {
  delete result;
}
