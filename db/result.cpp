#include <tuvoplatform/database.h>
#include <tuvosharing/result.h>

#include <utility>

namespace TUVO::sharing::db {

Result::Result() : Result(nullptr) {}

Result::Result(DBResult_tag* result) : row_(0), result_(result) {}

Result::Result(Result&& other) noexcept
    : row_(std::exchange(other.row_, 0)), result_(std::exchange(other.result_, nullptr)) {}

Result& Result::operator=(Result&& other) noexcept {
  if (this != &other) {
    TUVODBFreeResult(result_);
    row_ = std::exchange(other.row_, 0);
    result_ = std::exchange(other.result_, nullptr);
  }
  return *this;
}

Result::~Result() {
  if (result_ != nullptr) {
    TUVODBFreeResult(result_);
  }
}

bool Result::IsGood() const {
  return result_ != nullptr;
}

void Result::SetResult(DBResult_tag* result) {
  result_ = result;
}

bool Result::NextRow(Row& row) {
  if (TUVODBFetchRow(result_, &row_) == -1) {
    return false;
  }
  row.SetResult(result_);
  row.SetRow(row_);
  return true;
}

}  // namespace TUVO::sharing::db
