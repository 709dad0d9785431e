#include <fcntl.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <tuvoplatform/database.h>
#include <tuvoplatform/process.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "platform/database_handles.h"
#include "platform/failing_allocations.h"
#include "platform/temp_folder.h"
#include "support/child.h"

namespace {

using std::chrono::milliseconds;
using std::chrono::seconds;
using tuvo_test::allocations_left;
using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Error;
using tuvo_test::Execute;
using tuvo_test::Query;
using tuvo_test::Rows;
using tuvo_test::TempFolder;
using tuvo_test::Value;

// What every process that shares a file says first.
constexpr char kPragmas[] =
    "PRAGMA cache_size = 5000;PRAGMA foreign_keys = ON;PRAGMA journal_mode = WAL;"
    "PRAGMA synchronous = NORMAL;";

// Lets processes wait for each other: a byte for every Wait that may pass.
class Gate {
 public:
  Gate() {
    if (pipe2(ends_, O_CLOEXEC) != 0) {
      throw std::runtime_error("pipe2");
    }
  }
  ~Gate() {
    close(ends_[0]);
    close(ends_[1]);
  }
  Gate(const Gate&) = delete;
  Gate& operator=(const Gate&) = delete;

  void Open(size_t count = 1) {
    const std::string bytes(count, '.');
    ASSERT_EQ(static_cast<ssize_t>(count), write(ends_[1], bytes.data(), count));
  }
  void Wait() {
    char byte = 0;
    ASSERT_EQ(1, read(ends_[0], &byte, 1));
  }

 private:
  int ends_[2];
};

// Another process, running `body` and ending with what it returns.
class Process {
 public:
  explicit Process(const std::function<int()>& body) : pid_(fork()) {
    if (pid_ == 0) {
      const int code = body();
      std::fflush(nullptr);
      _exit(code);
    }
  }
  ~Process() { Wait(); }
  Process(const Process&) = delete;
  Process& operator=(const Process&) = delete;

  int Wait() {
    if (pid_ > 0) {
      int status = 0;
      waitpid(pid_, &status, 0);
      code_ = WIFEXITED(status) ? WEXITSTATUS(status) : 256 + WTERMSIG(status);
      pid_ = 0;
    }
    return code_;
  }

 private:
  pid_t pid_;
  int code_ = -1;
};

class Stopwatch {
 public:
  milliseconds Elapsed() const {
    return std::chrono::duration_cast<milliseconds>(std::chrono::steady_clock::now() - start_);
  }

 private:
  std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
};

size_t OpenDescriptors() {
  size_t count = 0;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    static_cast<void>(entry);
    ++count;
  }
  return count;
}

bool InTransaction(const Db& db) {
  return sqlite3_get_autocommit(db->sqlite) == 0;
}

class Database : public ::testing::Test {
 protected:
  Database() { Execute(db_, "CREATE TABLE t (a); CREATE TABLE u (a UNIQUE)"); }

  std::string Count() { return Value(db_, "SELECT COUNT(*) AS value FROM t"); }

  TempFolder folder_;
  const std::string path_ = folder_ / "test.db";
  Db db_ = Connect(path_);
};

// Connecting.

TEST_F(Database, ConnectingCreatesAMissingFile) {
  const std::string path = folder_ / "new.db";
  const Db db = Connect(path);
  ASSERT_NE(nullptr, db);
  EXPECT_TRUE(std::filesystem::exists(path));
  EXPECT_EQ(0, Execute(db, "CREATE TABLE t (a)"));
}

TEST_F(Database, ConnectingOpensWhatAnEarlierConnectionWrote) {
  ASSERT_EQ(0, Execute(db_, "INSERT INTO t VALUES ('kept')"));
  db_.reset();
  db_ = Connect(path_);
  EXPECT_EQ("kept", Value(db_, "SELECT a AS value FROM t"));
}

TEST_F(Database, ServerUserAndPasswordAreNotLookedAt) {
  const Db nulls(TUVODBConnect(nullptr, nullptr, nullptr, path_.c_str()));
  const Db texts(TUVODBConnect("host", "user", "secret", path_.c_str()));
  EXPECT_EQ("0", Value(nulls, "SELECT COUNT(*) AS value FROM t"));
  EXPECT_EQ("0", Value(texts, "SELECT COUNT(*) AS value FROM t"));
}

