// One connection to an SQLite database file.
#ifndef TUVOSHARING_BASE_DB_H_
#define TUVOSHARING_BASE_DB_H_

#include <tuvosharing/export.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing::db {

class BaseDBPrivate;
class Result;
class WriteTransaction;

// Every statement runs with the effective ids of the system identity (uid 1, gid 1), which the
// process must be or be able to take (root among its ids); they are put back before the call
// returns. The switch changes the ids of the whole process: use a connection from one thread at
// a time, and nothing else may depend on the effective ids meanwhile.
//
// Operations answer true on success. A failed statement leaves its text in GetLastQuery and the
// reason in GetLastError; other failures write a line to the system log. Nothing is retried.
// Nothing is thrown but by the constructor, for want of memory; without memory for its texts an
// operation fails like any other, with the reason in GetLastError, and has run nothing. A file that
// another process has locked is waited for up to 10 seconds.
class TUVOSHARING_API BaseDB {
 public:
  // Opens the file at `path`; one that is missing is created with the system identity as its owner
  // and the permission bits `mode`, one that exists keeps its owner and mode. Failures are logged;
  // ask IsGood.
  BaseDB(const std::string& path, unsigned int mode);
  BaseDB(const BaseDB&) = delete;
  BaseDB& operator=(const BaseDB&) = delete;
  // Closes the connection; an open transaction is rolled back.
  virtual ~BaseDB();

  // True when the file is open and set up; decided once, at construction.
  bool IsGood() const;

  // Runs the text, which may hold several statements separated by ";". `result`, when given,
  // receives the rows of the last statement that can return rows (none after a failure). A text
  // that holds a NUL byte is refused, since only its beginning would run.
  bool Execute(const std::string& sql, Result* result = nullptr);
  bool Execute(const std::string& sql, Result& result);

  // "BEGIN TRANSACTION" and "COMMIT". A commit that fails is rolled back and answers false.
  bool Begin();
  bool Commit();

  // Inserts a row: NULL for the id, so that the database assigns it, then `values` in column order,
  // escaped and quoted. `table` is written as it is. A value that cannot be escaped is a failure.
  bool Insert(const std::string& table, const std::vector<std::string>& values);

  // Sets the columns named in `fields` (an "id" among them is left out) in row `id`; true also when
  // there is no such row. Without a column to set the statement fails.
  bool Update(const std::string& table, const std::map<std::string, std::string>& fields, int id);

  // Deletes row `id`; true also when there is no such row.
  bool Delete(const std::string& table, int id);

  // `text` for use between single quotes. A NUL byte in it ends it. Empty on failure (logged).
  std::string Escape(const std::string& text) const;

  // The row id of this connection's last insert, cut to an int. False, `id` untouched, when the
  // connection is not good.
  bool GetLastInsertId(int& id) const;

  // The reason of the last statement that failed, and the last statement handed to the database;
  // empty when there was none. A success does not clear the reason.
  std::string GetLastError() const;
  std::string GetLastQuery() const;

  // Folds the write-ahead log back into the file, as far as other processes' reads allow.
  bool ExecuteWALCheckPoint();

  // Rebuilds the file without its free pages; it is locked meanwhile.
  bool Vacuum();

  // True when the file belongs to user "root" and group "root"; false also when it cannot be seen.
  bool IsRoot() const;

  // Moves the database file (not its companions) into /tmp/ as root. Mind the sense of the result:
  // true when the move FAILED with a status, false when it succeeded or could not be tried
  // (logged).
  bool MoveRootDB() const;

 private:
  friend class WriteTransaction;

  std::unique_ptr<BaseDBPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_BASE_DB_H_
