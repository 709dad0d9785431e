#include "cli/row_id.h"

#include <cstdlib>
#include <limits>

namespace cli {

RowId RowIdOf(const TUVO::sharing::db::Row& row) {
  return std::strtoll(row.GetField("id").AsString("").c_str(), nullptr, 10);
}

bool IsUsualId(RowId id) {
  return id >= 1 && id <= std::numeric_limits<int>::max();
}

std::string BehindRow(const std::string& column, const std::optional<RowId>& last) {
  return last ? column + " > " + std::to_string(*last) : "1";
}

}  // namespace cli