TEST_F(Database, ConnectingAnswersNullWhenTheFileCannotBeOpened) {
  const size_t before = OpenDescriptors();
  EXPECT_EQ(nullptr, Connect(folder_ / "no/such/folder.db"));
  EXPECT_EQ(nullptr, Connect(folder_.path()));
  EXPECT_EQ(nullptr, Connect(""));
  EXPECT_EQ(nullptr, TUVODBConnect("", "", "", nullptr));
  EXPECT_EQ(before, OpenDescriptors());
}

TEST_F(Database, ConnectingAnswersNullWithoutThePermission) {
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0755));
  ASSERT_EQ(0, chmod(path_.c_str(), 0600));
  EXPECT_EQ(0, tuvo_test::RunInChildAs(tuvo_test::kNobody, [&] {
              EXPECT_EQ(nullptr, Connect(path_));
              EXPECT_EQ(nullptr, Connect(folder_ / "new.db"));
              return 0;
            }));
}

TEST_F(Database, FileThatTheCallerMayOnlyReadOpensAndItsFirstWriteFails) {
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0755));
  ASSERT_EQ(0, chmod(path_.c_str(), 0644));
  EXPECT_EQ(0, tuvo_test::RunInChildAs(tuvo_test::kNobody, [&] {
              const Db db = Connect(path_);
              EXPECT_EQ("0", Value(db, "SELECT COUNT(*) AS value FROM t"));
              EXPECT_EQ(-1, Execute(db, "INSERT INTO t VALUES (1)"));
              EXPECT_EQ("attempt to write a readonly database", Error(db));
              return 0;
            }));
}

TEST_F(Database, NamesThatAreNoFilesMeanWhatTheyMeanToSqlite) {
  const std::filesystem::path before = std::filesystem::current_path();
  std::filesystem::current_path(folder_.path());
  const Db db = Connect(":memory:");
  EXPECT_EQ(0, Execute(db, "CREATE TABLE only_here (a)"));
  EXPECT_EQ(-1, Execute(Connect(":memory:"), "SELECT * FROM only_here"));
  EXPECT_FALSE(std::filesystem::exists(":memory:"));
  std::filesystem::current_path(before);
}

TEST_F(Database, FileThatIsNoDatabaseFailsAtTheFirstStatement) {
  const std::string path = folder_ / "text";
  std::ofstream(path) << std::string(4096, 'x');
  const Db db = Connect(path);
  ASSERT_NE(nullptr, db);
  EXPECT_EQ(-1, Execute(db, "CREATE TABLE t (a)"));
  EXPECT_EQ("file is not a database", Error(db));
}

TEST_F(Database, HandleBeginsWithTheSqliteConnection) {
  ASSERT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1); INSERT INTO t VALUES (2)"));
  EXPECT_EQ(2, sqlite3_last_insert_rowid(db_->sqlite));
  sqlite3* first = *reinterpret_cast<sqlite3**>(db_.get());
  EXPECT_EQ(2, sqlite3_last_insert_rowid(first));
}

TEST_F(Database, DescriptorsDoNotReachAnotherProgram) {
  ASSERT_EQ(0, Execute(db_, kPragmas));
  ASSERT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1)"));
  int own = 0;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    std::error_code gone;
    own += std::filesystem::read_symlink(entry, gone).string().find(path_) == 0 ? 1 : 0;
  }
  ASSERT_GE(own, 3);  // the database, its log and its shared memory

  const char* argv[] = {"ls", "-l", "/proc/self/fd", nullptr};
  FILE* stream = TLIBCPopenv("/bin/ls", "r", argv);
  ASSERT_NE(nullptr, stream);
  std::string listing(65536, '\0');
  listing.resize(std::fread(listing.data(), 1, listing.size(), stream));
  EXPECT_EQ(0, TLIBCPclose(stream));
  EXPECT_NE(std::string::npos, listing.find("/dev/null"));
  EXPECT_EQ(std::string::npos, listing.find(path_)) << listing;
}

