#include "cli/link_row.h"

#include <tuvosharing/keys.h>
#include <tuvosharing/user_group.h>

#include <charconv>
#include <cstdint>
#include <map>
#include <new>
#include <string_view>

#include "owner/text_check.h"

namespace cli {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Row;

constexpr const char* kHex = "hex";
constexpr const char* kHexDigits = "0123456789abcdef";
constexpr unsigned int kDigitBits = 4;

std::string IsNullColumn(const std::string& column) {
  return "null_" + column;
}

std::string HoldsZeroColumn(const std::string& column) {
  return "zero_" + column;
}

// A number whose text is the one that the number has.
std::optional<std::int64_t> PlainNumber(const std::string& text) {
  std::int64_t number = 0;
  const char* end = text.data() + text.size();
  const auto [stop, error] = std::from_chars(text.data(), end, number);
  if (error != std::errc() || stop != end || std::to_string(number) != text) {
    return std::nullopt;
  }
  return number;
}

std::string HexOf(const std::string& bytes) {
  std::string hex;
  for (const char byte : bytes) {
    const auto value = static_cast<unsigned char>(byte);
    hex += kHexDigits[value >> kDigitBits];
    hex += kHexDigits[value & 0x0FU];
  }
  return hex;
}

std::optional<std::string> BytesOf(const std::string& hex) {
  const std::string_view digits = kHexDigits;
  std::string bytes;
  if (hex.size() % 2 != 0) {
    return std::nullopt;
  }
  for (std::size_t i = 0; i < hex.size(); i += 2) {
    const std::size_t high = digits.find(hex[i]);
    const std::size_t low = digits.find(hex[i + 1]);
    if (high == std::string_view::npos || low == std::string_view::npos) {
      return std::nullopt;
    }
    bytes += static_cast<char>((high << kDigitBits) | low);
  }
  return bytes;
}

Json::Value ColumnJson(const std::optional<std::string>& text, bool is_number) {
  if (!text) {
    return {};
  }
  if (is_number) {
    if (const std::optional<std::int64_t> number = PlainNumber(*text)) {
      return {static_cast<Json::Int64>(*number)};
    }
  }
  if (owner::IsUtf8(*text)) {
    return {*text};
  }
  Json::Value json(Json::objectValue);
  json[kHex] = HexOf(*text);
  return json;
}

std::optional<std::string> TextOfColumn(const Json::Value& json) {
  if (json.isString()) {
    return json.asString();
  }
  if (json.type() == Json::intValue) {
    return std::to_string(json.asLargestInt());
  }
  if (json.type() == Json::uintValue) {
    return std::to_string(json.asLargestUInt());
  }
  if (json.isObject() && json.size() == 1 && json[kHex].isString()) {
    return BytesOf(json[kHex].asString());
  }
  return std::nullopt;
}

bool IsText(const std::string& column) {
  return column == TUVO::sharing::SZK_HASH || column == TUVO::sharing::SZK_PROJECT_NAME ||
         column == TUVO::sharing::SZK_DATA;
}

std::string NameOf(const std::string& uid_text) {
  unsigned int uid = 0;
  std::string name;
  const char* end = uid_text.data() + uid_text.size();
  const auto [stop, error] = std::from_chars(uid_text.data(), end, uid);
  if (error == std::errc() && stop == end) {
    TUVO::sharing::UIDToUser(uid, name);
  }
  return owner::RepairedUtf8(name);
}

// Each name is looked up once: links are many, owners are few.
std::string OwnerName(const LinkRow& row) {
  static std::map<std::string, std::string> known;
  constexpr std::size_t kOwnerColumn = 3;
  const std::string uid = row.columns[kOwnerColumn].value_or("");
  const auto found = known.find(uid);
  return found != known.end() ? found->second : known.emplace(uid, NameOf(uid)).first->second;
}

// Escape can only answer the empty text when memory does not suffice; a link is not stored without
// its data.
std::string EscapedColumn(const BaseDB& db, const std::string& column) {
  std::string escaped = db.Escape(column);
  if (escaped.empty() && !column.empty()) {
    throw std::bad_alloc();
  }
  return escaped;
}

}  // namespace

const std::array<const char*, kLinkColumnCount>& LinkColumns() {
  using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)
  static const std::array<const char*, kLinkColumnCount> columns = {
      SZK_HASH,      SZK_PROJECT_NAME, SZK_ENABLED_,  SZK_OWNER_UID, SZK_START_AT,
      SZK_EXPIRE_AT, SZK_EXPIRE_TIMES, SZK_USE_COUNT, SZK_AUTO_GC,   SZK_DATA};
  return columns;
}

std::string LinkRowSelection() {
  std::string selection = "*";
  for (const std::string column : LinkColumns()) {
    selection += ", " + column + " IS NULL AS " + IsNullColumn(column);
    selection += ", ifnull(instr(CAST(" + column + " AS BLOB), x'00'), 0) != 0 AS " +
                 HoldsZeroColumn(column);
  }
  return selection;
}

std::optional<std::string> ColumnWithZero(const Row& row) {
  for (const std::string column : LinkColumns()) {
    if (row.GetField(HoldsZeroColumn(column)).AsBool(true)) {
      return column;
    }
  }
  return std::nullopt;
}

std::optional<LinkRow> LinkRowOf(const Row& row) {
  if (ColumnWithZero(row)) {
    return std::nullopt;
  }
  LinkRow link;
  for (std::size_t i = 0; i < kLinkColumnCount; ++i) {
    const std::string column = LinkColumns()[i];
    if (!row.GetField(IsNullColumn(column)).AsBool(true)) {
      link.columns[i] = row.GetField(column).AsString("");
    }
  }
  return link;
}

Json::Value JsonOf(const LinkRow& row) {
  Json::Value json(Json::objectValue);
  for (std::size_t i = 0; i < kLinkColumnCount; ++i) {
    json[LinkColumns()[i]] = ColumnJson(row.columns[i], !IsText(LinkColumns()[i]));
  }
  json[TUVO::sharing::SZK_OWNER_USER] = OwnerName(row);
  return json;
}

std::optional<LinkRow> LinkRowOf(const Json::Value& json) {
  if (!json.isObject()) {
    return std::nullopt;
  }
  LinkRow row;
  std::size_t members = json.isMember(TUVO::sharing::SZK_OWNER_USER) ? 1 : 0;
  for (std::size_t i = 0; i < kLinkColumnCount; ++i) {
    const char* column = LinkColumns()[i];
    if (!json.isMember(column)) {
      return std::nullopt;
    }
    ++members;
    const Json::Value& value = json[column];
    row.columns[i] = TextOfColumn(value);
    const bool is_zero_free = !row.columns[i] || row.columns[i]->find('\0') == std::string::npos;
    if ((!row.columns[i] && !value.isNull()) || !is_zero_free) {
      return std::nullopt;
    }
  }
  return members == json.size() ? std::optional(row) : std::nullopt;
}

std::string InsertStatement(const BaseDB& db, const LinkRow& row) {
  std::string sql = "INSERT INTO entry VALUES (NULL";
  for (const std::optional<std::string>& column : row.columns) {
    sql += column ? ", '" + EscapedColumn(db, *column) + "'" : ", NULL";
  }
  return sql + ")";
}

}  // namespace cli
