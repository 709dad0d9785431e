// The connection: creation and opening of the file, statements, escaping, moving aside.
#include <fcntl.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <internal/base_db_private.h>
#include <pthread.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/resource.h>
#include <syslog.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>

#include <cerrno>
#include <climits>
#include <functional>
#include <locale>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include "log_lines.h"
#include "sqlite_file.h"
#include "support/child.h"
#include "support/class_layout.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace tuvo_test {

using TUVO::sharing::db::BaseDBPrivate;
auto MembersOf(const BaseDBPrivate&);
template struct Reveal<BaseDBPrivate, &BaseDBPrivate::good_, &BaseDBPrivate::path_,
                       &BaseDBPrivate::handle_, &BaseDBPrivate::last_error_,
                       &BaseDBPrivate::last_query_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::BaseDBPrivate;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using tuvo_test::CurrentIds;
using tuvo_test::Exists;
using tuvo_test::kNobody;
using tuvo_test::kPrivateFolder;
using tuvo_test::kRoot;
using tuvo_test::kSavedRoot;
using tuvo_test::LogLine;
using tuvo_test::MembersOf;
using tuvo_test::NewPath;
using tuvo_test::OwnerAndMode;
using tuvo_test::RunInChild;
using tuvo_test::RunInChildAs;
using tuvo_test::SqliteFile;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using tuvo_test::ToText;
using tuvo_test::WriteFile;
using Lines = std::vector<std::string>;

constexpr unsigned int kMode = 0660;
constexpr char kSetUp[] =
    "PRAGMA cache_size = 5000;PRAGMA foreign_keys = ON;PRAGMA journal_mode = WAL;"
    "PRAGMA synchronous = NORMAL;";
const std::string kSwitchLine = "base_db:LINE ERROR: IF_RUN_AS(1, 1)";
const std::string kNotSystemLine = "base_db:LINE (PID) failed to run as system\n\n";

std::string PrivatePath(const char* name) {
  return NewPath(kPrivateFolder + std::string(name));
}

// The first value of the first row; the statement must succeed.
std::string Value(BaseDB& db, const std::string& sql, const char* column) {
  Result result;
  Row row;
  EXPECT_TRUE(db.Execute(sql, result)) << sql << ": " << db.GetLastError();
  EXPECT_TRUE(result.NextRow(row)) << sql;
  return row.GetField(column).AsString("");
}

// A good connection with an empty table t of two texts.
class Database : public testing::Test {
 protected:
  Database() : db_(NewPath("/tmp/base.db"), kMode) {
    EXPECT_TRUE(db_.IsGood());
    EXPECT_TRUE(db_.Execute("CREATE TABLE t (id INTEGER PRIMARY KEY, a TEXT, b TEXT)"));
  }

  // The rows as "id|a|b".
  Lines Rows() {
    Lines rows;
    Result result;
    Row row;
    EXPECT_TRUE(db_.Execute("SELECT * FROM t ORDER BY id", result));
    while (result.NextRow(row)) {
      rows.push_back(row.GetField("id").AsString("") + "|" + row.GetField("a").AsString("") + "|" +
                     row.GetField("b").AsString(""));
    }
    return rows;
  }

  BaseDB db_;
};

// Programs that were built against the library rely on both.
TEST(BaseDB, ItsTableHasTheDestructorAloneAndItHoldsOnePointer) {
  EXPECT_TRUE(std::has_virtual_destructor_v<BaseDB>);
  EXPECT_EQ(sizeof(BaseDB), 2 * sizeof(void*));
  if (tuvo_test::kTablesCanBeRead) {
    EXPECT_EQ(tuvo_test::SlotCount<BaseDB>(), 2U);
    EXPECT_EQ(tuvo_test::SlotCount<BaseDBPrivate>(), 2U);
  }
}

TEST(BaseDB, ItsFieldsStandInTheirOrder) {
  const BaseDBPrivate db("/tmp", kMode);
  EXPECT_TRUE(tuvo_test::StandInThisOrder(db, MembersOf(db)));
  EXPECT_TRUE((std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(db))>,
                              std::tuple<bool, std::string, TUVODB*, std::string, std::string>>));
}

TEST(BaseDB, CannotBeCopied) {
  EXPECT_FALSE(std::is_copy_constructible_v<BaseDB>);
  EXPECT_FALSE(std::is_copy_assignable_v<BaseDB>);
}

// --- Creation and opening ---------------------------------------------------------------------

TEST(BaseDB, TheModeOfANewFileIsTheOneAskedForWhateverTheUmask) {
  const mode_t former = umask(077);
  for (const unsigned int mode : {0660U, 0600U, 0644U, 0666U}) {
    const std::string path = PrivatePath("mode.db");
    EXPECT_TRUE(BaseDB(path, mode).IsGood());
    char wanted[16];
    std::snprintf(wanted, sizeof wanted, "1:1 %04o", mode);
    EXPECT_EQ(OwnerAndMode(path), wanted);
  }
  umask(former);
}