// Texts of statements.

TEST_F(Database, EveryStatementIsFinishedBeforeTheNextBegins) {
  // Each would not even compile before the one ahead of it has run.
  EXPECT_EQ(0, Execute(db_,
                       "CREATE TABLE v (a); INSERT INTO v VALUES (1); ALTER TABLE v RENAME TO w;"
                       "INSERT INTO w VALUES (2); DROP TABLE t"));
  EXPECT_EQ("3", Value(db_, "SELECT SUM(a) AS value FROM w"));
}

TEST_F(Database, StatementWithRowsIsRunToItsEnd) {
  // Its rows come before it is committed; a reader that stopped after the first would undo it.
  EXPECT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1), (2), (3) RETURNING a"));
  EXPECT_EQ("3", Value(Connect(path_), "SELECT COUNT(*) AS value FROM t"));
}

TEST_F(Database, StatementThatCannotReturnRowsLeavesNoResult) {
  DBResult* result = reinterpret_cast<DBResult*>(this);
  EXPECT_EQ(0, TUVODBExecute(db_.get(), "INSERT INTO t VALUES (1)", &result));
  EXPECT_EQ(nullptr, result);
}

TEST_F(Database, StatementWithoutRowsStillLeavesAResult) {
  const Rows rows = Query(db_, "SELECT a FROM t");
  ASSERT_NE(nullptr, rows);
  unsigned int row = 0;
  EXPECT_EQ(-1, TUVODBFetchRow(rows.get(), &row));
}

TEST_F(Database, RowsOfTheLastStatementThatCanReturnSomeWin) {
  const Rows rows =
      Query(db_, "SELECT 1 AS a; SELECT 2 AS b; INSERT INTO t VALUES (1); -- the end");
  ASSERT_NE(nullptr, rows);
  EXPECT_STREQ("", TUVODBFetchField(rows.get(), 0, "a"));
  EXPECT_STREQ("2", TUVODBFetchField(rows.get(), 0, "b"));

  const Rows none = Query(db_, "SELECT 1 AS a; SELECT 2 AS a WHERE 0");
  ASSERT_NE(nullptr, none);
  EXPECT_STREQ("", TUVODBFetchField(none.get(), 0, "a"));
}

TEST_F(Database, FirstFailureEndsTheTextAndLeavesNoResult) {
  DBResult* result = reinterpret_cast<DBResult*>(this);
  EXPECT_EQ(-1, TUVODBExecute(db_.get(),
                              "SELECT 1 AS a; INSERT INTO t VALUES (1); INSERT INTO nowhere "
                              "VALUES (1); INSERT INTO t VALUES (2)",
                              &result));
  EXPECT_EQ(nullptr, result);
  EXPECT_EQ("1", Count());
}

TEST_F(Database, FailureWhileRowsAreReadLeavesNoResult) {
  DBResult* result = nullptr;
  EXPECT_EQ(-1, TUVODBExecute(db_.get(),
                              "SELECT CASE WHEN column1 = 3 THEN abs(-9223372036854775808) ELSE 1 "
                              "END AS a FROM (VALUES (1), (2), (3))",
                              &result));
  EXPECT_EQ(nullptr, result);
  EXPECT_EQ("integer overflow", Error(db_));
}

TEST_F(Database, ResultMayBeOfNoInterest) {
  EXPECT_EQ(0, TUVODBExecute(db_.get(), "SELECT 1; INSERT INTO t VALUES (1)", nullptr));
  EXPECT_EQ("1", Count());
}

TEST_F(Database, TextWithoutStatementsSucceeds) {
  for (const char* text : {"", " \n\t", ";", ";;; ;", "-- comment", "/* comment */ ; \n"}) {
    DBResult* result = nullptr;
    EXPECT_EQ(0, TUVODBExecute(db_.get(), text, &result)) << text;
    EXPECT_EQ(nullptr, result) << text;
  }
}

