// tuvosharing sessions and tokens: who is in. The sessions' identifiers are not even read.
#include <tuvosharing/row.h>
#include <tuvosharing/user_group.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>
#include <iostream>

#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_name.h"
#include "cli/output.h"
#include "cli/row_id.h"
#include "cli/table.h"
#include "cli/terminal.h"
#include "owner/link_store.h"
#include "owner/moment.h"
#include "owner/text_check.h"

namespace cli {

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;

constexpr int kPiece = 1000;
constexpr unsigned int kNobody = 4294967295U;

// The row number of the link that was named; 0 when none was.
int LinkIdOf(const NamedLinks& links) {
  if (links.texts.empty() && links.ids.empty()) {
    return 0;
  }
  const std::vector<owner::LinkName> names = LinkNamesOf(links.texts, links.ids);
  if (names.size() != 1) {
    throw Failure(ExitStatus::kUsage, "takes one link");
  }
  TUVO::sharing::record::Entry link;
  Require(owner::FindLink(Database(), names.front(), std::nullopt, &link), TextOf(names.front()));
  return link.get_id();
}

std::string UserText(unsigned int uid) {
  std::string name;
  if (uid == kNobody || TUVO::sharing::UIDToUser(uid, name)) {
    return name;
  }
  return std::to_string(uid);
}

Json::Int64 NumberOf(const Row& row, const char* column) {
  return std::strtoll(row.GetField(column).AsString("").c_str(), nullptr, 10);
}

Json::Value VisitorJson(const Row& row) {
  Json::Value json(Json::objectValue);
  json["id"] = NumberOf(row, "id");
  json["ip"] = owner::RepairedUtf8(row.GetField("ip").AsString(""));
  json["user"] = UserText(row.GetField("uid").AsUInt(kNobody));
  json["expires_at"] = owner::MomentText(row.GetField("timeout").AsTime(0));
  return json;
}

// All rows of a statement that takes its pieces by id: `sql` ends where "id > N" is to follow.
// `column` is the id's whole name there.
template <typename Take>
void ForEachRow(const std::string& sql, const std::string& column, Take take) {
  std::optional<RowId> last;
  for (bool more = true; more;) {
    StopIfInterrupted();
    std::string piece = sql;
    piece.append(" AND ").append(BehindRow(column, last));
    piece.append(" ORDER BY ").append(column).append(" LIMIT ").append(std::to_string(kPiece));
    Result result = Query(Database(), piece);
    int rows = 0;
    Row row;
    for (; result.NextRow(row); ++rows) {
      last = RowIdOf(row);
      take(row);
    }
    more = rows == kPiece;
  }
}

std::string SessionsSql(int link, std::time_t now) {
  const std::string moment = std::to_string(now);
  std::string sql = "SELECT id, ip, uid, timeout FROM session WHERE timeout > " + moment;
  if (link != 0) {
    sql += " AND id IN (SELECT session_id FROM token WHERE entry_id = " + std::to_string(link) +
           " AND timeout > " + moment + ")";
  }
  return sql;
}

std::string TokensSql(int link, std::time_t now) {
  std::string sql =
      "SELECT t.id AS id, t.entry_id AS link, t.session_id AS session, t.timeout AS timeout, "
      "e.hash AS hash, s.ip AS ip, s.uid AS uid FROM token AS t JOIN entry AS e ON e.id = "
      "t.entry_id JOIN session AS s ON s.id = t.session_id WHERE t.timeout > " +
      std::to_string(now) + " AND s.timeout > " + std::to_string(now);
  if (link != 0) {
    sql += " AND t.entry_id = " + std::to_string(link);
  }
  return sql;
}

void Print(const char* name, const Json::Value& list, Table table,
           const std::vector<const char*>& members, bool as_json) {
  if (as_json) {
    Json::Value json;
    json["total"] = list.size();
    json[name] = list;
    PrintJson(json);
    return;
  }
  for (const Json::Value& item : list) {
    std::vector<std::string> cells;
    cells.reserve(members.size());
    for (const char* member : members) {
      cells.push_back(item[member].asString());
    }
    table.Add(cells);
  }
  table.Print(std::cout, TerminalWidth(STDOUT_FILENO));
}

}  // namespace

ExitStatus Sessions(const VisitorOptions& options) {
  const int link = LinkIdOf(options.links);
  Json::Value list(Json::arrayValue);
  ForEachRow(SessionsSql(link, std::time(nullptr)), "id",
             [&list](const Row& row) { list.append(VisitorJson(row)); });
  Print("sessions", list,
        Table({{"ID", true, false},
               {"ADDRESS", false, false},
               {"USER", false, true},
               {"EXPIRES", false, false}}),
        {"id", "ip", "user", "expires_at"}, options.json);
  return ExitStatus::kDone;
}

ExitStatus Tokens(const VisitorOptions& options) {
  const int link = LinkIdOf(options.links);
  Json::Value list(Json::arrayValue);
  ForEachRow(TokensSql(link, std::time(nullptr)), "t.id", [&list](const Row& row) {
    Json::Value json = VisitorJson(row);
    json["link"] = NumberOf(row, "link");
    json["hash"] = owner::RepairedUtf8(row.GetField("hash").AsString(""));
    json["session"] = NumberOf(row, "session");
    list.append(json);
  });
  Print("tokens", list,
        Table({{"ID", true, false},
               {"LINK", true, false},
               {"HASH", false, false},
               {"SESSION", true, false},
               {"ADDRESS", false, false},
               {"USER", false, true},
               {"EXPIRES", false, false}}),
        {"id", "link", "hash", "session", "ip", "user", "expires_at"}, options.json);
  return ExitStatus::kDone;
}

}  // namespace cli
