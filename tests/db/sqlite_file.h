// Looks at an SQLite file from outside the library: through SQLite itself.
#ifndef TESTS_DB_SQLITE_FILE_H_
#define TESTS_DB_SQLITE_FILE_H_

#include <sqlite3.h>

#include <string>
#include <vector>

namespace tuvo_test {

using TextRow = std::vector<std::string>;

// One connection with foreign keys on, as the library has them. Throws std::runtime_error with
// SQLite's reason when the file does not open or a statement fails.
class SqliteFile {
 public:
  explicit SqliteFile(const std::string& path);
  ~SqliteFile();
  SqliteFile(const SqliteFile&) = delete;
  SqliteFile& operator=(const SqliteFile&) = delete;

  // Runs every statement of the text.
  void Execute(const std::string& sql);

  // True when the text runs without an error.
  bool Succeeds(const std::string& sql);

  // The rows of one statement, values as text; NULL is "NULL".
  std::vector<TextRow> Rows(const std::string& sql);

  // The first value of the first row.
  std::string Value(const std::string& sql);

  // The steps of the plan that SQLite makes for a statement, one text each.
  std::vector<std::string> Plan(const std::string& sql);

  // Runs one statement and tells how many steps it made forward in a scan of a whole table or
  // index; those that its foreign-key actions made are counted too.
  int FullScanSteps(const std::string& sql);

 private:
  void Check(int code);
  sqlite3_stmt* Prepare(const std::string& sql);

  sqlite3* handle_ = nullptr;
};

// The whole of a text file.
std::string ReadFile(const std::string& path);

// The text of schema script `version`, as installed.
std::string SchemaScript(int version);

}  // namespace tuvo_test

#endif  // TESTS_DB_SQLITE_FILE_H_