TEST_F(Database, NullHandleOrTextFails) {
  DBResult* result = reinterpret_cast<DBResult*>(this);
  EXPECT_EQ(-1, TUVODBExecute(nullptr, "SELECT 1", &result));
  EXPECT_EQ(nullptr, result);
  result = reinterpret_cast<DBResult*>(this);
  EXPECT_EQ(-1, TUVODBExecute(db_.get(), nullptr, &result));
  EXPECT_EQ(nullptr, result);
  EXPECT_NE("", Error(db_));
}

// Error texts.

TEST_F(Database, ErrorTextIsEmptyBeforeAnyFailure) {
  EXPECT_EQ("", Error(db_));
}

TEST_F(Database, ErrorTextIsThatOfTheLastFailure) {
  EXPECT_EQ(-1, Execute(db_, "SELECT * FROM nowhere"));
  EXPECT_EQ("no such table: nowhere", Error(db_));
  EXPECT_EQ(0, Execute(db_, "SELECT 1"));
  EXPECT_EQ("no such table: nowhere", Error(db_));
  EXPECT_EQ(-1, Execute(db_, "INSERT INTO u VALUES (1), (1)"));
  EXPECT_EQ("UNIQUE constraint failed: u.a", Error(db_));
}

TEST_F(Database, NullHandleHasAnErrorText) {
  EXPECT_STRNE("", TUVODBErrorGet(nullptr));
}

// Transactions.

TEST_F(Database, FailedTextRollsBackTheTransactionThatItOpened) {
  EXPECT_EQ(-1,
            Execute(db_, "BEGIN; INSERT INTO t VALUES (1); INSERT INTO u VALUES (1), (1); COMMIT"));
  EXPECT_FALSE(InTransaction(db_));
  EXPECT_EQ("0", Count());
}

TEST_F(Database, RollingBackKeepsTheErrorTextOfTheFailedStatement) {
  EXPECT_EQ(-1, Execute(db_, "BEGIN; INSERT INTO u VALUES (1), (1); COMMIT"));
  EXPECT_EQ("UNIQUE constraint failed: u.a", Error(db_));
  EXPECT_EQ(-1, Execute(db_, "BEGIN; no statement; COMMIT"));
  EXPECT_EQ("near \"no\": syntax error", Error(db_));
}

TEST_F(Database, FailedTextRollsBackASavepointOfItsOwn) {
  EXPECT_EQ(-1, Execute(db_, "SAVEPOINT s; INSERT INTO t VALUES (1); SELECT * FROM nowhere"));
  EXPECT_FALSE(InTransaction(db_));
  EXPECT_EQ("0", Count());
}

TEST_F(Database, FailedCommitRollsBackToo) {
  EXPECT_EQ(-1, Execute(db_,
                        "PRAGMA foreign_keys = ON; CREATE TABLE p (id INTEGER PRIMARY KEY);"
                        "CREATE TABLE c (p REFERENCES p (id) DEFERRABLE INITIALLY DEFERRED);"
                        "BEGIN; INSERT INTO c VALUES (7); COMMIT"));
  EXPECT_EQ("FOREIGN KEY constraint failed", Error(db_));
  EXPECT_FALSE(InTransaction(db_));
  EXPECT_EQ("0", Value(db_, "SELECT COUNT(*) AS value FROM c"));
}

TEST_F(Database, TransactionOfTheCallerStaysOpenAfterAFailure) {
  ASSERT_EQ(0, Execute(db_, "BEGIN TRANSACTION"));
  ASSERT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1)"));
  EXPECT_EQ(-1, Execute(db_, "INSERT INTO t VALUES (2); SELECT * FROM nowhere"));
  EXPECT_TRUE(InTransaction(db_));
  EXPECT_EQ(0, Execute(db_, "COMMIT"));
  EXPECT_EQ("2", Count());
}

TEST_F(Database, TransactionStaysOpenThatTheTextOpenedInPlaceOfTheCallers) {
  ASSERT_EQ(0, Execute(db_, "BEGIN; INSERT INTO t VALUES (1)"));
  EXPECT_EQ(-1, Execute(db_, "COMMIT; BEGIN; INSERT INTO t VALUES (2); SELECT * FROM nowhere"));
  EXPECT_TRUE(InTransaction(db_));
  EXPECT_EQ("2", Count());
  EXPECT_EQ(0, Execute(db_, "ROLLBACK"));
  EXPECT_EQ("1", Count());
}

