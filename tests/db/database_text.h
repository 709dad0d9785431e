// A database file as text, to compare one with another.
#ifndef TESTS_DB_DATABASE_TEXT_H_
#define TESTS_DB_DATABASE_TEXT_H_

#include <string>
#include <vector>

#include "sqlite_file.h"

namespace tuvo_test {

// Everything that is not a row: version, tables and indices with the text that made them, columns,
// keys and references as SQLite understands them. Comments and the layout of the text are left out:
// they may differ between two files that are the same to every program. No name or default value
// may hold "--".
std::vector<std::string> StructureOf(SqliteFile& db);

// Every row of the tables and the greatest numbers ever given out, each value with its type and
// its bytes. Of a table the columns that are named count, so that a file which has got more of them
// can be compared with its former self.
struct TableColumns {
  std::string table;
  std::vector<std::string> columns;
};
std::vector<TableColumns> TablesOf(SqliteFile& db);
std::vector<std::string> ContentOf(SqliteFile& db, const std::vector<TableColumns>& tables);

}  // namespace tuvo_test

#endif  // TESTS_DB_DATABASE_TEXT_H_