TEST(BaseDB, AnExistingFileKeepsItsOwnerAndMode) {
  struct Kept {
    uid_t uid;
    gid_t gid;
    mode_t mode;
    const char* text;
  };
  for (const Kept& kept : {Kept{0, 0, 0666, "0:0 0666"}, Kept{2001, 3001, 0646, "2001:3001 0646"},
                           Kept{1, 1, 0600, "1:1 0600"}, Kept{0, 1, 0664, "0:1 0664"}}) {
    const std::string path = NewPath("/tmp/kept.db");
    WriteFile(path, "");
    ASSERT_EQ(chown(path.c_str(), kept.uid, kept.gid), 0);
    ASSERT_EQ(chmod(path.c_str(), kept.mode), 0);
    {
      BaseDB db(path, kMode);
      EXPECT_TRUE(db.IsGood()) << kept.text;
      EXPECT_TRUE(db.Execute("CREATE TABLE t (a)")) << kept.text;
    }
    EXPECT_EQ(OwnerAndMode(path), kept.text);
  }
}

// To a caller who may not look into the folder every file seems to be missing.
TEST(BaseDB, AnExistingFileThatTheCallerCannotSeeKeepsItsModeToo) {
  SyslogListener listener;
  const std::string folder = kPrivateFolder + std::string("closed");
  mkdir(folder.c_str(), 0700);
  ASSERT_EQ(chown(folder.c_str(), 1, 1), 0);
  const std::string path = NewPath(folder + "/hidden.db");
  WriteFile(path, "");
  ASSERT_EQ(chown(path.c_str(), 1, 1), 0);
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [&] {
                           EXPECT_FALSE(Exists(path));
                           EXPECT_TRUE(BaseDB(path, kMode).IsGood());
                           return 0;
                         }),
            0);
  EXPECT_EQ(OwnerAndMode(path), "1:1 0600");
  EXPECT_EQ(TakeLines(listener), Lines{});
}

TEST(BaseDB, ANewFileIsGoodAndHasNothingToTell) {
  SyslogListener listener;
  const BaseDB db(PrivatePath("silent.db"), kMode);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(db.GetLastError(), "");
  EXPECT_EQ(db.GetLastQuery(), kSetUp);
  EXPECT_EQ(TakeLines(listener), Lines{});
}

TEST(BaseDB, TheConnectionIsSetUp) {
  BaseDB db(PrivatePath("pragmas.db"), kMode);
  EXPECT_EQ(Value(db, "PRAGMA cache_size", "cache_size"), "5000");
  EXPECT_EQ(Value(db, "PRAGMA foreign_keys", "foreign_keys"), "1");
  EXPECT_EQ(Value(db, "PRAGMA journal_mode", "journal_mode"), "wal");
  EXPECT_EQ(Value(db, "PRAGMA synchronous", "synchronous"), "1");
}

// What is logged by opening `path`, which must not end good.
Lines LinesOfFailedOpening(const std::string& path) {
  SyslogListener listener;
  const BaseDB db(path, kMode);
  EXPECT_FALSE(db.IsGood());
  EXPECT_EQ(ToText(CurrentIds()), ToText(kRoot));
  return TakeLines(listener);
}

TEST(BaseDB, AFileThatCannotBeMadeIsNamed) {
  EXPECT_EQ(LinesOfFailedOpening("/tmp/no such folder/x.db"),
            Lines{"base_db:LINE (PID) create database failed on /tmp/no such folder/x.db\n\n"});
}

TEST(BaseDB, AFileInAFolderOfRootCannotBeMade) {
  EXPECT_EQ(LinesOfFailedOpening("/usr/tuvo/etc/x.db"),
            Lines{"base_db:LINE (PID) create database failed on /usr/tuvo/etc/x.db\n\n"});
}

TEST(BaseDB, AnEmptyPathIsAFileThatCannotBeMade) {
  EXPECT_EQ(LinesOfFailedOpening(""), Lines{"base_db:LINE (PID) create database failed on \n\n"});
}

TEST(BaseDB, AModeThatCannotBeSetFailsTheOpening) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  SyslogListener listener;
  const std::string path = PrivatePath("mode refused.db");
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [&] {
                           EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kChmod, EPERM}}));
                           const BaseDB db(path, kMode);
                           EXPECT_FALSE(db.IsGood());
                           EXPECT_EQ(db.GetLastQuery(), "");
                           EXPECT_EQ(ToText(CurrentIds()), ToText(kSavedRoot));
                           return 0;
                         }),
            0);
  EXPECT_EQ(TakeLines(listener),
            Lines{"base_db:LINE (PID) change mode failed on " + path + "\n\n"});
  EXPECT_EQ(OwnerAndMode(path), "1:1 0600");
}

TEST(BaseDB, AFolderCannotBeConnectedTo) {
  EXPECT_EQ(LinesOfFailedOpening("/tmp"), Lines{"base_db:LINE (PID) db connect failed\n\n"});
}

TEST(BaseDB, AFileThatTheSystemIdentityMayNotReadCannotBeConnectedTo) {
  const std::string path = NewPath("/tmp/roots own.db");
  WriteFile(path, "");
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  EXPECT_EQ(LinesOfFailedOpening(path), Lines{"base_db:LINE (PID) db connect failed\n\n"});
}

std::string PathOfNoDatabase() {
  std::string path = NewPath("/tmp/no database.db");
  WriteFile(path, std::string(5000, 'x'));
  EXPECT_EQ(chmod(path.c_str(), 0666), 0);
  return path;
}

