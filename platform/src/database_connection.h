// What a TUVODB handle really is.
#ifndef PLATFORM_SRC_DATABASE_CONNECTION_H_
#define PLATFORM_SRC_DATABASE_CONNECTION_H_

#include <sqlite3.h>
#include <tuvoplatform/database.h>

#include <string>

namespace tuvo_platform {

struct Connection : TUVODB_tag {
  // cppcheck-suppress uninitDerivedMemberVar  ; {} leaves no member out
  Connection() : TUVODB_tag{} {}
  // close_v2: a statement that the caller prepared on `sqlite` may still be there; the connection
  // then ends with it instead of staying open for good.
  ~Connection() {
    sqlite3_finalize(rollback);
    sqlite3_close_v2(sqlite);
  }
  Connection(const Connection&) = delete;
  Connection& operator=(const Connection&) = delete;

  std::string error;
  // "ROLLBACK", made when the connection is: taking a transaction back must not fail for want of
  // memory, or the file would stay locked for as long as the process lives.
  sqlite3_stmt* rollback = nullptr;
  // How long the last commit left the write-ahead log, until somebody has looked; in pages.
  int log_pages = 0;
};

// Short enough to need no memory of its own in a std::string.
constexpr char kNoMemory[] = "out of memory";

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_DATABASE_CONNECTION_H_
