// Links as export writes them and import reads them: the table's columns as they are, so that
// nothing changes on the way, whoever wrote the row.
#ifndef PROGRAMS_CLI_LINK_ROW_H_
#define PROGRAMS_CLI_LINK_ROW_H_

#include <json/value.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/row.h>

#include <array>
#include <cstddef>
#include <optional>
#include <string>

namespace cli {

constexpr std::size_t kLinkColumnCount = 10;

// The table's columns behind the id, in their order.
const std::array<const char*, kLinkColumnCount>& LinkColumns();

// No value: NULL.
struct LinkRow {
  std::array<std::optional<std::string>, kLinkColumnCount> columns;

  const std::optional<std::string>& hash() const { return columns[0]; }
};

// What a statement has to select for LinkRowOf, from the table "entry".
std::string LinkRowSelection();

// The first column that holds a zero byte.
std::optional<std::string> ColumnWithZero(const TUVO::sharing::db::Row& row);

// Nothing for a row that has a zero byte in a text: the platform reads as far as that.
std::optional<LinkRow> LinkRowOf(const TUVO::sharing::db::Row& row);

// An object with one member for each column: null, an integer, a text, or {"hex": "…"} for bytes
// that are no UTF-8; and "owner_user", which only people read.
Json::Value JsonOf(const LinkRow& row);

// Nothing when `json` is no such object.
std::optional<LinkRow> LinkRowOf(const Json::Value& json);

// The statement that stores the row under a new id.
std::string InsertStatement(const TUVO::sharing::db::BaseDB& db, const LinkRow& row);

}  // namespace cli

#endif  // PROGRAMS_CLI_LINK_ROW_H_
