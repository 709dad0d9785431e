#include "cli/check_rows.h"

#include <tuvosharing/keys.h>
#include <tuvosharing/row.h>

#include <limits>

#include "cli/damage.h"
#include "cli/interrupt.h"
#include "cli/link_row.h"
#include "cli/row_id.h"

namespace cli {

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;

constexpr int kPiece = 500;

void AddRow(const char* table, RowId id, const std::string& reason, Findings* findings) {
  findings->push_back({"row", std::string(table) + " #" + std::to_string(id), reason});
}

constexpr const char* kOddColumn = "odd_column";

// Whether a column holds something else than a number that fits; a row may lack the value.
template <typename T>
std::string IsOdd(const std::string& column) {
  return "typeof(" + column + ") NOT IN ('integer', 'null') OR " + column + " NOT BETWEEN " +
         std::to_string(std::numeric_limits<T>::min()) + " AND " +
         std::to_string(std::numeric_limits<T>::max());
}

// The first column with a number that is none, or the empty text: such a row loads as a link, with
// other numbers than whoever wrote it may have meant.
std::string OddColumn() {
  using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)
  std::string sql = "CASE";
  const auto add = [&sql](const char* column, const std::string& is_odd) {
    sql.append(" WHEN ").append(is_odd).append(" THEN '").append(column).append("'");
  };
  add(SZK_ENABLED_, IsOdd<int>(SZK_ENABLED_));
  add(SZK_OWNER_UID, IsOdd<unsigned int>(SZK_OWNER_UID));
  add(SZK_START_AT, IsOdd<long>(SZK_START_AT));
  add(SZK_EXPIRE_AT, IsOdd<long>(SZK_EXPIRE_AT));
  add(SZK_EXPIRE_TIMES, IsOdd<int>(SZK_EXPIRE_TIMES));
  add(SZK_USE_COUNT, IsOdd<int>(SZK_USE_COUNT));
  add(SZK_AUTO_GC, IsOdd<int>(SZK_AUTO_GC));
  return sql + " ELSE '' END AS " + kOddColumn;
}

void CheckLinks(const RunQuery& query, Findings* findings) {
  std::optional<RowId> last;
  for (bool more = true; more;) {
    StopIfInterrupted();
    Result result =
        query("SELECT " + LinkRowSelection() + ", " + OddColumn() + " FROM entry WHERE " +
              BehindRow("id", last) + " ORDER BY id LIMIT " + std::to_string(kPiece));
    more = false;
    for (Row row; result.NextRow(row); more = true) {
      last = RowIdOf(row);
      if (const std::optional<std::string> reason = DamageOf(row)) {
        AddRow("entry", *last, *reason, findings);
      } else if (!IsUsualId(*last)) {
        AddRow("entry", *last, "id", findings);
      } else if (const std::string odd = row.GetField(kOddColumn).AsString(""); !odd.empty()) {
        AddRow("entry", *last, odd, findings);
      }
    }
  }
}

// Whether a column is empty, or has a zero byte, as far as which alone it would be read.
std::string IsNoText(const std::string& column) {
  return "ifnull(" + column + ", '') = '' OR instr(CAST(" + column + " AS BLOB), x'00') != 0";
}

// One finding for each row that meets `condition`.
void CheckCondition(const RunQuery& query, const char* table, const std::string& condition,
                    const char* reason, Findings* findings) {
  StopIfInterrupted();
  Result result = query(std::string("SELECT id FROM ") + table + " WHERE " + condition);
  for (Row row; result.NextRow(row);) {
    AddRow(table, RowIdOf(row), reason, findings);
  }
}

}  // namespace

void CheckRows(const RunQuery& query, Findings* findings) {
  constexpr const char* kUnusualId = "id NOT BETWEEN 1 AND 2147483647";
  CheckLinks(query, findings);
  CheckCondition(query, "session", kUnusualId, "id", findings);
  CheckCondition(query, "session", IsNoText("session_id"), "session_id", findings);
  CheckCondition(query, "session", IsNoText("ip"), "ip", findings);
  CheckCondition(query, "session", "typeof(timeout) != 'integer'", "timeout", findings);
  CheckCondition(query, "token", kUnusualId, "id", findings);
  CheckCondition(query, "token", "typeof(entry_id) != 'integer' OR entry_id < 1", "entry_id",
                 findings);
  CheckCondition(query, "token", "typeof(session_id) != 'integer' OR session_id < 1", "session_id",
                 findings);
  CheckCondition(query, "token", "typeof(timeout) != 'integer'", "timeout", findings);
}

}  // namespace cli
