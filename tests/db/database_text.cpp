#include "database_text.h"

#include <regex>

namespace tuvo_test {

namespace {

using Lines = std::vector<std::string>;

std::string Joined(const TextRow& row) {
  std::string line;
  for (const std::string& value : row) {
    line += value + "|";
  }
  return line;
}

// Adds the rows of a statement, each behind `name`.
void Add(SqliteFile& db, const std::string& name, const std::string& sql, Lines* lines) {
  for (const TextRow& row : db.Rows(sql)) {
    lines->push_back(name + ": " + Joined(row));
  }
}

std::string WithoutComments(const std::string& sql) {
  const std::string bare = std::regex_replace(sql, std::regex("--[^\n]*"), "");
  return std::regex_replace(bare, std::regex("\\s+"), " ");
}

Lines Names(SqliteFile& db, const std::string& sql) {
  Lines names;
  for (const TextRow& row : db.Rows(sql)) {
    names.push_back(row[0]);
  }
  return names;
}

}  // namespace

Lines StructureOf(SqliteFile& db) {
  Lines lines;
  Add(db, "version", "PRAGMA user_version", &lines);
  for (const TextRow& row :
       db.Rows("SELECT type, name, tbl_name, sql FROM sqlite_schema ORDER BY type, name")) {
    lines.push_back(Joined({row[0], row[1], row[2], WithoutComments(row[3])}));
  }
  for (const std::string& table :
       Names(db, "SELECT name FROM sqlite_schema WHERE type = 'table' ORDER BY name")) {
    const std::string of = "('" + table + "')";
    Add(db, table + " column", "SELECT * FROM pragma_table_xinfo" + of + " ORDER BY cid", &lines);
    Add(db, table + " reference",
        "SELECT \"table\", \"from\", \"to\", on_update, on_delete, match "
        "FROM pragma_foreign_key_list" +
            of + " ORDER BY \"from\"",
        &lines);
    for (const std::string& index :
         Names(db, "SELECT name FROM pragma_index_list" + of + " ORDER BY name")) {
      Add(db, table + " index",
          "SELECT name, \"unique\", origin, partial FROM pragma_index_list" + of +
              " WHERE name = '" + index + "'",
          &lines);
      Add(db, index + " column", "SELECT * FROM pragma_index_xinfo('" + index + "') ORDER BY seqno",
          &lines);
    }
  }
  return lines;
}

std::vector<TableColumns> TablesOf(SqliteFile& db) {
  std::vector<TableColumns> tables;
  for (const std::string& table :
       Names(db, "SELECT name FROM sqlite_schema WHERE type = 'table' ORDER BY name")) {
    tables.push_back(
        {table, Names(db, "SELECT name FROM pragma_table_info('" + table + "') ORDER BY cid")});
  }
  return tables;
}

Lines ContentOf(SqliteFile& db, const std::vector<TableColumns>& tables) {
  Lines lines;
  for (const TableColumns& one : tables) {
    std::string values;
    for (const std::string& column : one.columns) {
      values += ", typeof(" + column + ") || ' ' || ifnull(hex(" + column + "), '')";
    }
    Add(db, one.table, "SELECT rowid" + values + " FROM " + one.table + " ORDER BY rowid", &lines);
  }
  return lines;
}

}  // namespace tuvo_test
