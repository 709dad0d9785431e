#include "cli/check_rows.h"

#include <tuvosharing/row.h>

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

void CheckLinks(const RunQuery& query, Findings* findings) {
  std::optional<RowId> last;
  for (bool more = true; more;) {
    StopIfInterrupted();
    Result result = query("SELECT " + LinkRowSelection() + " FROM entry WHERE " +
                          BehindRow("id", last) + " ORDER BY id LIMIT " + std::to_string(kPiece));
    more = false;
    for (Row row; result.NextRow(row); more = true) {
      last = RowIdOf(row);
      if (const std::optional<std::string> reason = DamageOf(row)) {
        AddRow("entry", *last, *reason, findings);
      } else if (!IsUsualId(*last)) {
        AddRow("entry", *last, "id", findings);
      }
    }
  }
}

// One finding for each row that meets `condition`.
void CheckCondition(const RunQuery& query, const char* table, const char* condition,
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
  CheckCondition(query, "session", "ifnull(session_id, '') = ''", "session_id", findings);
  CheckCondition(query, "session", "ifnull(ip, '') = ''", "ip", findings);
  CheckCondition(query, "session", "typeof(timeout) != 'integer'", "timeout", findings);
  CheckCondition(query, "token", kUnusualId, "id", findings);
  CheckCondition(query, "token", "typeof(entry_id) != 'integer' OR entry_id < 1", "entry_id",
                 findings);
  CheckCondition(query, "token", "typeof(session_id) != 'integer' OR session_id < 1", "session_id",
                 findings);
  CheckCondition(query, "token", "typeof(timeout) != 'integer'", "timeout", findings);
}

}  // namespace cli