TEST(BaseDB, AFileThatIsNoDatabaseFailsTheSetUp) {
  const std::string path = PathOfNoDatabase();
  EXPECT_EQ(LinesOfFailedOpening(path), Lines{"base_db:LINE (PID) init failed\n\n"});
  const BaseDB db(path, kMode);
  EXPECT_EQ(db.GetLastQuery(), kSetUp);
  EXPECT_EQ(db.GetLastError(), "file is not a database");
}

// It is connected to, but its journal mode cannot be changed.
TEST(BaseDB, AFileThatMayOnlyBeReadFailsTheSetUp) {
  const std::string path = NewPath("/tmp/read only.db");
  SqliteFile(path).Execute("CREATE TABLE t (a)");
  ASSERT_EQ(chmod(path.c_str(), 0444), 0);
  EXPECT_EQ(LinesOfFailedOpening(path), Lines{"base_db:LINE (PID) init failed\n\n"});
}

TEST(BaseDB, ADatabaseThatIsNotGoodRefusesStatementsAndRemembersNothingOfThem) {
  SyslogListener listener;
  BaseDB db("/tmp/no such folder/x.db", kMode);
  listener.Take();
  Result result;
  EXPECT_FALSE(db.Execute("SELECT 1", result));
  EXPECT_FALSE(result.IsGood());
  EXPECT_FALSE(db.Execute("SELECT 1"));
  EXPECT_FALSE(db.Execute("SELECT 1", nullptr));
  EXPECT_EQ(db.GetLastQuery(), "");
  EXPECT_EQ(db.GetLastError(), "");
  EXPECT_EQ(TakeLines(listener), Lines(3, "base_db:LINE (PID) db is not good.\n\n"));
}

TEST(BaseDB, ADatabaseThatIsNotGoodFailsEveryOperationWithTheSameLine) {
  SyslogListener listener;
  BaseDB db("/tmp/no such folder/x.db", kMode);
  listener.Take();
  EXPECT_FALSE(db.Begin());
  EXPECT_FALSE(db.Insert("t", {"a"}));
  EXPECT_FALSE(db.Update("t", {{"a", "b"}}, 1));
  EXPECT_FALSE(db.Delete("t", 1));
  EXPECT_FALSE(db.ExecuteWALCheckPoint());
  EXPECT_FALSE(db.Vacuum());
  EXPECT_EQ(TakeLines(listener), Lines(6, "base_db:LINE (PID) db is not good.\n\n"));
  EXPECT_FALSE(db.Commit());  // the commit and the roll-back
  EXPECT_EQ(TakeLines(listener), Lines(2, "base_db:LINE (PID) db is not good.\n\n"));
}

TEST(BaseDB, WithoutADatabaseThereIsNoLastInsertIdButEscapingGoesOn) {
  SyslogListener listener;
  const BaseDB db("/tmp/no such folder/x.db", kMode);
  listener.Take();
  int id = 77;
  EXPECT_FALSE(db.GetLastInsertId(id));
  EXPECT_EQ(id, 77);
  EXPECT_EQ(db.Escape("it's"), "it''s");
  EXPECT_EQ(TakeLines(listener), Lines{});
}

TEST(BaseDB, AFileWhoseSetUpFailedStaysNotGood) {
  SyslogListener listener;
  BaseDB db(PathOfNoDatabase(), kMode);
  listener.Take();
  EXPECT_FALSE(db.Execute("SELECT 1"));
  EXPECT_EQ(db.GetLastQuery(), kSetUp);
  int id = 77;
  EXPECT_FALSE(db.GetLastInsertId(id));
  EXPECT_EQ(id, 77);
  EXPECT_EQ(TakeLines(listener), Lines{"base_db:LINE (PID) db is not good.\n\n"});
}

TEST(BaseDB, ClosingRollsAnOpenTransactionBack) {
  const std::string path = PrivatePath("open.db");
  {
    BaseDB db(path, kMode);
    EXPECT_TRUE(db.Execute("CREATE TABLE t (a)"));
    EXPECT_TRUE(db.Begin());
    EXPECT_TRUE(db.Execute("INSERT INTO t VALUES (1)"));
  }
  EXPECT_EQ(SqliteFile(path).Value("SELECT COUNT(*) FROM t"), "0");
}

// --- Statements -------------------------------------------------------------------------------

TEST_F(Database, AStatementsRowsArriveInTheResult) {
  Result result;
  EXPECT_TRUE(db_.Execute("SELECT 'x' AS c", &result));
  EXPECT_TRUE(result.IsGood());
  Row row;
  EXPECT_TRUE(result.NextRow(row));
  EXPECT_EQ(row.GetField("c").AsString(""), "x");
  EXPECT_FALSE(result.NextRow(row));
  EXPECT_EQ(db_.GetLastQuery(), "SELECT 'x' AS c");
}

TEST_F(Database, StatementWithoutRowsStillLeavesAResultWhenItCouldReturnSome) {
  Result result;
  EXPECT_TRUE(db_.Execute("SELECT * FROM t", result));
  EXPECT_TRUE(result.IsGood());
  Row row;
  EXPECT_FALSE(result.NextRow(row));
}

TEST_F(Database, AStatementThatReturnsNothingLeavesNoResult) {
  Result result;
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (NULL, 'a', 'b')", result));
  EXPECT_FALSE(result.IsGood());
}

