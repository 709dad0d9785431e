#include "links_database.h"

#include <tuvosharing/result.h>

#include "target.h"

namespace fuzz {

TUVO::sharing::db::SharingDB& Links() {
  static TUVO::sharing::db::SharingDB& db = TUVO::sharing::db::SharingDB::Instance();
  Require(db.IsGood(), "the database can be used: run inside scripts/private-root, as uid 1");
  return db;
}

void Run(const std::string& sql) {
  Require(Links().Execute(sql), Links().GetLastError().c_str());
}

std::string Literal(const std::string& text) {
  constexpr char kDigits[] = "0123456789abcdef";
  std::string literal = "CAST(X'";
  for (const char c : text) {
    const auto byte = static_cast<unsigned char>(c);
    literal.push_back(kDigits[byte >> 4U]);
    literal.push_back(kDigits[byte & 15U]);
  }
  return literal + "' AS TEXT)";
}

std::string Column(const std::string& sql) {
  TUVO::sharing::db::Result result;
  Require(Links().Execute(sql, result), Links().GetLastError().c_str());
  std::string text;
  TUVO::sharing::db::Row row;
  while (result.NextRow(row)) {
    text += row.GetField("c").AsString("") + "\n";
  }
  return text;
}

std::string ChangesSoFar() {
  return Column("SELECT total_changes() AS c") +
         Column("SELECT count(*) || ':' || total(length(sql)) AS c FROM sqlite_schema");
}

std::string DumpEntries() {
  return Column(
      "SELECT id || '|' || quote(owner_uid) || '|' || quote(hash) || '|' || quote(project_name) || "
      "'|' || quote(enabled) || '|' || quote(start_at) || '|' || quote(expire_at) || '|' || "
      "quote(expire_times) || '|' || quote(use_count) || '|' || quote(auto_gc) || '|' || "
      "quote(data) AS c FROM entry ORDER BY id");
}

std::string DumpSessions() {
  return Column(
      "SELECT id || '|' || quote(session_id) || '|' || quote(uid) || '|' || quote(ip) || '|' || "
      "quote(timeout) AS c FROM session ORDER BY id");
}

std::string DumpTokens() {
  return Column(
      "SELECT id || '|' || quote(entry_id) || '|' || quote(session_id) || '|' || quote(timeout) "
      "AS c FROM token ORDER BY id");
}

}  // namespace fuzz
