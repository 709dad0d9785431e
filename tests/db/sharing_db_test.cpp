// The process-wide database and its schema's migration.
#include <gtest/gtest.h>
#include <internal/sharing_db_private.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <climits>
#include <cstddef>
#include <ctime>
#include <filesystem>
#include <memory>
#include <regex>
#include <string>
#include <system_error>
#include <thread>
#include <tuple>
#include <type_traits>
#include <vector>

#include "log_lines.h"
#include "sharing_lines.h"
#include "sqlite_file.h"
#include "support/child.h"
#include "support/class_layout.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "test_files.h"

namespace tuvo_test {

using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::SharingDBPrivate;
auto MembersOf(const SharingDB&);
auto MembersOf(const SharingDBPrivate&);
template struct Reveal<SharingDB, &SharingDB::p_>;
template struct Reveal<SharingDBPrivate, &SharingDBPrivate::pdb_, &SharingDBPrivate::migrated_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::SZF_SHARING_DB_PATH;
using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;
using tuvo_test::CannotMigrate;
using tuvo_test::CannotOpen;
using tuvo_test::CurrentIds;
using tuvo_test::Exists;
using tuvo_test::kNobody;
using tuvo_test::kSavedRoot;
using tuvo_test::MembersOf;
using tuvo_test::NewPath;
using tuvo_test::OwnerAndMode;
using tuvo_test::RunInChild;
using tuvo_test::RunInChildAs;
using tuvo_test::ScriptFailed;
using tuvo_test::SqliteFile;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using tuvo_test::TakeWritten;
using tuvo_test::ToText;
using tuvo_test::VersionNotAsked;
using tuvo_test::WriteFile;
using Lines = std::vector<std::string>;

std::string ScriptPath(int version) {
  return tuvo_test::kSchemaFolder + std::to_string(version) + ".sql";
}

// A script that notes its run in a table and sets its version.
std::string Noting(int version) {
  return "CREATE TABLE IF NOT EXISTS ran (version);INSERT INTO ran VALUES (" +
         std::to_string(version) + ");PRAGMA user_version = " + std::to_string(version) + ";";
}

// `line` without the reason in it, which is that of whatever failed last before.
std::string WithoutReason(const std::string& line) {
  return std::regex_replace(line, std::regex("err=[^\n]*"), "err=");
}

// Whether this process has a file open, perhaps one that is unlinked, with `part` in its path.
bool HasOpen(const std::string& part) {
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    std::error_code gone;
    if (std::filesystem::read_symlink(entry, gone).string().find(part) != std::string::npos) {
      return true;
    }
  }
  return false;
}

// The script folder holds the real scripts before and after each test; the file is a new one in
// the private folder.
class SharingDBTest : public testing::Test {
 protected:
  SharingDBTest()
      : path_(NewPath(tuvo_test::kPrivateFolder + std::string("migrated.db"))),
        first_(tuvo_test::SchemaScript(1)),
        second_(tuvo_test::SchemaScript(2)) {
    NewPath(SZF_SHARING_DB_PATH);
  }

  ~SharingDBTest() override {
    for (const int version : {-1, 0, 1, 2, 3}) {
      unlink(ScriptPath(version).c_str());
      rmdir(ScriptPath(version).c_str());
    }
    Install(1, first_);
    Install(2, second_);
  }

  static void Install(int version, const std::string& text) {
    unlink(ScriptPath(version).c_str());
    WriteFile(ScriptPath(version), text);
    EXPECT_EQ(chmod(ScriptPath(version).c_str(), 0644), 0);
  }

  static void InstallNotingScripts() {
    Install(1, Noting(1));
    Install(2, Noting(2));
  }

  // Makes the file, of the system identity, at a version.
  void MakeFileOfVersion(int version) const {
    SqliteFile(path_).Execute("PRAGMA user_version = " + std::to_string(version));
    EXPECT_EQ(chown(path_.c_str(), 1, 1), 0);
  }

  std::string Version() const { return SqliteFile(path_).Value("PRAGMA user_version"); }

  // The versions whose scripts ran, in order.
  std::string Ran() const {
    SqliteFile file(path_);
    if (file.Value("SELECT COUNT(*) FROM sqlite_schema WHERE name = 'ran'") == "0") {
      return "none";
    }
    std::string all;
    for (const auto& row : file.Rows("SELECT version FROM ran ORDER BY rowid")) {
      all += row[0] + " ";
    }
    return all;
  }

