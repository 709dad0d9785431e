// Copying a whole database while others go on using it.
#include <fcntl.h>
#include <sqlite3.h>
#include <tuvoplatform/database.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <exception>
#include <string>

#include "database_connection.h"

namespace {

using tuvo_platform::Connection;

// Between two steps `progress` is told.
constexpr int kPagesAStep = 256;

bool Failed(Connection* connection, const char* reason) {
  connection->error = reason;
  return false;
}

// Holds what is read to one moment: without it the copying begins anew whenever another process
// has written, and beside a busy one never ends.
class OneMoment {
 public:
  explicit OneMoment(Connection* connection)
      : sqlite_(connection->sqlite),
        // A transaction begins with its first statement.
        ok_(Run("BEGIN") && Run("SELECT count(*) FROM sqlite_master")) {}
  ~OneMoment() { Run("ROLLBACK"); }
  OneMoment(const OneMoment&) = delete;
  OneMoment& operator=(const OneMoment&) = delete;

  bool ok() const { return ok_; }

 private:
  // Without the memory that rows take: it throws nothing.
  bool Run(const char* sql) {
    return sqlite3_exec(sqlite_, sql, nullptr, nullptr, nullptr) == SQLITE_OK;
  }

  sqlite3* sqlite_;
  bool ok_;
};

// The file to be made; removed unless it was kept, with the journal that a full disk leaves.
class Copy {
 public:
  explicit Copy(const char* path) : path_(path), journal_(path_ + "-journal") {
    const int fd = open(path, O_CREAT | O_EXCL | O_WRONLY | O_CLOEXEC | O_NOFOLLOW, 0600);
    made_ = fd >= 0 && close(fd) == 0;
  }
  ~Copy() {
    sqlite3_close(sqlite_);
    if (made_ && !kept_) {
      unlink(path_.c_str());
      unlink(journal_.c_str());
    }
  }
  Copy(const Copy&) = delete;
  Copy& operator=(const Copy&) = delete;

  bool IsMade() const { return made_; }
  bool Open() {
    return sqlite3_open_v2(path_.c_str(), &sqlite_, SQLITE_OPEN_READWRITE, nullptr) == SQLITE_OK;
  }
  void Keep() { kept_ = true; }
  sqlite3* Sqlite() const { return sqlite_; }

 private:
  const std::string path_;
  const std::string journal_;
  sqlite3* sqlite_ = nullptr;
  bool made_ = false;
  bool kept_ = false;
};

// SQLite's code; SQLITE_INTERRUPT when `progress` ended it.
int CopyPages(sqlite3_backup* pages, TUVODBBackupProgress progress, void* context) {
  int code = SQLITE_OK;
  while (code == SQLITE_OK) {
    code = sqlite3_backup_step(pages, kPagesAStep);
    const auto left = static_cast<unsigned int>(sqlite3_backup_remaining(pages));
    const auto total = static_cast<unsigned int>(sqlite3_backup_pagecount(pages));
    if (code == SQLITE_OK && progress != nullptr && progress(context, left, total) != 0) {
      return SQLITE_INTERRUPT;
    }
  }
  return code;
}

bool CopyAll(Connection* from, sqlite3* to, TUVODBBackupProgress progress, void* context) {
  sqlite3_backup* pages = sqlite3_backup_init(to, "main", from->sqlite, "main");
  if (pages == nullptr) {
    return Failed(from, sqlite3_errmsg(to));
  }
  const int code = CopyPages(pages, progress, context);
  sqlite3_backup_finish(pages);
  return code == SQLITE_DONE || Failed(from, sqlite3_errstr(code));
}

bool Backup(Connection* from, const char* path, TUVODBBackupProgress progress, void* context) {
  Copy copy(path);
  if (!copy.IsMade()) {
    return Failed(from, std::strerror(errno));
  }
  if (!copy.Open()) {
    return Failed(from, sqlite3_errmsg(copy.Sqlite()));
  }
  const OneMoment moment(from);
  if (!moment.ok()) {
    return Failed(from, sqlite3_errmsg(from->sqlite));
  }
  if (!CopyAll(from, copy.Sqlite(), progress, context)) {
    return false;
  }
  copy.Keep();
  return true;
}

}  // namespace

int TUVODBBackup(TUVODB* from, const char* to, TUVODBBackupProgress progress, void* context) {
  if (from == nullptr) {
    return -1;
  }
  auto* connection = static_cast<Connection*>(from);
  try {
    if (to == nullptr || *to == '\0') {
      Failed(connection, "no path");
      return -1;
    }
    if (sqlite3_get_autocommit(connection->sqlite) == 0) {
      Failed(connection, "a transaction is open");
      return -1;
    }
    return Backup(connection, to, progress, context) ? 0 : -1;
  } catch (const std::exception&) {  // the error's text does not fit
    connection->error = tuvo_platform::kNoMemory;
    return -1;
  }
}