TEST_F(Database, ATextMayHoldSeveralStatements) {
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (1,'a','b');INSERT INTO t VALUES (2,'c','d');"));
  EXPECT_EQ(Rows(), (Lines{"1|a|b", "2|c|d"}));
}

TEST_F(Database, AnEmptyTextIsASuccess) {
  EXPECT_TRUE(db_.Execute(""));
  EXPECT_EQ(db_.GetLastQuery(), "");
}

TEST_F(Database, AFailedStatementLeavesItsTextAndTheReasonAndNoLine) {
  SyslogListener listener;
  Result result;
  EXPECT_FALSE(db_.Execute("SELECT * FROM missing", result));
  EXPECT_FALSE(result.IsGood());
  EXPECT_EQ(db_.GetLastQuery(), "SELECT * FROM missing");
  EXPECT_EQ(db_.GetLastError(), "no such table: missing");
  EXPECT_EQ(TakeLines(listener), Lines{});
}

TEST_F(Database, ASuccessDoesNotClearTheReasonOfAnEarlierFailure) {
  EXPECT_FALSE(db_.Execute("SELECT * FROM missing"));
  EXPECT_TRUE(db_.Execute("SELECT 1"));
  EXPECT_EQ(db_.GetLastError(), "no such table: missing");
  EXPECT_EQ(db_.GetLastQuery(), "SELECT 1");
}

TEST_F(Database, StatementsBeforeTheFailingOneOfATextStayDone) {
  EXPECT_FALSE(
      db_.Execute("INSERT INTO t VALUES (1,'a','b');nonsense;INSERT INTO t VALUES (2,'c','d')"));
  EXPECT_EQ(Rows(), Lines{"1|a|b"});
}

// Only the part before it would reach the database: here, a delete of everything.
TEST_F(Database, AStatementWithANulByteIsRefused) {
  SyslogListener listener;
  ASSERT_TRUE(db_.Insert("t", {"a", "b"}));
  const std::string sql("DELETE FROM t\0 WHERE id = 5", 27);
  Result result;
  EXPECT_FALSE(db_.Execute(sql, result));
  EXPECT_FALSE(result.IsGood());
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO t VALUES (NULL,'a','b')");
  EXPECT_NE(db_.GetLastError(), "");
  EXPECT_EQ(TakeLines(listener), Lines{});
  EXPECT_FALSE(db_.Execute(std::string("\0", 1)));
  EXPECT_FALSE(db_.Execute(std::string("DELETE FROM t\0", 14)));
  EXPECT_FALSE(db_.Delete(std::string("t\0x", 3), 5));
  EXPECT_EQ(Rows(), Lines{"1|a|b"});
}

TEST(BaseDB, AProcessThatLostItsWayBackFailsEveryStatement) {
  SyslogListener listener;
  const std::string path = PrivatePath("lost.db");
  EXPECT_EQ(RunInChild([&] {
              auto db = std::make_unique<BaseDB>(path, kMode);
              EXPECT_TRUE(db->IsGood());
              EXPECT_EQ(setgroups(0, nullptr), 0);
              EXPECT_EQ(setresgid(65534, 65534, 65534), 0);
              EXPECT_EQ(setresuid(65534, 65534, 65534), 0);
              Result result;
              EXPECT_FALSE(db->Execute("SELECT 1", result));
              EXPECT_FALSE(result.IsGood());
              EXPECT_EQ(db->GetLastQuery(), "SELECT 1");
              EXPECT_EQ(db->GetLastError(), "");
              EXPECT_TRUE(db->IsGood());
              EXPECT_EQ(ToText(CurrentIds()), ToText(kNobody));
              _exit(testing::Test::HasFailure() ? 1 : 0);  // its closing is another matter
              return 0;
            }),
            0);
  EXPECT_EQ(TakeLines(listener), (Lines{kSwitchLine, kNotSystemLine}));
}

TEST_F(Database, BeginAndCommitKeepWhatWasDone) {
  EXPECT_TRUE(db_.Begin());
  EXPECT_EQ(db_.GetLastQuery(), "BEGIN TRANSACTION");
  EXPECT_TRUE(db_.Insert("t", {"a", "b"}));
  EXPECT_EQ(SqliteFile("/tmp/base.db").Value("SELECT COUNT(*) FROM t"), "0");
  EXPECT_TRUE(db_.Commit());
  EXPECT_EQ(db_.GetLastQuery(), "COMMIT");
  EXPECT_EQ(SqliteFile("/tmp/base.db").Value("SELECT COUNT(*) FROM t"), "1");
}

TEST_F(Database, ACommitWithoutATransactionFailsAndRollsBackInVain) {
  EXPECT_FALSE(db_.Commit());
  EXPECT_EQ(db_.GetLastQuery(), "ROLLBACK");
  EXPECT_EQ(db_.GetLastError(), "cannot rollback - no transaction is active");
}

TEST_F(Database, ACommitThatFailsIsRolledBack) {
  ASSERT_TRUE(
      db_.Execute("CREATE TABLE child (p REFERENCES t (id) DEFERRABLE INITIALLY DEFERRED)"));
  EXPECT_TRUE(db_.Begin());
  EXPECT_TRUE(db_.Execute("INSERT INTO child VALUES (5)"));
  EXPECT_FALSE(db_.Commit());
  EXPECT_EQ(db_.GetLastQuery(), "ROLLBACK");
  EXPECT_EQ(db_.GetLastError(), "FOREIGN KEY constraint failed");
  EXPECT_EQ(Value(db_, "SELECT COUNT(*) AS c FROM child", "c"), "0");
  EXPECT_TRUE(db_.Begin()) << "the transaction is over";
}

