#include "database_result.h"

#include <sqlite3.h>

#include <cstring>
#include <limits>
#include <new>
#include <stdexcept>

namespace {

// Where the empty text lies, for the many cells that are NULL or empty.
constexpr std::size_t kEmpty = 0;

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
    : columns_(sqlite3_column_count(statement)), text_(1, '\0') {
  for (int column = 0; column < columns_; ++column) {
    const char* name = sqlite3_column_name(statement, column);
    if (name == nullptr) {
      throw std::bad_alloc();
    }
    column_of_.emplace(name, column);
  }
}

void DBResult_tag::AddRow(sqlite3_stmt* statement) {
  if (rows_ == std::numeric_limits<unsigned int>::max()) {
    throw std::length_error("too many rows");
  }
  for (int column = 0; column < columns_; ++column) {
    const char* text = ColumnText(statement, column);
    const std::size_t length = std::strlen(text);  // a zero within the value ends it
    cells_.push_back(length == 0 ? kEmpty : text_.size());
    if (length != 0) {
      text_.append(text, length + 1);
    }
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

const char* DBResult_tag::Field(unsigned int row, const char* name) const {
  const auto column = column_of_.find(name);
  if (column == column_of_.end() || row >= rows_) {
    return "";
  }
  const std::size_t cell = row * static_cast<std::size_t>(columns_) + column->second;
  return text_.data() + cells_[cell];
}

int TUVODBFetchRow(DBResult_tag* result, unsigned int* row) {
  return result != nullptr && row != nullptr && result->NextRow(row) ? 0 : -1;
}

const char* TUVODBFetchField(DBResult_tag* result, unsigned int row, const char* name) {
  return result != nullptr && name != nullptr ? result->Field(row, name) : "";
}

void TUVODBFreeResult(DBResult_tag* result) {
  delete result;
}