TEST_F(Database, TransactionStaysOpenAfterASuccess) {
  EXPECT_EQ(0, Execute(db_, "BEGIN; INSERT INTO t VALUES (1)"));
  EXPECT_TRUE(InTransaction(db_));
  EXPECT_EQ(0, Execute(db_, "ROLLBACK"));
  EXPECT_EQ("0", Count());
}

TEST_F(Database, ClosingRollsBackAnOpenTransaction) {
  ASSERT_EQ(0, Execute(db_, "BEGIN; INSERT INTO t VALUES (1)"));
  db_ = Connect(path_);  // closes the first
  EXPECT_EQ("0", Count());
  EXPECT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1)"));
}

TEST_F(Database, ClosingLeavesNoDescriptor) {
  const size_t before = OpenDescriptors();
  for (int i = 0; i < 3; ++i) {
    const Db db = Connect(path_);
    ASSERT_EQ(0, Execute(db, kPragmas));
    EXPECT_GT(OpenDescriptors(), before);
  }
  EXPECT_EQ(before, OpenDescriptors());
}

// What the caller prepared on the connection may end later, and then takes the connection with it.
TEST_F(Database, ClosingWithAStatementOfTheCallersLeavesNoDescriptorEither) {
  const size_t before = OpenDescriptors();
  Db db = Connect(path_);
  sqlite3_stmt* statement = nullptr;
  ASSERT_EQ(SQLITE_OK, sqlite3_prepare_v2(db->sqlite, "SELECT 1", -1, &statement, nullptr));
  db.reset();
  EXPECT_EQ(SQLITE_ROW, sqlite3_step(statement));
  sqlite3_finalize(statement);
  EXPECT_EQ(before, OpenDescriptors());
}

TEST_F(Database, ClosingNullIsAccepted) {
  TUVODBClose(nullptr);
}

// Several processes.

// SQLite's notes on the locks of a process are copied by a fork and wrong from then on: here every
// process is forked before this one connects.
class SharedDatabase : public Database {
 protected:
  SharedDatabase() { db_.reset(); }

  // Connects with the pragmas, and uses the log once: what SQLite does about locks depends on it.
  void ConnectWithLog() {
    db_ = Connect(path_);
    ASSERT_EQ(0, Execute(db_, kPragmas));
    ASSERT_EQ("0", Count());
  }
};

// Waits for `start`, runs `sql` and holds what it locked until `done` opens and a while longer.
int HoldLock(const std::string& path, const char* sql, Gate* start, Gate* locked, Gate* done,
             seconds extra) {
  start->Wait();
  const Db db = Connect(path);
  const int code = Execute(db, sql);
  locked->Open();
  done->Wait();
  std::this_thread::sleep_for(extra);
  return code == 0 ? 0 : 1;
}

// Whether SQLite alone, without this layer's starting over, waits for a lock that `holder`, which
// waits for `start`, holds for a second after `done`.
bool SqliteAloneWaits(const Db& db, Gate* start, Gate* locked, Gate* done, Process* holder) {
  start->Open();
  locked->Wait();
  const Stopwatch watch;
  done->Open();
  const bool written =
      sqlite3_exec(db->sqlite, "INSERT INTO t VALUES (1)", nullptr, nullptr, nullptr) == SQLITE_OK;
  EXPECT_EQ(0, holder->Wait());
  return written && watch.Elapsed().count() > 800;
}

TEST_F(SharedDatabase, ConnectionWaitsFromTheStart) {
  Gate start;
  Gate locked;
  Gate done;
  Process holder(
      [&] { return HoldLock(path_, "BEGIN EXCLUSIVE", &start, &locked, &done, seconds(1)); });
  db_ = Connect(path_);
  EXPECT_TRUE(SqliteAloneWaits(db_, &start, &locked, &done, &holder));
}

