#include "owner/link_list.h"

#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>

#include <algorithm>

#include "owner/database_log.h"

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;

// The pattern of LIKE that finds `piece` anywhere, with "\" before what LIKE reads as a wildcard.
std::string Pattern(const std::string& piece) {
  std::string pattern = "%";
  for (const char c : piece) {
    if (c == '%' || c == '_' || c == '\\') {
      pattern += '\\';
    }
    pattern += c;
  }
  return pattern + "%";
}

// The title stands in the document; one that is no JSON has none.
std::string SearchClause(const BaseDB& db, const std::string& piece) {
  const std::string like = " LIKE '" + db.Escape(Pattern(piece)) + "' ESCAPE '\\'";
  return "(hash" + like + " OR project_name" + like +
         " OR CASE WHEN json_valid(data) THEN json_extract(data, '$.protect_title') END" + like +
         ")";
}

// As many as may be in memory together, each with all of its data.
constexpr size_t kRowsAtATime = 16;

void AddOrder(const ListRequest& request, Condition* condition) {
  condition->OrderBy(request.sort, !request.descending);
  if (request.sort != TUVO::sharing::SZK_ID_) {
    condition->OrderBy(TUVO::sharing::SZK_ID_, !request.descending);
  }
}

// Of the whole page, in its order.
bool ReadIds(BaseDB& db, const ListRequest& request, std::time_t now,
             std::vector<std::string>* ids) {
  Condition page(db);
  AddFilters(db, request, now, &page);
  AddOrder(request, &page);
  page.Limit(request.offset, request.limit);
  Result rows;
  if (!db.Execute("SELECT id FROM entry" + page.GetSQL(), rows)) {
    return false;
  }
  for (Row row; rows.NextRow(row);) {
    ids->push_back(row.GetField(TUVO::sharing::SZK_ID_).AsString(""));
  }
  return true;
}

// Some of them, from `first` on, as a list in a statement has them.
std::string PieceOf(const std::vector<std::string>& ids, size_t first) {
  std::string piece = ids[first];
  for (size_t i = first + 1; i < std::min(first + kRowsAtATime, ids.size()); ++i) {
    piece += "," + ids[i];
  }
  return piece;
}

// `more` becomes false when `take` wants no further link.
bool TakePiece(BaseDB& db, const ListRequest& request, const std::string& ids,
               const std::function<bool(const Entry&)>& take, bool* more) {
  Condition piece(db);
  piece.Where("id IN (" + ids + ")");
  AddOrder(request, &piece);
  Result rows;
  if (!db.Execute("SELECT * FROM entry" + piece.GetSQL(), rows)) {
    return false;
  }
  for (Row row; *more && rows.NextRow(row);) {
    Entry link;
    if (link.FromRow(row)) {
      *more = take(link);
    }
  }
  return true;
}

}  // namespace

void AddFilters(const BaseDB& db, const ListRequest& request, std::time_t now,
                Condition* condition) {
  if (request.owner_uid) {
    condition->Where(TUVO::sharing::SZK_OWNER_UID, std::to_string(*request.owner_uid));
  }
  if (!request.project_name.empty()) {
    condition->Where(TUVO::sharing::SZK_PROJECT_NAME, request.project_name);
  }
  if (request.state) {
    condition->Where(StateClause(*request.state, now));
  }
  if (!request.search.empty()) {
    condition->Where(SearchClause(db, request.search));
  }
}

const std::vector<std::string>& SortColumns() {
  using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)
  static const std::vector<std::string> columns = {
      SZK_ID_,      SZK_HASH,      SZK_PROJECT_NAME, SZK_OWNER_UID, SZK_ENABLED_,
      SZK_START_AT, SZK_EXPIRE_AT, SZK_EXPIRE_TIMES, SZK_USE_COUNT};
  return columns;
}

MaybeProblem ForEachLink(BaseDB& db, const ListRequest& request, std::time_t now,
                         const std::function<bool(const Entry&)>& take, int* total) {
  const EntryDB store(db);
  AddFilters(db, request, now, &store.GetCondition());
  std::vector<std::string> ids;
  if (!store.Count(*total) || !ReadIds(db, request, now, &ids)) {
    LogDatabaseFault(db.GetLastError());
    return InternalFault();
  }
  bool more = true;
  for (size_t first = 0; more && first < ids.size(); first += kRowsAtATime) {
    if (!TakePiece(db, request, PieceOf(ids, first), take, &more)) {
      LogDatabaseFault(db.GetLastError());
      return InternalFault();
    }
  }
  return std::nullopt;
}

MaybeProblem ListLinks(BaseDB& db, const ListRequest& request, std::time_t now,
                       std::vector<Entry>* links, int* total) {
  return ForEachLink(
      db, request, now,
      [links](const Entry& link) {
        links->push_back(link);
        return true;
      },
      total);
}

}  // namespace owner
