#include "sqlite_file.h"

#include <fstream>
#include <memory>
#include <sstream>
#include <stdexcept>

namespace tuvo_test {

namespace {

using Statement = std::unique_ptr<sqlite3_stmt, decltype(&sqlite3_finalize)>;

std::string ColumnText(sqlite3_stmt* statement, int column) {
  const unsigned char* text = sqlite3_column_text(statement, column);
  return text == nullptr ? "NULL" : reinterpret_cast<const char*>(text);
}

TextRow CurrentRow(sqlite3_stmt* statement) {
  TextRow row;
  for (int column = 0; column < sqlite3_column_count(statement); ++column) {
    row.push_back(ColumnText(statement, column));
  }
  return row;
}

}  // namespace

SqliteFile::SqliteFile(const std::string& path) {
  try {
    Check(sqlite3_open(path.c_str(), &handle_));
    Check(sqlite3_busy_timeout(handle_, 10000));
    Execute("PRAGMA foreign_keys = ON");
  } catch (...) {
    sqlite3_close(handle_);
    throw;
  }
}

SqliteFile::~SqliteFile() {
  sqlite3_close(handle_);
}

void SqliteFile::Check(int code) {
  if (code != SQLITE_OK) {
    throw std::runtime_error(sqlite3_errmsg(handle_));
  }
}

sqlite3_stmt* SqliteFile::Prepare(const std::string& sql) {
  sqlite3_stmt* statement = nullptr;
  Check(sqlite3_prepare_v2(handle_, sql.c_str(), -1, &statement, nullptr));
  return statement;
}

void SqliteFile::Execute(const std::string& sql) {
  Check(sqlite3_exec(handle_, sql.c_str(), nullptr, nullptr, nullptr));
}

bool SqliteFile::Succeeds(const std::string& sql) {
  return sqlite3_exec(handle_, sql.c_str(), nullptr, nullptr, nullptr) == SQLITE_OK;
}

std::vector<TextRow> SqliteFile::Rows(const std::string& sql) {
  const Statement statement(Prepare(sql), sqlite3_finalize);
  std::vector<TextRow> rows;
  int code = 0;
  while ((code = sqlite3_step(statement.get())) == SQLITE_ROW) {
    rows.push_back(CurrentRow(statement.get()));
  }
  Check(code == SQLITE_DONE ? SQLITE_OK : code);
  return rows;
}

std::string SqliteFile::Value(const std::string& sql) {
  return Rows(sql).at(0).at(0);
}

std::vector<std::string> SqliteFile::Plan(const std::string& sql) {
  std::vector<std::string> steps;
  for (const TextRow& row : Rows("EXPLAIN QUERY PLAN " + sql)) {
    steps.push_back(row.at(3));  // id, parent, unused, detail
  }
  return steps;
}

int SqliteFile::FullScanSteps(const std::string& sql) {
  const Statement statement(Prepare(sql), sqlite3_finalize);
  int code = 0;
  while ((code = sqlite3_step(statement.get())) == SQLITE_ROW) {
  }
  Check(code == SQLITE_DONE ? SQLITE_OK : code);
  return sqlite3_stmt_status(statement.get(), SQLITE_STMTSTATUS_FULLSCAN_STEP, 0);
}

std::string ReadFile(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file) {
    throw std::runtime_error("cannot open " + path);
  }
  std::ostringstream text;
  text << file.rdbuf();
  return text.str();
}

std::string SchemaScript(int version) {
  return ReadFile("/usr/tuvo/share/tuvosharing/db_schema/" + std::to_string(version) + ".sql");
}

}  // namespace tuvo_test