TEST_F(SharedDatabase, StatementWaitsForTheLockOfAnotherProcess) {
  Gate start;
  Gate locked;
  Gate done;
  Process holder(
      [&] { return HoldLock(path_, "BEGIN EXCLUSIVE", &start, &locked, &done, seconds(1)); });
  db_ = Connect(path_);
  start.Open();
  locked.Wait();
  const Stopwatch watch;
  done.Open();
  EXPECT_EQ(0, Execute(db_, "INSERT INTO t VALUES (1)"));
  EXPECT_GT(watch.Elapsed().count(), 800);
  EXPECT_EQ(0, holder.Wait());
}

TEST_F(SharedDatabase, StatementGivesUpAfterTenSeconds) {
  Gate start;
  Gate locked;
  Gate done;
  Process holder(
      [&] { return HoldLock(path_, "BEGIN EXCLUSIVE", &start, &locked, &done, seconds(0)); });
  db_ = Connect(path_);
  start.Open();
  locked.Wait();
  const Stopwatch watch;
  EXPECT_EQ(-1, Execute(db_, "INSERT INTO t VALUES (1)"));
  EXPECT_GT(watch.Elapsed().count(), 9500);
  EXPECT_LT(watch.Elapsed().count(), 19000);
  EXPECT_EQ("database is locked", Error(db_));
  done.Open();
  EXPECT_EQ(0, holder.Wait());
}

// How long SQLite alone, told to wait ten seconds, takes to refuse a change of the journal mode.
long long SqliteAloneRefuses(const Db& db, const char* sql) {
  const Stopwatch watch;
  EXPECT_EQ(SQLITE_BUSY, sqlite3_exec(db->sqlite, sql, nullptr, nullptr, nullptr));
  return watch.Elapsed().count();
}

TEST_F(SharedDatabase, ChangeOfTheJournalModeIsTriedAgain) {
  Gate start;
  Gate locked;
  Gate done;
  Process holder(
      [&] { return HoldLock(path_, "SELECT * FROM t", &start, &locked, &done, seconds(1)); });
  ConnectWithLog();
  start.Open();
  locked.Wait();
  EXPECT_LT(SqliteAloneRefuses(db_, "PRAGMA journal_mode = DELETE"), 5000);
  const Stopwatch watch;
  done.Open();
  const Rows rows = Query(db_, "PRAGMA journal_mode = DELETE");
  EXPECT_GT(watch.Elapsed().count(), 800);
  ASSERT_NE(nullptr, rows) << Error(db_);
  EXPECT_STREQ("delete", TUVODBFetchField(rows.get(), 0, "journal_mode"));
  EXPECT_EQ(0, holder.Wait());
}

TEST_F(SharedDatabase, WaitingTimeFromOutsideLastsUntilAStatementIsStartedOver) {
  std::array<Gate, 3> start;
  std::array<Gate, 3> locked;
  std::array<Gate, 3> done;
  const auto hold = [&](size_t i, const char* sql) {
    return
        [&, i, sql] { return HoldLock(path_, sql, &start[i], &locked[i], &done[i], seconds(1)); };
  };
  Process first(hold(0, "BEGIN IMMEDIATE"));
  Process reader(hold(1, "SELECT * FROM t"));
  Process last(hold(2, "BEGIN IMMEDIATE"));
  ConnectWithLog();
  ASSERT_EQ(0, Execute(db_, "PRAGMA busy_timeout = 0"));
  EXPECT_FALSE(SqliteAloneWaits(db_, &start[0], &locked[0], &done[0], &first));
  start[1].Open();
  locked[1].Wait();
  done[1].Open();
  EXPECT_EQ(0, Execute(db_, "PRAGMA journal_mode = DELETE")) << Error(db_);
  EXPECT_EQ(0, reader.Wait());
  EXPECT_TRUE(SqliteAloneWaits(db_, &start[2], &locked[2], &done[2], &last));
}