  bool Opens() const { return SharingDB(path_).IsGood(); }

  std::string path_;
  std::string first_;
  std::string second_;
  SyslogListener listener_;
};

// --- Migration --------------------------------------------------------------------------------

TEST_F(SharingDBTest, ANewFileGetsTheRealSchemaInSilence) {
  SharingDB db(path_);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(Version(), "2");
  EXPECT_EQ(OwnerAndMode(path_), "1:1 0660");
  EXPECT_TRUE(db.Execute("SELECT * FROM entry"));
  EXPECT_TRUE(db.Execute("SELECT * FROM session"));
  EXPECT_TRUE(db.Execute("SELECT * FROM token"));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(SharingDBTest, ANewFileRunsBothScriptsInOrder) {
  InstallNotingScripts();
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "1 2 ");
  EXPECT_EQ(Version(), "2");
}

TEST_F(SharingDBTest, AFileOfVersionOneRunsTheSecondScriptAlone) {
  InstallNotingScripts();
  MakeFileOfVersion(1);
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "2 ");
}

TEST_F(SharingDBTest, AFileOfTheCurrentOrANewerVersionRunsNone) {
  InstallNotingScripts();
  Install(3, Noting(3));
  for (const int version : {2, 3, 1000, INT_MAX}) {
    NewPath(path_);
    MakeFileOfVersion(version);
    EXPECT_TRUE(Opens()) << version;
    EXPECT_EQ(Ran(), "none") << version;
    EXPECT_EQ(Version(), std::to_string(version));
  }
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(SharingDBTest, ANegativeVersionWantsTheScriptsFromItOn) {
  InstallNotingScripts();
  Install(0, Noting(0));
  MakeFileOfVersion(-1);
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "0 1 2 ");
}

TEST_F(SharingDBTest, ANegativeVersionWithoutScriptZeroFailsWithTwoLines) {
  InstallNotingScripts();
  MakeFileOfVersion(-1);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(Ran(), "none");
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{CannotOpen(0, "No such file or directory"), CannotMigrate(-1, 0)}));
}

TEST_F(SharingDBTest, TheLowestVersionFailsAtItsFirstScript) {
  MakeFileOfVersion(INT_MIN);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeWritten(listener_), (Lines{CannotOpen(INT_MIN + 1, "No such file or directory"),
                                           CannotMigrate(INT_MIN, INT_MIN + 1)}));
}

TEST_F(SharingDBTest, WithoutTheSecondScriptTheFirstStaysDone) {
  Install(1, Noting(1));
  unlink(ScriptPath(2).c_str());
  const SharingDB db(path_);
  EXPECT_FALSE(db.IsGood());
  EXPECT_EQ(Ran(), "1 ");
  EXPECT_EQ(Version(), "1");
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{CannotOpen(2, "No such file or directory"), CannotMigrate(1, 2)}));
}

TEST_F(SharingDBTest, AFailedStepIsTheLast) {
  Install(1, "nonsense");
  Install(2, Noting(2));
  EXPECT_FALSE(Opens());
  EXPECT_EQ(Ran(), "none");
  const Lines lines = TakeWritten(listener_);
  ASSERT_EQ(lines.size(), 2U);
  EXPECT_EQ(WithoutReason(lines[0]), ScriptFailed(""));
  EXPECT_EQ(lines[1], CannotMigrate(0, 1));
}

TEST_F(SharingDBTest, WhatAFailedScriptDidBeforeStaysDone) {
  Install(1, Noting(1) + "nonsense;INSERT INTO ran VALUES ('behind')");
  EXPECT_FALSE(Opens());
  EXPECT_EQ(Ran(), "1 ");
  EXPECT_EQ(Version(), "1");
}

TEST_F(SharingDBTest, AScriptsOwnTransactionIsRolledBackWhenItFails) {
  Install(1, "BEGIN TRANSACTION;" + Noting(1) + "nonsense;COMMIT;");
  EXPECT_FALSE(Opens());
  EXPECT_EQ(Ran(), "none");
  EXPECT_EQ(Version(), "0");
}

