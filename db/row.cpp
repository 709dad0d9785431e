#include <tuvoplatform/database.h>
#include <tuvosharing/row.h>

namespace TUVO::sharing::db {

Row::Row() : Row(nullptr, 0) {}

Row::Row(DBResult_tag* result, unsigned int row) : result_(result), row_(row) {}

Row::~Row() = default;

bool Row::IsGood() const {
  return result_ != nullptr;
}

void Row::SetResult(DBResult_tag* result) {
  result_ = result;
}

void Row::SetRow(unsigned int row) {
  row_ = row;
}

Field Row::GetField(const std::string& name) const {
  return Field(IsGood() ? TUVODBFetchField(result_, row_, name.c_str()) : "");
}

}  // namespace TUVO::sharing::db
