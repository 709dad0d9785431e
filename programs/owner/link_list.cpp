#include "owner/link_list.h"

#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>

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
                         const std::function<void(const Entry&)>& take, int* total) {
  const EntryDB store(db);
  AddFilters(db, request, now, &store.GetCondition());
  if (!store.Count(*total)) {
    return InternalFault();
  }
  Condition condition(db);
  AddFilters(db, request, now, &condition);
  condition.OrderBy(request.sort, !request.descending);
  if (request.sort != TUVO::sharing::SZK_ID_) {
    condition.OrderBy(TUVO::sharing::SZK_ID_, !request.descending);
  }
  condition.Limit(request.offset, request.limit);
  Result rows;
  if (!db.Execute("SELECT * FROM entry" + condition.GetSQL(), rows)) {
    return InternalFault();
  }
  for (Row row; rows.NextRow(row);) {
    Entry link;
    if (link.FromRow(row)) {
      take(link);
    }
  }
  return std::nullopt;
}

MaybeProblem ListLinks(BaseDB& db, const ListRequest& request, std::time_t now,
                       std::vector<Entry>* links, int* total) {
  return ForEachLink(
      db, request, now, [links](const Entry& link) { links->push_back(link); }, total);
}

}  // namespace owner