TEST_F(SharingDBTest, AFailedScriptsReasonCanBeAskedFor) {
  Install(1, "SELECT * FROM missing");
  const SharingDB db(path_);
  EXPECT_EQ(db.GetLastError(), "no such table: missing");
  EXPECT_EQ(db.GetLastQuery(), "SELECT * FROM missing");
}

TEST_F(SharingDBTest, TheVersionIsReadOnce) {
  Install(1, Noting(1) + "PRAGMA user_version = 7;");
  Install(2, Noting(2));
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "1 2 ");
}

TEST_F(SharingDBTest, AScriptThatSetsNoVersionRunsAgainAtTheNextOpening) {
  Install(1, Noting(1));
  Install(2, "INSERT INTO ran VALUES (2)");
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Version(), "1");
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "1 2 2 ");
}

TEST_F(SharingDBTest, EachScriptIsOneBatchHoweverLong) {
  std::string text = Noting(1);
  for (int i = 0; i < 20000; ++i) {
    text += "INSERT INTO ran VALUES ('a long text with it''s quotes;\r\n and \xc3\xa4');\n";
  }
  Install(1, text);
  Install(2, Noting(2));
  EXPECT_TRUE(Opens());
  SqliteFile file(path_);
  EXPECT_EQ(file.Value("SELECT COUNT(*) FROM ran"), "20002");
  EXPECT_EQ(file.Value("SELECT version FROM ran LIMIT 1 OFFSET 5"),
            "a long text with it's quotes;\r\n and \xc3\xa4");
}

TEST_F(SharingDBTest, TheBatchIsTheFilesTextUnchanged) {
  const std::string text = "\n-- a comment\nPRAGMA user_version = 2;\n\n";
  Install(1, Noting(1));
  Install(2, text);
  const SharingDB db(path_);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(db.GetLastQuery(), text);
}

TEST_F(SharingDBTest, AnEmptyScriptIsAStepThatDoesNothing) {
  Install(1, "");
  Install(2, Noting(2));
  EXPECT_TRUE(Opens());
  EXPECT_EQ(Ran(), "2 ");
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(SharingDBTest, NoScriptStaysOpen) {
  Install(2, "nonsense");
  const SharingDB db(path_);
  EXPECT_FALSE(db.IsGood());
  EXPECT_FALSE(HasOpen("db_schema"));
}

// Under the system identity, not under that of root which started this.
TEST_F(SharingDBTest, AScriptThatTheSystemIdentityMayNotReadFails) {
  ASSERT_EQ(chmod(ScriptPath(1).c_str(), 0600), 0);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{CannotOpen(1, "Permission denied"), CannotMigrate(0, 1)}));
}

TEST_F(SharingDBTest, AFolderInAScriptsPlaceFails) {
  unlink(ScriptPath(1).c_str());
  ASSERT_EQ(mkdir(ScriptPath(1).c_str(), 0755), 0);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeWritten(listener_), (Lines{CannotOpen(1, "Is a directory"), CannotMigrate(0, 1)}));
}

TEST_F(SharingDBTest, AFileThatCannotBeOpenedCannotBeMigrated) {
  const SharingDB db("/tmp/no such folder/x.db");
  EXPECT_FALSE(db.IsGood());
  EXPECT_FALSE(db.BaseDB::IsGood());
  const Lines lines = TakeWritten(listener_);
  ASSERT_EQ(lines.size(), 3U);
  EXPECT_NE(lines[0].find("create database failed on /tmp/no such folder/x.db"), std::string::npos);
  EXPECT_NE(lines[1].find("db is not good."), std::string::npos);
  EXPECT_EQ(WithoutReason(lines[2]), VersionNotAsked(""));
}

TEST_F(SharingDBTest, AFileThatIsNoDatabaseCannotBeMigrated) {
  WriteFile(path_, std::string(5000, 'x'));
  ASSERT_EQ(chmod(path_.c_str(), 0666), 0);
  EXPECT_FALSE(Opens());
  const Lines lines = TakeWritten(listener_);
  ASSERT_EQ(lines.size(), 3U);
  EXPECT_NE(lines[0].find("init failed"), std::string::npos);
  EXPECT_NE(lines[1].find("db is not good."), std::string::npos);
  EXPECT_EQ(WithoutReason(lines[2]), VersionNotAsked(""));
}

// --- The instance -----------------------------------------------------------------------------