TEST_F(Database, ASecondBeginFailsAndLeavesTheFirst) {
  EXPECT_TRUE(db_.Begin());
  EXPECT_FALSE(db_.Begin());
  EXPECT_TRUE(db_.Insert("t", {"a", "b"}));
  EXPECT_TRUE(db_.Commit());
  EXPECT_EQ(Rows(), Lines{"1|a|b"});
}

TEST_F(Database, AnInsertWritesNullForTheIdAndQuotesAndEscapesTheValues) {
  EXPECT_TRUE(db_.Insert("t", {"a", "it's"}));
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO t VALUES (NULL,'a','it''s')");
  EXPECT_EQ(Rows(), Lines{"1|a|it's"});
}

TEST_F(Database, AnInsertWithoutValuesIsWrittenAndFails) {
  EXPECT_FALSE(db_.Insert("t", {}));
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO t VALUES (NULL,)");
}

TEST_F(Database, AnEmptyValueIsAnEmptyText) {
  EXPECT_TRUE(db_.Insert("t", {"", ""}));
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO t VALUES (NULL,'','')");
}

TEST_F(Database, TheTableIsWrittenUnescaped) {
  EXPECT_FALSE(db_.Insert("it's", {"a"}));
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO it's VALUES (NULL,'a')");
  EXPECT_FALSE(db_.Update("it's", {{"a", "b"}}, 1));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE it's SET a='b' WHERE id=1");
  EXPECT_FALSE(db_.Delete("it's", 1));
  EXPECT_EQ(db_.GetLastQuery(), "DELETE FROM it's WHERE id=1");
}

TEST_F(Database, AnUpdateListsTheColumnsInByteOrderWithoutTheId) {
  ASSERT_TRUE(db_.Execute("INSERT INTO t VALUES (7,'x','y')"));
  EXPECT_TRUE(db_.Update("t", {{"b", "2"}, {"a", "1"}, {"id", "7"}}, 7));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET a='1',b='2' WHERE id=7");
  EXPECT_EQ(Rows(), Lines{"7|1|2"});
}

TEST_F(Database, AnUpdateSkipsTheIdWhereverItStands) {
  EXPECT_TRUE(db_.Update("t", {{"id", "9"}, {"b", "2"}}, 7));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET b='2' WHERE id=7");
  db_.Update("t", {{"B", "1"}, {"ID", "2"}, {"id", "3"}, {"z", "4"}}, 7);
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET B='1',ID='2',z='4' WHERE id=7");
}

TEST_F(Database, AnUpdateEscapesColumnsAndValuesAndDoesNotQuoteColumns) {
  EXPECT_FALSE(db_.Update("t", {{"a'b", "it's"}}, 1));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET a''b='it''s' WHERE id=1");
}

TEST_F(Database, AnUpdateWithNothingToSetIsWrittenWithTwoBlanksAndFails) {
  EXPECT_FALSE(db_.Update("t", {}, 5));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET  WHERE id=5");
  EXPECT_FALSE(db_.Update("t", {{"id", "5"}}, 5));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET  WHERE id=5");
}

TEST_F(Database, AnUpdateOfNoRowIsASuccess) {
  EXPECT_TRUE(db_.Update("t", {{"a", "1"}}, 99));
}

TEST_F(Database, ADeleteNamesTheId) {
  ASSERT_TRUE(db_.Execute("INSERT INTO t VALUES (7,'x','y'),(8,'z','w')"));
  EXPECT_TRUE(db_.Delete("t", 7));
  EXPECT_EQ(db_.GetLastQuery(), "DELETE FROM t WHERE id=7");
  EXPECT_EQ(Rows(), Lines{"8|z|w"});
  EXPECT_TRUE(db_.Delete("t", 7)) << "no such row is a success";
}

TEST_F(Database, IdsAreWrittenInDecimalWithTheirSign) {
  EXPECT_TRUE(db_.Delete("t", INT_MIN));
  EXPECT_EQ(db_.GetLastQuery(), "DELETE FROM t WHERE id=-2147483648");
  EXPECT_TRUE(db_.Update("t", {{"a", "1"}}, INT_MAX));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET a='1' WHERE id=2147483647");
}

TEST_F(Database, TheLastInsertIdIsThatOfTheRow) {
  int id = 77;
  EXPECT_TRUE(db_.GetLastInsertId(id));
  EXPECT_EQ(id, 0);
  EXPECT_TRUE(db_.Insert("t", {"a", "b"}));
  EXPECT_TRUE(db_.GetLastInsertId(id));
  EXPECT_EQ(id, 1);
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (500,'a','b')"));
  EXPECT_TRUE(db_.Insert("t", {"a", "b"}));
  EXPECT_TRUE(db_.GetLastInsertId(id));
  EXPECT_EQ(id, 501);
}

TEST_F(Database, TheLastInsertIdIsCutTo32Bits) {
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (4294967301,'a','b')"));
  int id = 0;
  EXPECT_TRUE(db_.GetLastInsertId(id));
  EXPECT_EQ(id, 5);
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (4294967295,'a','b')"));
  EXPECT_TRUE(db_.GetLastInsertId(id));
  EXPECT_EQ(id, -1);
}

