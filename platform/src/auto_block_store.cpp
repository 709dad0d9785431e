#include "auto_block_store.h"

#include <fcntl.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <ctime>
#include <stdexcept>
#include <system_error>

#include "database_wait.h"

namespace tuvo_platform {

namespace {

constexpr mode_t kMode = 0660;
constexpr int64_t kLayout = 1;  // kept in the file as its user_version

struct Finalizer {
  void operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }
};
using Statement = std::unique_ptr<sqlite3_stmt, Finalizer>;

[[noreturn]] void Fail(sqlite3* database) {
  throw std::runtime_error(sqlite3_errmsg(database));
}

// SQLite would create the file with a mode of its own. Whoever loses the race to create it finds
// it there, which is as good.
void CreateWithMode(const std::string& path) {
  const int file = open(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, kMode);
  if (file < 0) {
    if (errno == EEXIST) {
      return;
    }
    throw std::system_error(errno, std::generic_category(), path);
  }
  // The file mode mask may have taken bits away.
  const int status = fchmod(file, kMode);
  const int error = errno;
  close(file);
  if (status != 0) {
    throw std::system_error(error, std::generic_category(), path);
  }
}

}  // namespace

// Rolled back at the end of its scope unless committed.
class AutoBlockStore::Transaction {
 public:
  explicit Transaction(AutoBlockStore* store) : store_(store) { store_->Run("BEGIN IMMEDIATE"); }
  ~Transaction() {
    if (!committed_) {
      sqlite3_exec(store_->database_.get(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
  }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;

  void Commit() {
    store_->Run("COMMIT");
    committed_ = true;
  }

 private:
  AutoBlockStore* const store_;
  bool committed_ = false;
};

void AutoBlockStore::Closer::operator()(sqlite3* database) const {
  sqlite3_close(database);
}

AutoBlockStore::AutoBlockStore(const std::string& path) {
  CreateWithMode(path);
  sqlite3* database = nullptr;
  const int status = sqlite3_open_v2(path.c_str(), &database, SQLITE_OPEN_READWRITE, nullptr);
  database_.reset(database);
  if (status != SQLITE_OK) {
    throw std::runtime_error(database == nullptr ? sqlite3_errstr(status)
                                                 : sqlite3_errmsg(database));
  }
  SetBusyWait(database);
  Prepare();
}

void AutoBlockStore::Prepare() {
  const int64_t layout = Run("PRAGMA user_version").value_or(0);
  if (layout == kLayout) {
    return;
  }
  if (layout != 0) {
    throw std::runtime_error("unknown layout " + std::to_string(layout));
  }
  // Another process may be doing the same; the second one then finds everything in place.
  Transaction transaction(this);
  Run("CREATE TABLE IF NOT EXISTS failure (id INTEGER PRIMARY KEY, network TEXT NOT NULL, "
      "service TEXT NOT NULL, at INTEGER NOT NULL)");
  Run("CREATE INDEX IF NOT EXISTS failure_network ON failure (network, service)");
  Run("CREATE INDEX IF NOT EXISTS failure_at ON failure (at)");
  Run("CREATE TABLE IF NOT EXISTS denial (id INTEGER PRIMARY KEY, network TEXT NOT NULL UNIQUE, "
      "until INTEGER NOT NULL)");
  Run("CREATE INDEX IF NOT EXISTS denial_until ON denial (until)");
  Run("PRAGMA user_version = 1");
  transaction.Commit();
}

void AutoBlockStore::CountFailure(const std::string& network, const std::string& service,
                                  const AutoBlockLimits& limits) {
  Transaction transaction(this);
  // Read under the write lock, so that nobody's failure is later than what counts as now.
  const int64_t now = time(nullptr);
  ForgetWhatIsOver(now, limits);
  if (!IsDeniedAt(network, now)) {
    Run("INSERT INTO failure (network, service, at) VALUES (?, ?, ?)", {network, service, now});
    const std::optional<int64_t> failures =
        Run("SELECT COUNT(*) FROM failure WHERE network = ? AND service = ?", {network, service});
    if (failures.value_or(0) >= limits.failures) {
      Deny(network, now + limits.block_seconds);
    }
  }
  transaction.Commit();
}

void AutoBlockStore::Forget(const std::string& network) {
  // Most visitors have nothing against them, and need not wait for who is writing.
  if (!Run("SELECT 1 FROM failure WHERE network = ?1 UNION ALL SELECT 1 FROM denial WHERE network "
           "= ?1",
           {network})) {
    return;
  }
  Transaction transaction(this);
  Run("DELETE FROM failure WHERE network = ?", {network});
  Run("DELETE FROM denial WHERE network = ?", {network});
  transaction.Commit();
}

bool AutoBlockStore::IsDenied(const std::string& network) {
  return IsDeniedAt(network, time(nullptr));
}

// A clock that is set back leaves times in the future behind, which would hold for as long as the
// clock was wrong: they are taken to be as late as they can be.
void AutoBlockStore::ForgetWhatIsOver(int64_t now, const AutoBlockLimits& limits) {
  Run("DELETE FROM failure WHERE at < ?", {now - limits.window_seconds});
  Run("UPDATE failure SET at = ?1 WHERE at > ?1", {now});
  Run("DELETE FROM denial WHERE until <= ?", {now});
  Run("UPDATE denial SET until = ?1 WHERE until > ?1", {now + limits.block_seconds});
  // Ids grow in the order of insertion. Room for one is left, for the row that may be added now.
  Run("DELETE FROM failure WHERE id <= (SELECT MAX(id) FROM failure) - ?", {kMaxAutoBlockRows - 1});
  Run("DELETE FROM denial WHERE id <= (SELECT MAX(id) FROM denial) - ?", {kMaxAutoBlockRows - 1});
}

void AutoBlockStore::Deny(const std::string& network, int64_t until) {
  Run("INSERT INTO denial (network, until) VALUES (?, ?)", {network, until});
  Run("DELETE FROM failure WHERE network = ?", {network});
}

bool AutoBlockStore::IsDeniedAt(const std::string& network, int64_t now) {
  return Run("SELECT 1 FROM denial WHERE network = ? AND until > ?", {network, now}).has_value();
}

std::optional<int64_t> AutoBlockStore::Run(const char* sql, std::initializer_list<Value> values) {
  sqlite3* database = database_.get();
  sqlite3_stmt* prepared = nullptr;
  if (sqlite3_prepare_v2(database, sql, -1, &prepared, nullptr) != SQLITE_OK) {
    Fail(database);
  }
  const Statement statement(prepared);
  int index = 0;
  for (const Value& value : values) {
    ++index;
    const int status =
        std::holds_alternative<int64_t>(value)
            ? sqlite3_bind_int64(prepared, index, std::get<int64_t>(value))
            : sqlite3_bind_text(prepared, index, std::get<std::string>(value).data(),
                                static_cast<int>(std::get<std::string>(value).size()),
                                SQLITE_STATIC);
    if (status != SQLITE_OK) {
      Fail(database);
    }
  }
  std::optional<int64_t> first;
  int status = SQLITE_OK;
  while ((status = sqlite3_step(prepared)) == SQLITE_ROW) {
    if (!first) {
      first = sqlite3_column_int64(prepared, 0);
    }
  }
  if (status != SQLITE_DONE) {
    Fail(database);
  }
  return first;
}

}  // namespace tuvo_platform
