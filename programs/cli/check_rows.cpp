#include "cli/check_rows.h"

#include <tuvosharing/entry.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/row.h>

#include "cli/interrupt.h"

namespace cli {

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;

constexpr int kPiece = 500;
constexpr unsigned int kNobody = 4294967295U;

void AddRow(const char* table, int id, const std::string& reason, Findings* findings) {
  findings->push_back({"row", std::string(table) + " #" + std::to_string(id), reason});
}

// Why a row did not load; classes, since a reason of the moment is in the system log.
std::string ReasonOf(const Entry& link) {
  if (link.get_hash().empty()) {
    return "hash";
  }
  if (link.get_project_name().empty()) {
    return "project_name";
  }
  if (link.get_owner_uid() == kNobody) {
    return "owner_uid";
  }
  // What the columns hold is good. A link that has nothing of the document was not read from it.
  const bool has_document = link.get_app().isObject() && link.get_private_data().isObject();
  return has_document ? "protection" : "data";
}

void CheckLinks(const RunQuery& query, Findings* findings) {
  int last = 0;
  for (bool more = true; more;) {
    StopIfInterrupted();
    Result result = query("SELECT * FROM entry WHERE id > " + std::to_string(last) +
                          " ORDER BY id LIMIT " + std::to_string(kPiece));
    more = false;
    for (Row row; result.NextRow(row); more = true) {
      last = row.GetField(TUVO::sharing::SZK_ID_).AsInt(0);
      Entry link;
      if (!link.FromRow(row)) {
        AddRow("entry", last, ReasonOf(link), findings);
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
    AddRow(table, row.GetField("id").AsInt(0), reason, findings);
  }
}

}  // namespace

void CheckRows(const RunQuery& query, Findings* findings) {
  CheckLinks(query, findings);
  CheckCondition(query, "session", "ifnull(session_id, '') = ''", "session_id", findings);
  CheckCondition(query, "session", "ifnull(ip, '') = ''", "ip", findings);
  CheckCondition(query, "session", "typeof(timeout) != 'integer'", "timeout", findings);
  CheckCondition(query, "token", "typeof(entry_id) != 'integer' OR entry_id < 1", "entry_id",
                 findings);
  CheckCondition(query, "token", "typeof(session_id) != 'integer' OR session_id < 1", "session_id",
                 findings);
  CheckCondition(query, "token", "typeof(timeout) != 'integer'", "timeout", findings);
}

}  // namespace cli