TEST_F(Database, TheCheckpointBringsTheLogIntoTheFile) {
  EXPECT_EQ(tuvo_test::ReadFile("/tmp/base.db").find("CREATE TABLE t"), std::string::npos);
  EXPECT_TRUE(db_.ExecuteWALCheckPoint());
  EXPECT_EQ(db_.GetLastQuery(), "PRAGMA wal_checkpoint;");
  EXPECT_NE(tuvo_test::ReadFile("/tmp/base.db").find("CREATE TABLE t"), std::string::npos);
}

TEST_F(Database, AVacuumGivesFreePagesBack) {
  ASSERT_TRUE(db_.Insert("t", {std::string(200000, 'x'), ""}));
  ASSERT_TRUE(db_.Delete("t", 1));
  EXPECT_NE(Value(db_, "PRAGMA freelist_count", "freelist_count"), "0");
  EXPECT_TRUE(db_.Vacuum());
  EXPECT_EQ(db_.GetLastQuery(), "VACUUM");
  EXPECT_EQ(Value(db_, "PRAGMA freelist_count", "freelist_count"), "0");
}

TEST_F(Database, AVacuumWithinATransactionFails) {
  EXPECT_TRUE(db_.Begin());
  EXPECT_FALSE(db_.Vacuum());
}

// --- Escaping ---------------------------------------------------------------------------------

TEST_F(Database, EscapingDoublesSingleQuotesAndNothingElse) {
  EXPECT_EQ(db_.Escape("it's"), "it''s");
  EXPECT_EQ(db_.Escape("\"`\\%_;--\n\xff"), "\"`\\%_;--\n\xff");
}

TEST_F(Database, EscapingNothingIsNothing) {
  SyslogListener listener;
  EXPECT_EQ(db_.Escape(""), "");
  EXPECT_EQ(TakeLines(listener), Lines{});
}

// The result fills the scratch space to its last byte.
TEST_F(Database, ATextOfQuotesAloneComesBackWhole) {
  for (const size_t length : {1, 2, 3, 7, 8, 100, 32768, 32769, 65536, 131072, 131073, 1000000}) {
    EXPECT_EQ(db_.Escape(std::string(length, '\'')), std::string(2 * length, '\'')) << length;
  }
}

TEST_F(Database, ATextWithoutQuotesComesBackWhole) {
  for (const size_t length :
       {1, 2, 1000, 32767, 32768, 32769, 65535, 65536, 65537, 131071, 131072, 131073, 3000000}) {
    EXPECT_EQ(db_.Escape(std::string(length, 'x')), std::string(length, 'x')) << length;
  }
}

TEST_F(Database, ATextOf24MebibytesIsStoredAndReadBack) {
  std::string text;
  for (size_t i = 0; text.size() < 24UL * 1024 * 1024; ++i) {
    text += "it's number " + std::to_string(i) + " '''";
  }
  EXPECT_TRUE(db_.Insert("t", {text, "after"}));
  EXPECT_TRUE(Value(db_, "SELECT a FROM t", "a") == text);
  EXPECT_EQ(Value(db_, "SELECT b FROM t", "b"), "after");
  const std::string quotes(12UL * 1024 * 1024, '\'');
  EXPECT_TRUE(db_.Update("t", {{"a", quotes}}, 1));
  EXPECT_TRUE(Value(db_, "SELECT a FROM t", "a") == quotes);
}

void* CallBody(void* body) {
  (*static_cast<const std::function<void()>*>(body))();
  return nullptr;
}

// Web programs' threads have little stack.
TEST_F(Database, NoTextIsTooLongForASmallStack) {
  const std::function<void()> body = [&] {
    for (const size_t length :
         {1000, 16384, 32768, 65536, 100000, 131072, 131073, 200000, 4000000}) {
      EXPECT_EQ(db_.Escape(std::string(length, '\'')).size(), 2 * length);
    }
  };
  pthread_attr_t attributes;
  ASSERT_EQ(pthread_attr_init(&attributes), 0);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, 256UL * 1024), 0);
  pthread_t thread{};
  ASSERT_EQ(
      pthread_create(&thread, &attributes, &CallBody, const_cast<std::function<void()>*>(&body)),
      0);
  ASSERT_EQ(pthread_join(thread, nullptr), 0);
  pthread_attr_destroy(&attributes);
}

TEST_F(Database, ManyLongValuesOfOneRowDoNotPileUpOnTheStack) {
  std::string columns;
  for (int i = 0; i < 200; ++i) {
    columns += ", c" + std::to_string(i);
  }
  ASSERT_TRUE(db_.Execute("CREATE TABLE wide (id INTEGER PRIMARY KEY" + columns + ")"));
  EXPECT_TRUE(db_.Insert("wide", Lines(200, std::string(60000, 'x'))));
}

