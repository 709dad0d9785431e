#include <alloca.h>
#include <grp.h>
#include <internal/base_db_private.h>
#include <internal/contained.h>
#include <internal/escaped.h>
#include <internal/log.h>
#include <internal/run_as.h>
#include <pwd.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <tuvoplatform/file.h>
#include <tuvoplatform/process.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>
#include <unistd.h>

#include <climits>
#include <cstdio>
#include <cstring>
#include <exception>
#include <memory>
#include <new>
#include <utility>

namespace TUVO::sharing::db {

namespace {

constexpr char kSetUp[] =
    "PRAGMA cache_size = 5000;PRAGMA foreign_keys = ON;PRAGMA journal_mode = WAL;"
    "PRAGMA synchronous = NORMAL;";

// Scratch space above this would threaten the stack, of which a thread may have only 256 KiB.
constexpr size_t kLargestStackScratch = size_t{64} * 1024;

// Short enough to need no memory of its own in a std::string.
constexpr char kNoMemory[] = "out of memory";

// Hands a statement's rows to whoever asked for them, or frees them.
void Deliver(DBResult_tag* rows, Result* result) {
  if (result != nullptr) {
    result->SetResult(rows);
  } else {
    TUVODBFreeResult(rows);
  }
}

// `scratch` is exactly twice as long as the text, so a text of quotes alone fills it and leaves no
// room for a zero.
std::string EscapeInto(char* scratch, size_t size, const std::string& text) {
  if (size > UINT_MAX ||
      TUVODBEscapeStringEX2(nullptr, scratch, static_cast<unsigned int>(size), text.data(),
                            static_cast<unsigned int>(text.size())) == -1) {
    SHARING_LOG_PID("escape failed\n\n");
    return "";
  }
  try {
    return {scratch, strnlen(scratch, size)};
  } catch (const std::exception&) {
    SHARING_LOG_PID("escape failed\n\n");
    return "";
  }
}

}  // namespace

BaseDBPrivate::BaseDBPrivate(std::string path) : path_(std::move(path)) {}

// Delegates, so that the destructor closes the connection when memory runs out in here.
BaseDBPrivate::BaseDBPrivate(std::string path, unsigned int mode) : BaseDBPrivate(std::move(path)) {
  if (TLIBCFileExist(path_.c_str()) == 0 && !Create(mode)) {
    good_ = false;
    return;
  }
  if (!Connect()) {
    good_ = false;
    return;
  }
  good_ = Init();
  if (!good_) {
    SHARING_LOG_PID("init failed\n\n");
  }
}

BaseDBPrivate::~BaseDBPrivate() {
  if (handle_ == nullptr) {
    return;
  }
  // Closing folds the write-ahead log into the file and removes it, under the identity that owns
  // both. Without that identity the connection is closed all the same.
  IF_RUN_AS(kSystemUid, kSystemGid) {
    TUVODBClose(handle_);
    return;
  }
  TUVODBClose(handle_);
}

bool BaseDBPrivate::Create(unsigned int mode) const {
  IF_RUN_AS(kSystemUid, kSystemGid) {
    // A caller that may not look into the folder takes every file for missing; one that is there
    // keeps its mode.
    if (TLIBCFileExist(path_.c_str()) != 0) {
      return true;
    }
    if (TLIBCFileTouch(path_.c_str()) == -1) {
      SHARING_LOG_PID("create database failed on %s\n\n", path_.c_str());
      return false;
    }
    if (TUVOFSAclChmod(path_.c_str(), -1, mode) == -1) {
      SHARING_LOG_PID("change mode failed on %s\n\n", path_.c_str());
      return false;
    }
    return true;
  }
  else {
    SHARING_LOG_PID("failed to run as system\n\n");
    return false;
  }
}

bool BaseDBPrivate::Connect() {
  IF_RUN_AS(kSystemUid, kSystemGid) {
    handle_ = TUVODBConnect("", "", "", path_.c_str());
  }
  else {
    SHARING_LOG_PID("failed to run as system\n\n");
    return false;
  }
  if (handle_ == nullptr) {
    SHARING_LOG_PID("db connect failed\n\n");
    return false;
  }
  return true;
}

bool BaseDBPrivate::Init() {
  return Execute(kSetUp, nullptr);
}

template <typename Operation>
bool BaseDBPrivate::Answer(Operation operation) {
  try {
    return operation();
  } catch (const EscapeFailed& failure) {
    last_error_ = failure.what();
  } catch (const std::exception&) {
    last_error_ = kNoMemory;
  }
  return false;
}

bool BaseDBPrivate::IsGood() const {
  return handle_ != nullptr && good_;
}

bool BaseDBPrivate::Execute(const std::string& sql, Result* result) {
  DBResult_tag* rows = nullptr;
  const bool done = Answer([&] { return ExecuteIfGood(sql, &rows); });
  Deliver(rows, result);
  return done;
}

bool BaseDBPrivate::ExecuteIfGood(const std::string& sql, DBResult_tag** rows) {
  if (!IsGood()) {
    SHARING_LOG_PID("db is not good.\n\n");
    return false;
  }
  if (sql.find('\0') != std::string::npos) {
    // The platform would run what stands before the zero: another statement than the one meant.
    last_error_ = "the statement holds a NUL byte";
    return false;
  }
  last_query_ = sql;
  return ExecuteAsSystem(sql, rows);
}

bool BaseDBPrivate::ExecuteAsSystem(const std::string& sql, DBResult_tag** rows) {
  IF_RUN_AS(kSystemUid, kSystemGid) {
    if (TUVODBExecute(handle_, sql.c_str(), rows) == -1) {
      last_error_ = TUVODBErrorGet(handle_);
      return false;
    }
    return true;
  }
  else {
    SHARING_LOG_PID("failed to run as system\n\n");
    return false;
  }
}

bool BaseDBPrivate::Begin() {
  return Execute("BEGIN TRANSACTION", nullptr);
}

bool BaseDBPrivate::Commit() {
  if (Execute("COMMIT", nullptr)) {
    return true;
  }
  Execute("ROLLBACK", nullptr);
  return false;
}

bool BaseDBPrivate::Insert(const std::string& table, const std::vector<std::string>& values) {
  std::string sql = "INSERT INTO " + table + " VALUES (NULL,";
  const char* separator = "";
  for (const std::string& value : values) {
    sql.append(separator).append("'").append(Escaped(*this, value)).append("'");
    separator = ",";
  }
  return Execute(sql + ")", nullptr);
}

bool BaseDBPrivate::Update(const std::string& table,
                           const std::map<std::string, std::string>& fields, int id) {
  std::string sql = "UPDATE " + table + " SET ";
  const char* separator = "";
  for (const auto& [column, value] : fields) {
    if (column == "id") {
      continue;
    }
    sql.append(separator).append(Escaped(*this, column));
    sql.append("='").append(Escaped(*this, value)).append("'");
    separator = ",";
  }
  return Execute(sql + " WHERE id=" + std::to_string(id), nullptr);
}

bool BaseDBPrivate::Delete(const std::string& table, int id) {
  return Execute("DELETE FROM " + table + " WHERE id=" + std::to_string(id), nullptr);
}

std::string BaseDBPrivate::Escape(const std::string& text) const {
  const size_t size = 2 * text.size();
  if (size <= kLargestStackScratch) {
    // cppcheck-suppress allocaCalled  ; bounded, and cheaper than the heap for every text there is
    return EscapeInto(static_cast<char*>(alloca(size)), size, text);
  }
  const std::unique_ptr<char[]> scratch(new (std::nothrow) char[size]);
  if (!scratch) {
    SHARING_LOG_PID("escape failed\n\n");
    return "";
  }
  return EscapeInto(scratch.get(), size, text);
}

bool BaseDBPrivate::GetLastInsertId(int& id) const {
  if (!IsGood()) {
    return false;
  }
  id = static_cast<int>(sqlite3_last_insert_rowid(handle_->sqlite));
  return true;
}

bool BaseDBPrivate::IsInTransaction() const {
  return handle_ != nullptr && sqlite3_get_autocommit(handle_->sqlite) == 0;
}

std::string BaseDBPrivate::GetLastError() const {
  return last_error_;
}

std::string BaseDBPrivate::GetLastQuery() const {
  return last_query_;
}

bool BaseDBPrivate::ExecuteWALCheckPoint() {
  return Execute("PRAGMA wal_checkpoint;", nullptr);
}

bool BaseDBPrivate::IsRoot() const {
  struct stat st {};
  if (TLIBCFileStat(path_.c_str(), 1, &st) != 0) {
    return false;
  }
  const passwd* owner = getpwuid(st.st_uid);
  const group* owner_group = getgrgid(st.st_gid);
  return owner != nullptr && owner_group != nullptr && std::strcmp(owner->pw_name, "root") == 0 &&
         std::strcmp(owner_group->gr_name, "root") == 0;
}

bool BaseDBPrivate::MoveRootDB() const {
  IF_RUN_AS(0, 0) {
    FILE* move = TLIBCPopen("/bin/mv", "r", path_.c_str(), "/tmp/", nullptr);
    if (move == nullptr) {
      SHARING_LOG("TLIBCPopen failed, path=%s", path_.c_str());
      return false;
    }
    // Callers have always been told "true" by a failed move; the sense stays.
    return TLIBCPclose(move) != 0;
  }
  else {
    SHARING_LOG("Permssion denied. uid=%u", getuid());
    return false;
  }
}

BaseDB::BaseDB(const std::string& path, unsigned int mode)
    : p_(std::make_unique<BaseDBPrivate>(path, mode)) {}

BaseDB::~BaseDB() = default;

bool BaseDB::IsGood() const {
  return p_->IsGood();
}

bool BaseDB::Execute(const std::string& sql, Result* result) {
  return p_->Execute(sql, result);
}

bool BaseDB::Execute(const std::string& sql, Result& result) {
  return p_->Execute(sql, &result);
}

bool BaseDB::Begin() {
  return p_->Answer([&] { return p_->Begin(); });
}

bool BaseDB::Commit() {
  return p_->Answer([&] { return p_->Commit(); });
}

bool BaseDB::Insert(const std::string& table, const std::vector<std::string>& values) {
  return p_->Answer([&] { return p_->Insert(table, values); });
}

bool BaseDB::Update(const std::string& table, const std::map<std::string, std::string>& fields,
                    int id) {
  return p_->Answer([&] { return p_->Update(table, fields, id); });
}

bool BaseDB::Delete(const std::string& table, int id) {
  return p_->Answer([&] { return p_->Delete(table, id); });
}

std::string BaseDB::Escape(const std::string& text) const {
  return p_->Escape(text);
}

bool BaseDB::GetLastInsertId(int& id) const {
  return p_->GetLastInsertId(id);
}

std::string BaseDB::GetLastError() const {
  return Contained([&] { return p_->GetLastError(); }, std::string());
}

std::string BaseDB::GetLastQuery() const {
  return Contained([&] { return p_->GetLastQuery(); }, std::string());
}

bool BaseDB::ExecuteWALCheckPoint() {
  return p_->Answer([&] { return p_->ExecuteWALCheckPoint(); });
}

bool BaseDB::Vacuum() {
  return p_->Answer([&] { return p_->Execute("VACUUM", nullptr); });
}

bool BaseDB::IsRoot() const {
  return p_->IsRoot();
}

bool BaseDB::MoveRootDB() const {
  return p_->MoveRootDB();
}

}  // namespace TUVO::sharing::db