TEST_F(SharedDatabase, ChangeOfTheJournalModeGivesUpAfterTenSecondsInAll) {
  Gate start;
  Gate locked;
  Gate done;
  Gate writer_start;
  Gate writer_locked;
  Gate writer_done;
  Process holder(
      [&] { return HoldLock(path_, "SELECT * FROM t", &start, &locked, &done, seconds(0)); });
  Process writer([&] {
    return HoldLock(path_, "BEGIN IMMEDIATE", &writer_start, &writer_locked, &writer_done,
                    seconds(1));
  });
  ConnectWithLog();
  start.Open();
  locked.Wait();
  EXPECT_LT(SqliteAloneRefuses(db_, "PRAGMA journal_mode = DELETE"), 5000);
  const Stopwatch watch;
  EXPECT_EQ(-1, Execute(db_, "PRAGMA journal_mode = DELETE"));
  EXPECT_GT(watch.Elapsed().count(), 9500);
  EXPECT_LT(watch.Elapsed().count(), 19000);
  EXPECT_EQ("database is locked", Error(db_));
  done.Open();
  EXPECT_EQ(0, holder.Wait());
  // Later statements wait as ever.
  EXPECT_TRUE(SqliteAloneWaits(db_, &writer_start, &writer_locked, &writer_done, &writer));
}

// A busy answer late in the time must not be followed by a second full wait.
TEST_F(SharedDatabase, LockMetByALaterAttemptIsNotWaitedForAnotherTenSeconds) {
  Gate start;
  Gate locked;
  Gate done;
  // As long as the writer keeps its changes in memory SQLite refuses the change of the journal mode
  // at once. When they no longer fit there and go to the file, SQLite waits for the lock instead.
  Process writer([&] {
    start.Wait();
    const Db db = Connect(path_);
    int code = Execute(db, "PRAGMA cache_size = 10; BEGIN IMMEDIATE");
    locked.Open();
    std::this_thread::sleep_for(seconds(6));
    code |= Execute(db,
                    "WITH RECURSIVE c(x) AS (SELECT 1 UNION ALL SELECT x + 1 FROM c LIMIT 9999) "
                    "INSERT INTO t SELECT 'some text to fill pages with' FROM c");
    done.Wait();
    return code == 0 ? 0 : 1;
  });
  db_ = Connect(path_);
  start.Open();
  locked.Wait();
  EXPECT_LT(SqliteAloneRefuses(db_, "PRAGMA journal_mode = WAL"), 5000);
  const Stopwatch watch;
  EXPECT_EQ(-1, Execute(db_, "PRAGMA journal_mode = WAL"));
  EXPECT_GT(watch.Elapsed().count(), 9500);
  EXPECT_LT(watch.Elapsed().count(), 15500);
  done.Open();
  EXPECT_EQ(0, writer.Wait());
}

TEST_F(SharedDatabase, NothingIsTriedAgainInsideATransaction) {
  Gate start;
  Process writer([&] {
    start.Wait();
    return Execute(Connect(path_), "INSERT INTO t VALUES (1)");
  });
  ConnectWithLog();
  ASSERT_EQ(0, Execute(db_, "BEGIN; SELECT * FROM t"));
  start.Open();
  ASSERT_EQ(0, writer.Wait());
  // What this transaction has read is out of date: it can never write.
  const Stopwatch watch;
  EXPECT_EQ(-1, Execute(db_, "INSERT INTO t VALUES (2)"));
  EXPECT_LT(watch.Elapsed().count(), 9000);
  EXPECT_EQ("database is locked", Error(db_));
  EXPECT_TRUE(InTransaction(db_));
  EXPECT_EQ(0, Execute(db_, "ROLLBACK; INSERT INTO t VALUES (2)"));
  EXPECT_EQ("2", Count());
}

TEST_F(SharedDatabase, NothingIsTriedAgainAfterARow) {
  Gate start;
  Gate locked;
  Gate done;
  Process reader([&] {
    return HoldLock(path_, "BEGIN; SELECT * FROM t", &start, &locked, &done, seconds(0));
  });
  db_ = Connect(path_);
  start.Open();
  locked.Wait();
  // The row comes before the commit, which the reader does not let through. Without SQLite's own
  // waiting the time left would allow another attempt.
  ASSERT_EQ(0, Execute(db_, "PRAGMA busy_timeout = 0"));
  const Stopwatch watch;
  EXPECT_EQ(nullptr, Query(db_, "INSERT INTO t VALUES (1) RETURNING a"));
  EXPECT_LT(watch.Elapsed().count(), 9000);
  EXPECT_EQ("database is locked", Error(db_));
  done.Open();
  EXPECT_EQ(0, reader.Wait());
  EXPECT_EQ("0", Count());
}