TEST_F(SharingDBTest, TheInstanceIsOneAndOpensTheDefaultFile) {
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           SharingDB& db = SharingDB::Instance();
                           EXPECT_TRUE(db.IsGood());
                           EXPECT_EQ(&SharingDB::Instance(), &db);
                           EXPECT_EQ(OwnerAndMode(SZF_SHARING_DB_PATH), "1:1 0660");
                           EXPECT_EQ(ToText(CurrentIds()), ToText(kSavedRoot));
                           return 0;
                         }),
            0);
  EXPECT_EQ(SqliteFile(SZF_SHARING_DB_PATH).Value("PRAGMA user_version"), "2");
}

TEST_F(SharingDBTest, FirstCallsOfSeveralThreadsGetOneInstance) {
  EXPECT_EQ(RunInChild([] {
              std::vector<const SharingDB*> seen(16);
              std::vector<std::thread> threads;
              for (const SharingDB*& one : seen) {
                threads.emplace_back([&one] { one = &SharingDB::Instance(); });
              }
              for (std::thread& thread : threads) {
                thread.join();
              }
              for (const SharingDB* one : seen) {
                EXPECT_EQ(one, &SharingDB::Instance());
              }
              return 0;
            }),
            0);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// In this process nobody calls it, children do; a file that was opened would still be open.
TEST_F(SharingDBTest, NothingIsOpenedBeforeTheFirstCall) {
  EXPECT_FALSE(HasOpen("sharing.db"));
  EXPECT_EQ(RunInChild([] {
              SharingDB::Instance();
              EXPECT_TRUE(HasOpen("sharing.db"));
              return 0;
            }),
            0);
}

TEST_F(SharingDBTest, TheInstanceIsClosedWhenTheProcessEnds) {
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           EXPECT_TRUE(SharingDB::Instance().IsGood());
                           EXPECT_TRUE(Exists(std::string(SZF_SHARING_DB_PATH) + "-wal"));
                           return 0;
                         }),
            0);
  EXPECT_TRUE(Exists(SZF_SHARING_DB_PATH));
  EXPECT_FALSE(Exists(std::string(SZF_SHARING_DB_PATH) + "-wal"));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(SharingDBTest, AnInstanceThatIsNotGoodStaysSo) {
  unlink(ScriptPath(2).c_str());
  EXPECT_EQ(RunInChild([&] {
              SharingDB& db = SharingDB::Instance();
              EXPECT_FALSE(db.IsGood());
              Install(2, second_);
              EXPECT_FALSE(SharingDB::Instance().IsGood());
              EXPECT_EQ(&SharingDB::Instance(), &db);
              return 0;
            }),
            0);
  EXPECT_EQ(TakeLines(listener_).size(), 2U) << "the second call tried nothing";
  EXPECT_EQ(RunInChild([] { return SharingDB::Instance().IsGood() ? 0 : 1; }), 0)
      << "the next process finds the script";
}

TEST_F(SharingDBTest, AnInstanceWithoutAFileStaysNotGoodToo) {
  EXPECT_EQ(RunInChildAs(kNobody,
                         [] {
                           SharingDB& db = SharingDB::Instance();
                           EXPECT_FALSE(db.IsGood());
                           EXPECT_EQ(&SharingDB::Instance(), &db);
                           EXPECT_FALSE(SharingDB::Instance().IsGood());
                           return 0;
                         }),
            0);
  EXPECT_FALSE(Exists(SZF_SHARING_DB_PATH));
}

TEST_F(SharingDBTest, TheDefaultConstructorOpensTheDefaultFileToo) {
  const SharingDB db;
  EXPECT_TRUE(db.IsGood());
  EXPECT_TRUE(Exists(SZF_SHARING_DB_PATH));
}

// --- A file of root ---------------------------------------------------------------------------

TEST_F(SharingDBTest, AFileOfRootIsSeenAndMovedAside) {
  NewPath("/tmp/migrated.db");
  MakeFileOfVersion(0);
  ASSERT_EQ(chown(path_.c_str(), 0, 0), 0);
  ASSERT_EQ(chmod(path_.c_str(), 0666), 0);
  SharingDB db(path_);
  EXPECT_TRUE(db.IsGood());
  EXPECT_TRUE(db.IsRoot());
  EXPECT_FALSE(db.MoveRootDB()) << "false: it was moved";
  EXPECT_TRUE(Exists("/tmp/migrated.db"));
  EXPECT_FALSE(db.IsRoot());
}

