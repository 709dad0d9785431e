// Rows as other programs may have left them: records are loaded from any cells, and say of
// themselves whether they are whole.
//
// Input: the record (0 link, 1 session, 2 token), then two lines for each column: its name, and its
// value behind a letter for its kind (t text, b bytes, i integer, r real number, n NULL).
#include <json/reader.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/object.h>
#include <tuvosharing/result.h>
#include <tuvosharing/session.h>
#include <tuvosharing/token.h>

#include <algorithm>
#include <cstdlib>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "lines.h"
#include "links_database.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;

std::string Hex(const std::string& text) {
  const std::string literal = fuzz::Literal(text);  // CAST(X'…' AS TEXT)
  return literal.substr(5, literal.find(" AS") - 5);
}

std::string CellLiteral(const std::string& line) {
  const std::string value = line.empty() ? line : line.substr(1);
  switch (line.empty() ? 'n' : line.front()) {
    case 't':
      return fuzz::Literal(value);
    case 'b':
      return Hex(value);
    case 'i':
      return std::to_string(std::strtoll(value.c_str(), nullptr, 10));
    case 'r':
      return "CAST(" + fuzz::Literal(value) + " AS REAL)";
    default:
      return "NULL";
  }
}

// Any text may name a column, between double quotes and up to a zero byte.
std::string Quoted(const std::string& name) {
  std::string quoted = "\"";
  for (const char c : name) {
    quoted.append(c == '"' ? 2 : 1, c);
  }
  return quoted + "\"";
}

std::string Statement(fuzz::Lines* lines) {
  constexpr int kMostColumns = 50;
  std::string columns;
  for (int i = 0; i < kMostColumns && !lines->AtEnd(); ++i) {
    const std::string name = lines->Text().c_str();
    const std::string cell = CellLiteral(lines->Text());
    if (!name.empty()) {
      columns += (columns.empty() ? "" : ",") + cell + " AS " + Quoted(name);
    }
  }
  return "SELECT " + (columns.empty() ? "1 AS x" : columns);
}

template <typename Record>
std::string Shown(const Record& record) {
  std::string text = std::to_string(record.get_id());
  for (const std::string& field : record.GetFieldList()) {
    text += "|" + field;
  }
  return text;
}

// A record that is written as a row of its fields is read again as what it was.
template <typename Record>
void CheckAgain(const Record& record) {
  std::string sql = "SELECT " + std::to_string(record.get_id()) + " AS id";
  bool holds_zero = false;
  for (const auto& [column, value] : record.GetFieldMap()) {
    sql += "," + fuzz::Literal(value) + " AS " + column;
    holds_zero = holds_zero || value.find('\0') != std::string::npos;
  }
  Require(!holds_zero, "what was read from a row holds no zero byte");
  Result result;
  Row row;
  Require(fuzz::Links().Execute(sql, result) && result.NextRow(row), "the fields make a row");
  Record again;
  Require(again.FromRow(row), "a legal record's fields load as legal");
  RequireEqual(Shown(again), Shown(record), "a legal record's fields load as they are");
}

// What a link shows is its public members and no others, as JSON that can be read again.
void CheckShown(const Entry& entry) {
  static const std::vector<std::string> members = {
      "app",           "auto_gc",      "enable_match_ip", "enabled",       "expire_at",
      "expire_times",  "hash",         "owner_user",      "project_name",  "protect_groups",
      "protect_title", "protect_type", "protect_users",   "redirect_type", "redirect_uri",
      "start_at",      "use_count"};
  Json::Value json;
  entry.ToJSON(json);
  std::vector<std::string> names = json.getMemberNames();
  std::sort(names.begin(), names.end());
  Require(names == members, "a link shows its public members and no others");
}

void CheckShown(const Session& session) {
  Json::Value json;
  session.ToJSON(json);
  Require(json.size() == 4, "a session shows its members");
}

void CheckShown(const Token& token) {
  Json::Value json;
  token.ToJSON(json);
  Require(json.size() == 3, "a token shows its members");
}

template <typename Record>
void Check(const std::string& sql) {
  Result result;
  Row row;
  Require(fuzz::Links().Execute(sql, result) && result.NextRow(row),
          fuzz::Links().GetLastError().c_str());
  Record record;
  const bool legal = record.FromRow(row);
  // A document that cannot be read leaves the members of a link that was made anew.
  Require(!legal || record.IsLegal(), "what loads is legal");
  CheckShown(record);
  if (legal) {
    CheckAgain(record);
  }
  Record copy = record;
  RequireEqual(Shown(copy), Shown(record), "a copy is the same");
  const Record moved = std::move(copy);
  RequireEqual(Shown(moved), Shown(record), "so is what is moved");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Lines lines(data, size);
  const std::size_t kind = lines.Choice(3);
  const std::string sql = Statement(&lines);
  if (kind == 0) {
    Check<Entry>(sql);
  } else if (kind == 1) {
    Check<Session>(sql);
  } else {
    Check<Token>(sql);
  }
  return 0;
}
