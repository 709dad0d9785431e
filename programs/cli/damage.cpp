#include "cli/damage.h"

#include <tuvosharing/entry.h>

#include "cli/link_row.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;

constexpr unsigned int kNobody = 4294967295U;

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

}  // namespace

std::optional<std::string> DamageOf(const TUVO::sharing::db::Row& row) {
  if (std::optional<std::string> column = ColumnWithZero(row)) {
    return column;
  }
  Entry link;
  if (!link.FromRow(row)) {
    return ReasonOf(link);
  }
  return std::nullopt;
}

}  // namespace cli