TEST_F(SharingDBTest, AfterTheMoveTheProcessKeepsItsFileAndTheNextMakesANewOne) {
  NewPath("/tmp/sharing.db");
  SqliteFile(SZF_SHARING_DB_PATH).Execute("CREATE TABLE mark (a)");
  ASSERT_EQ(chmod(SZF_SHARING_DB_PATH, 0666), 0);
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [] {
                           SharingDB& db = SharingDB::Instance();
                           EXPECT_TRUE(db.IsGood());
                           EXPECT_TRUE(db.IsRoot());
                           EXPECT_FALSE(db.MoveRootDB());
                           EXPECT_FALSE(Exists(SZF_SHARING_DB_PATH));
                           EXPECT_TRUE(db.IsGood());
                           EXPECT_TRUE(db.Execute("INSERT INTO mark VALUES (1)"))
                               << db.GetLastError();
                           EXPECT_EQ(&SharingDB::Instance(), &db);
                           return 0;
                         }),
            0);
  EXPECT_FALSE(Exists(SZF_SHARING_DB_PATH));
  for (const char* companion : {"-wal", "-shm"}) {
    unlink((SZF_SHARING_DB_PATH + std::string(companion)).c_str());
  }
  EXPECT_EQ(RunInChildAs(kSavedRoot, [] { return SharingDB::Instance().IsGood() ? 0 : 1; }), 0);
  EXPECT_EQ(OwnerAndMode(SZF_SHARING_DB_PATH), "1:1 0660");
}

// --- In memory --------------------------------------------------------------------------------

TEST_F(SharingDBTest, IsABaseDBWithOnePointerMoreAndTheMigrationsOutcomeBehindIt) {
  SharingDB db(path_);
  static_assert(sizeof(SharingDB) == sizeof(BaseDB) + sizeof(void*));
  const auto& migration = *(db.*std::get<0>(MembersOf(db)));
  static_assert(std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(migration))>,
                               std::tuple<SharingDB*, bool>>);
  const auto offsets = tuvo_test::Offsets(migration, MembersOf(migration));
  EXPECT_EQ(offsets,
            (std::vector<std::ptrdiff_t>{0, static_cast<std::ptrdiff_t>(sizeof(SharingDB*))}));
  EXPECT_EQ(migration.*std::get<0>(MembersOf(migration)), &db);
  EXPECT_TRUE(migration.*std::get<1>(MembersOf(migration)));
}

TEST_F(SharingDBTest, AMigrationAloneDoesNotMakeItGood) {
  SharingDB db("/tmp/no such folder/x.db");
  auto& migration = *(db.*std::get<0>(MembersOf(db)));
  migration.*std::get<1>(MembersOf(migration)) = true;
  EXPECT_FALSE(db.IsGood());
}

TEST_F(SharingDBTest, HasNoVirtualOperationButItsDestructor) {
  static_assert(std::is_base_of_v<BaseDB, SharingDB>);
  if (!tuvo_test::kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  EXPECT_EQ(tuvo_test::SlotCount<SharingDB>(), 2U);
}

// A program that holds it as its base asks the base.
TEST_F(SharingDBTest, WhetherTheBaseIsGoodDoesNotDependOnTheMigration) {
  unlink(ScriptPath(1).c_str());
  const SharingDB db(path_);
  const BaseDB& base = db;
  EXPECT_TRUE(base.IsGood());
  EXPECT_FALSE(db.IsGood());
}

// --- As a database ----------------------------------------------------------------------------

TEST_F(SharingDBTest, TheStoresWorkOnIt) {
  SharingDB db(path_);
  Session session;
  session.set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
  EXPECT_TRUE(SessionDB(db).CreateWithSessionId(session));
  EXPECT_EQ(session.get_id(), 1);
}

TEST_F(SharingDBTest, ForeignKeysAreOn) {
  SharingDB db(path_);
  EXPECT_FALSE(db.Execute("INSERT INTO token VALUES (NULL, 5, 6, 7)"));
  EXPECT_EQ(db.GetLastError(), "FOREIGN KEY constraint failed");
}

}  // namespace