TEST_F(Database, WithoutMemoryForALongTextEscapingFailsAndIsLogged) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the address sanitizer needs more memory than this test leaves";
#endif
  SyslogListener listener;
  EXPECT_EQ(RunInChild([&] {
              // More than all that earlier tests may have left free in the heap.
              const std::string text(128UL * 1024 * 1024, 'x');
              // Less than what is in use already: nothing more comes from the system.
              rlimit limit{};
              limit.rlim_cur = limit.rlim_max = 1024UL * 1024;
              EXPECT_EQ(setrlimit(RLIMIT_AS, &limit), 0);
              return db_.Escape(text).empty() ? 0 : 1;
            }),
            0);
  EXPECT_EQ(TakeLines(listener), Lines{"base_db:LINE (PID) escape failed\n\n"});
}

TEST_F(Database, AValueReadsBackAsFarAsItsNulByteAndNothingElseIsTouched) {
  ASSERT_TRUE(db_.Insert("t", {"before", "before"}));
  EXPECT_TRUE(db_.Insert("t", {std::string("one\0'); DELETE FROM t; --", 25), "two"}));
  EXPECT_EQ(db_.GetLastQuery(), "INSERT INTO t VALUES (NULL,'one','two')");
  EXPECT_EQ(Rows(), (Lines{"1|before|before", "2|one|two"}));
  EXPECT_TRUE(db_.Update("t", {{"a", std::string("x\0y", 3)}, {"b", "z"}}, 2));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET a='x',b='z' WHERE id=2");
  EXPECT_EQ(Rows(), (Lines{"1|before|before", "2|x|z"}));
  EXPECT_TRUE(db_.Update("t", {{"a", std::string("\0y", 2)}}, 2));
  EXPECT_EQ(Rows(), (Lines{"1|before|before", "2||z"}));
}

TEST_F(Database, AQuoteBeforeANulByteStaysAQuote) {
  EXPECT_TRUE(db_.Insert("t", {std::string("it's\0'", 6), "b"}));
  EXPECT_EQ(Rows(), Lines{"1|it's|b"});
  EXPECT_EQ(db_.Escape(std::string("'\0", 2)), "''");
}

TEST_F(Database, NoValueGetsOutOfItsQuotes) {
  for (const std::string value : {"'); DROP TABLE t; --", "\\'; DROP TABLE t; --", "'' OR 1=1",
                                  "x' || 'y", "'", "''", "'''", "\xbf'", "\xc2\xa7'"}) {
    ASSERT_TRUE(db_.Execute("DELETE FROM t"));
    EXPECT_TRUE(db_.Insert("t", {value, "b"})) << value;
    EXPECT_EQ(Rows(), Lines{"1|" + value + "|b"});
  }
}

// Groups digits, as a program with a local taste might.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST_F(Database, TheProgramsLocaleHasNoSayInStatements) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  EXPECT_TRUE(db_.Execute("INSERT INTO t VALUES (1234567,'a','b')"));
  EXPECT_TRUE(db_.Update("t", {{"a", "x"}}, 1234567));
  EXPECT_EQ(db_.GetLastQuery(), "UPDATE t SET a='x' WHERE id=1234567");
  EXPECT_TRUE(db_.Delete("t", 1234567));
  EXPECT_EQ(db_.GetLastQuery(), "DELETE FROM t WHERE id=1234567");
  std::locale::global(former);
}

// --- A file of root ---------------------------------------------------------------------------

struct Ownership {
  uid_t uid;
  gid_t gid;
  bool root;
};

TEST(RootFile, IsOneOfUserRootAndGroupRoot) {
  const std::string path = NewPath("/tmp/owned.db");
  WriteFile(path, "");
  ASSERT_EQ(chmod(path.c_str(), 0666), 0);
  const BaseDB db(path, kMode);
  ASSERT_TRUE(db.IsGood());
  for (const Ownership& owner :
       {Ownership{0, 0, true}, Ownership{0, 1, false}, Ownership{1, 0, false},
        Ownership{1, 1, false}, Ownership{0, 59999, false}, Ownership{59999, 0, false}}) {
    ASSERT_EQ(chown(path.c_str(), owner.uid, owner.gid), 0);
    EXPECT_EQ(db.IsRoot(), owner.root) << owner.uid << ":" << owner.gid;
  }
}

// Another account has the number 0 here, and the name "root" another number.
TEST(RootFile, TheNamesDecideNotTheNumbers) {
  const std::string path = NewPath("/tmp/named.db");
  WriteFile(path, "");
  ASSERT_EQ(chmod(path.c_str(), 0666), 0);
  WriteFile("/tmp/other passwd", "toor:x:0:0::/:/bin/false\nroot:x:2001:2001::/:/bin/false\n");
  WriteFile("/tmp/other group", "wheel:x:0:\nroot:x:3001:\n");
  EXPECT_EQ(RunInChild([&] {
              const BaseDB db(path, kMode);
              EXPECT_TRUE(db.IsRoot());
              EXPECT_EQ(unshare(CLONE_NEWNS), 0);
              EXPECT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
              EXPECT_EQ(mount("/tmp/other passwd", "/etc/passwd", nullptr, MS_BIND, nullptr), 0);
              EXPECT_EQ(mount("/tmp/other group", "/etc/group", nullptr, MS_BIND, nullptr), 0);
              EXPECT_FALSE(db.IsRoot());
              EXPECT_EQ(chown(path.c_str(), 2001, 3001), 0);
              EXPECT_TRUE(db.IsRoot());
              EXPECT_EQ(chown(path.c_str(), 2001, 0), 0);
              EXPECT_FALSE(db.IsRoot());
              EXPECT_EQ(chown(path.c_str(), 0, 3001), 0);
              EXPECT_FALSE(db.IsRoot());
              return 0;
            }),
            0);
}

