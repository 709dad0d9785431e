// Lists of links: filtered, sorted, a page at a time.
#ifndef PROGRAMS_OWNER_LINK_LIST_H_
#define PROGRAMS_OWNER_LINK_LIST_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/entry.h>

#include <ctime>
#include <functional>
#include <optional>
#include <string>
#include <vector>

#include "owner/link_state.h"
#include "owner/problem.h"

namespace owner {

struct ListRequest {
  std::optional<unsigned int> owner_uid;
  std::string project_name;  // empty: any
  std::optional<LinkState> state;
  std::string search;  // a piece of hash, project or title, ASCII letters of either case; or empty
  std::string sort = "id";  // one of SortColumns()
  bool descending = false;
  int offset = 0;  // 0 or more
  int limit = 50;  // 1 or more
};

// The columns to sort by; equal rows follow each other by their ids, in the same direction.
const std::vector<std::string>& SortColumns();

// Adds the request's filters to `condition`; order and page are another's to add.
void AddFilters(const TUVO::sharing::db::BaseDB& db, const ListRequest& request, std::time_t now,
                TUVO::sharing::db::Condition* condition);

// `links` is the page, `total` the number of rows that the filters admit; rows that do not load as
// a link are counted and left out. Precondition: `sort` is one of SortColumns().
MaybeProblem ListLinks(TUVO::sharing::db::BaseDB& db, const ListRequest& request, std::time_t now,
                       std::vector<TUVO::sharing::record::Entry>* links, int* total);

// Calls `take` for each link of the page in turn, until it returns false, and holds few of them at
// a time: a link with its data may be large, and a page has many. One that is gone before its turn
// is left out.
MaybeProblem ForEachLink(TUVO::sharing::db::BaseDB& db, const ListRequest& request, std::time_t now,
                         const std::function<bool(const TUVO::sharing::record::Entry&)>& take,
                         int* total);

}  // namespace owner

#endif  // PROGRAMS_OWNER_LINK_LIST_H_