TEST_F(SharedDatabase, TwelveProcessesOpenANewFileTogether) {
  constexpr size_t kProcesses = 12;
  for (int round = 0; round < 60; ++round) {
    const std::string path = folder_ / ("new" + std::to_string(round) + ".db");
    Gate start;
    std::vector<std::unique_ptr<Process>> processes;
    for (size_t i = 0; i < kProcesses; ++i) {
      processes.push_back(std::make_unique<Process>([&] {
        start.Wait();
        const Db db = Connect(path);
        if (db == nullptr) {
          return 2;
        }
        if (Execute(db, kPragmas) != 0) {
          std::fprintf(stderr, "%s\n", TUVODBErrorGet(db.get()));
          return 1;
        }
        return Value(db, "SELECT journal_mode AS value FROM pragma_journal_mode") == "wal" ? 0 : 3;
      }));
    }
    start.Open(kProcesses);
    for (const auto& process : processes) {
      EXPECT_EQ(0, process->Wait()) << "round " << round;
    }
  }
}

TEST_F(SharedDatabase, ProcessesThatWriteTogetherLoseNothing) {
  constexpr size_t kProcesses = 6;
  constexpr int kRows = 100;
  Gate start;
  std::vector<std::unique_ptr<Process>> processes;
  for (size_t i = 0; i < kProcesses; ++i) {
    processes.push_back(std::make_unique<Process>([&] {
      start.Wait();
      const Db db = Connect(path_);
      int code = Execute(db, kPragmas);
      for (int row = 0; row < kRows; ++row) {
        code |= Execute(db, "INSERT INTO t VALUES (1); PRAGMA wal_checkpoint;");
      }
      return code == 0 ? 0 : 1;
    }));
  }
  start.Open(kProcesses);
  for (const auto& process : processes) {
    EXPECT_EQ(0, process->Wait());
  }
  db_ = Connect(path_);
  EXPECT_EQ(std::to_string(kProcesses * kRows), Count());
}

// Memory.

TEST_F(Database, EveryLackOfMemoryIsAFailureAndNoException) {
  const std::string sql =
      "BEGIN; INSERT INTO t VALUES (1); SELECT 'a name longer than a string object holds' AS "
      "\"a column name longer than a string object holds\" UNION ALL SELECT 'another'";
  int failures = 0;
  for (;; ++failures) {
    DBResult* result = reinterpret_cast<DBResult*>(this);
    allocations_left = failures;
    const int code = TUVODBExecute(db_.get(), sql.c_str(), &result);
    allocations_left = -1;
    const Rows rows(result);
    if (code == 0) {
      break;
    }
    ASSERT_EQ(-1, code);
    ASSERT_EQ(nullptr, result);
    ASSERT_EQ("out of memory", Error(db_));
    ASSERT_FALSE(InTransaction(db_));
  }
  EXPECT_GT(failures, 3);
  EXPECT_EQ(0, Execute(db_, "COMMIT"));
  EXPECT_EQ("1", Count());
}

TEST_F(Database, ErrorTextThatDoesNotFitIsReplaced) {
  allocations_left = 0;
  const int code = TUVODBExecute(db_.get(), "SELECT * FROM nowhere", nullptr);
  allocations_left = -1;
  EXPECT_EQ(-1, code);
  EXPECT_EQ("out of memory", Error(db_));
}

TEST_F(Database, ConnectingWithoutMemoryAnswersNull) {
  allocations_left = 0;
  TUVODB* db = TUVODBConnect("", "", "", path_.c_str());
  allocations_left = -1;
  EXPECT_EQ(nullptr, db);
}

}  // namespace