TEST(RootFile, AFileThatIsGoneIsNotRoots) {
  const std::string path = NewPath("/tmp/gone.db");
  const BaseDB db(path, kMode);
  ASSERT_EQ(unlink(path.c_str()), 0);
  EXPECT_FALSE(db.IsRoot());
}

TEST(RootFile, IsSeenAlsoByADatabaseThatIsNotGood) {
  const std::string path = NewPath("/tmp/unreadable.db");
  WriteFile(path, "");
  ASSERT_EQ(chmod(path.c_str(), 0600), 0);
  const BaseDB db(path, kMode);
  EXPECT_FALSE(db.IsGood());
  EXPECT_TRUE(db.IsRoot());
}

// A file of root in a folder where only the system identity and root may write.
std::string RootFileIn(const char* name) {
  std::string path = PrivatePath(name);
  NewPath(std::string("/tmp/") + name);
  SqliteFile(path).Execute("CREATE TABLE t (a)");
  EXPECT_EQ(chmod(path.c_str(), 0666), 0);
  return path;
}

TEST(RootFile, TheLineOfARefusedMoveShowsTheRealUid) {
  SyslogListener listener;
  const std::string path = NewPath("/tmp/real uid.db");
  WriteFile(path, "");
  EXPECT_EQ(RunInChildAs({2001, 1, 1, 1, 1, 1},
                         [&] {
                           const BaseDB db(path, kMode);
                           db.MoveRootDB();
                           return 0;
                         }),
            0);
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_FALSE(lines.empty());
  EXPECT_EQ(tuvo_test::Normalized(lines.back().text), "base_db:LINE Permssion denied. uid=2001");
  EXPECT_EQ(lines.back().facility, LOG_USER);
  EXPECT_EQ(lines.back().priority, LOG_ERR);
}

TEST(RootFile, AMoveThatFailsAnswersTrue) {
  const std::string path = NewPath("/tmp/missing source.db");
  const BaseDB db(path, kMode);
  ASSERT_EQ(unlink(path.c_str()), 0);
  SyslogListener listener;
  EXPECT_TRUE(db.MoveRootDB());
  EXPECT_EQ(TakeLines(listener), Lines{});
}

TEST(RootFile, TheNameReachesTheMoveWithoutAShell) {
  const std::string name = "it's $(touch hurt) a; touch hurt.db";
  const std::string path = PrivatePath(name.c_str());
  NewPath("/tmp/" + name);
  const BaseDB db(path, kMode);
  ASSERT_TRUE(db.IsGood());
  EXPECT_FALSE(db.MoveRootDB());
  EXPECT_TRUE(Exists("/tmp/" + name));
  EXPECT_FALSE(Exists("hurt"));
}

TEST(RootFile, TheCompanionsOfTheFileStay) {
  const std::string path = RootFileIn("companions.db");
  BaseDB db(path, kMode);
  ASSERT_TRUE(db.Execute("INSERT INTO t VALUES (1)"));
  ASSERT_TRUE(Exists(path + "-wal"));
  EXPECT_FALSE(db.MoveRootDB());
  EXPECT_FALSE(Exists(path));
  EXPECT_TRUE(Exists(path + "-wal"));
  EXPECT_TRUE(Exists(path + "-shm"));
}

TEST(RootFile, TheOpenConnectionKeepsTheMovedFile) {
  const std::string path = RootFileIn("followed.db");
  BaseDB db(path, kMode);
  EXPECT_TRUE(db.Execute("INSERT INTO t VALUES ('before')"));
  EXPECT_FALSE(db.MoveRootDB());
  EXPECT_TRUE(db.IsGood());
  EXPECT_TRUE(db.Execute("INSERT INTO t VALUES ('after')")) << db.GetLastError();
  EXPECT_EQ(Value(db, "SELECT COUNT(*) AS c FROM t", "c"), "2");
  EXPECT_FALSE(db.IsRoot()) << "there is no file under the path now";
}

// /bin/mv is hidden behind something that cannot be run, for the child alone.
TEST(RootFile, AMoveThatCannotBeStartedIsLoggedAndAnswersFalse) {
  SyslogListener listener;
  const std::string path = RootFileIn("unmoved.db");
  EXPECT_EQ(RunInChild([&] {
              EXPECT_EQ(unshare(CLONE_NEWNS), 0);
              EXPECT_EQ(mount(nullptr, "/", nullptr, MS_REC | MS_PRIVATE, nullptr), 0);
              EXPECT_EQ(mount("/dev/null", "/bin/mv", nullptr, MS_BIND, nullptr), 0);
              const BaseDB db(path, kMode);
              EXPECT_FALSE(db.MoveRootDB());
              EXPECT_EQ(ToText(CurrentIds()), ToText(kRoot));
              return 0;
            }),
            0);
  EXPECT_TRUE(Exists(path));
  const std::vector<LogLine> lines = listener.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(lines[0].text), "base_db:LINE TLIBCPopen failed, path=" + path);
  EXPECT_EQ(lines[0].facility, LOG_USER);
  EXPECT_EQ(lines[0].priority, LOG_ERR);
}

}  // namespace
