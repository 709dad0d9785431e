// The process-wide database and its schema's migration.
#include <gtest/gtest.h>
#include <syslog.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <climits>
#include <ctime>
#include <string>
#include <vector>

#include "log_lines.h"
#include "sqlite_file.h"
#include "support/child.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace {

using TUVO::sharing::SZF_SHARING_DB_PATH;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;
using tuvo_test::CurrentIds;
using tuvo_test::Exists;
using tuvo_test::Ids;
using tuvo_test::kNobody;
using tuvo_test::kRoot;
using tuvo_test::kSavedRoot;
using tuvo_test::kSystem;
using tuvo_test::LogLine;
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

const std::string kFolder = "/usr/tuvo/share/tuvosharing/db_schema/";

std::string ScriptPath(int version) {
  return kFolder + std::to_string(version) + ".sql";
}

// A script that notes its run in a table and sets its version.
std::string Noting(int version) {
  return "CREATE TABLE IF NOT EXISTS ran (version);INSERT INTO ran VALUES (" +
         std::to_string(version) + ");PRAGMA user_version = " + std::to_string(version) + ";";
}

const std::string kQueryFailed =
    "sharing_db:LINE (PID) Failed [!pdb_->Execute(\"PRAGMA user_version\", result)], err=";
const std::string kScriptFailed =
    "sharing_db:LINE (PID) Failed [!pdb_->Execute(sstr.str().c_str())], err=";

std::string CannotMigrate(int from, int to) {
  return "sharing_db:LINE (PID) cannot migrate from " + std::to_string(from) + " to " +
         std::to_string(to) + "\n\n";
}

std::string CannotOpen(int version, const std::string& reason) {
  return "sharing_db:LINE (PID) file " + ScriptPath(version) + " open failed " + reason + ".\n\n";
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
  EXPECT_EQ(TakeLines(listener_),
            (Lines{CannotOpen(0, "No such file or directory"), CannotMigrate(-1, 0)}));
}

TEST_F(SharingDBTest, TheLowestVersionFailsAtItsFirstScript) {
  MakeFileOfVersion(INT_MIN);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeLines(listener_), (Lines{CannotOpen(INT_MIN + 1, "No such file or directory"),
                                         CannotMigrate(INT_MIN, INT_MIN + 1)}));
}

TEST_F(SharingDBTest, WithoutTheSecondScriptTheFirstStaysDone) {
  Install(1, Noting(1));
  unlink(ScriptPath(2).c_str());
  const SharingDB db(path_);
  EXPECT_FALSE(db.IsGood());
  EXPECT_TRUE(db.BaseDB::IsGood());
  EXPECT_EQ(Ran(), "1 ");
  EXPECT_EQ(Version(), "1");
  EXPECT_EQ(TakeLines(listener_),
            (Lines{CannotOpen(2, "No such file or directory"), CannotMigrate(1, 2)}));
}

TEST_F(SharingDBTest, TheLinesHaveTheDefaultFacilityAndPriorityError) {
  unlink(ScriptPath(1).c_str());
  EXPECT_FALSE(Opens());
  for (const LogLine& line : listener_.Take()) {
    EXPECT_EQ(line.facility, LOG_USER);
    EXPECT_EQ(line.priority, LOG_ERR);
    EXPECT_NE(tuvo_test::Normalized(line.text).find("(PID)"), std::string::npos);
  }
}

TEST_F(SharingDBTest, AFailedStepIsTheLast) {
  Install(1, "nonsense");
  Install(2, Noting(2));
  EXPECT_FALSE(Opens());
  EXPECT_EQ(Ran(), "none");
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 2U);
  EXPECT_EQ(lines[0].compare(0, kScriptFailed.size(), kScriptFailed), 0) << lines[0];
  EXPECT_EQ(lines[0].substr(lines[0].size() - 2), "\n\n");
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

// Under the system identity, not under that of root which started this.
TEST_F(SharingDBTest, AScriptThatTheSystemIdentityMayNotReadFails) {
  ASSERT_EQ(chmod(ScriptPath(1).c_str(), 0600), 0);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeLines(listener_), (Lines{CannotOpen(1, "Permission denied"), CannotMigrate(0, 1)}));
}

TEST_F(SharingDBTest, AFolderInAScriptsPlaceFails) {
  unlink(ScriptPath(1).c_str());
  ASSERT_EQ(mkdir(ScriptPath(1).c_str(), 0755), 0);
  EXPECT_FALSE(Opens());
  EXPECT_EQ(TakeLines(listener_), (Lines{CannotOpen(1, "Is a directory"), CannotMigrate(0, 1)}));
}

TEST_F(SharingDBTest, AFileThatCannotBeOpenedCannotBeMigrated) {
  const SharingDB db("/tmp/no such folder/x.db");
  EXPECT_FALSE(db.IsGood());
  EXPECT_FALSE(db.BaseDB::IsGood());
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 3U);
  EXPECT_EQ(lines[0], "base_db:LINE (PID) create database failed on /tmp/no such folder/x.db\n\n");
  EXPECT_EQ(lines[1], "base_db:LINE (PID) db is not good.\n\n");
  EXPECT_EQ(lines[2].compare(0, kQueryFailed.size(), kQueryFailed), 0) << lines[2];
  EXPECT_EQ(lines[2].substr(lines[2].size() - 2), "\n\n");
}

TEST_F(SharingDBTest, AFileThatIsNoDatabaseCannotBeMigrated) {
  WriteFile(path_, std::string(5000, 'x'));
  ASSERT_EQ(chmod(path_.c_str(), 0666), 0);
  EXPECT_FALSE(Opens());
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 3U);
  EXPECT_EQ(lines[0], "base_db:LINE (PID) init failed\n\n");
  EXPECT_EQ(lines[1], "base_db:LINE (PID) db is not good.\n\n");
  EXPECT_EQ(lines[2].compare(0, kQueryFailed.size(), kQueryFailed), 0) << lines[2];
}

// --- Identities -------------------------------------------------------------------------------

TEST_F(SharingDBTest, MigrationWorksFromEachIdentityThatCanBeTheSystem) {
  ASSERT_EQ(chown(ScriptPath(1).c_str(), 1, 1), 0);
  ASSERT_EQ(chmod(ScriptPath(1).c_str(), 0400), 0);  // nobody but the system may read it
  for (const Ids& ids : {kRoot, kSavedRoot, kSystem}) {
    NewPath(path_);
    EXPECT_EQ(RunInChildAs(ids,
                           [&] {
                             EXPECT_TRUE(Opens());
                             EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
                             return 0;
                           }),
              0)
        << ToText(ids);
    EXPECT_EQ(Version(), "2");
    EXPECT_EQ(OwnerAndMode(path_), "1:1 0660");
    EXPECT_EQ(TakeLines(listener_), Lines{});
  }
}

TEST_F(SharingDBTest, AFailedMigrationLeavesTheIdsAsTheyWere) {
  unlink(ScriptPath(2).c_str());
  for (const Ids& ids : {kRoot, kSavedRoot, kSystem}) {
    NewPath(path_);
    EXPECT_EQ(RunInChildAs(ids,
                           [&] {
                             EXPECT_FALSE(Opens());
                             EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
                             return 0;
                           }),
              0);
  }
}

TEST_F(SharingDBTest, NobodyCanNeitherOpenNorMigrate) {
  EXPECT_EQ(RunInChildAs(kNobody,
                         [&] {
                           EXPECT_FALSE(Opens());
                           EXPECT_EQ(ToText(CurrentIds()), ToText(kNobody));
                           return 0;
                         }),
            0);
  EXPECT_FALSE(Exists(path_));
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 4U);
  EXPECT_EQ(lines[0], "base_db:LINE ERROR: IF_RUN_AS(1, 1)");
  EXPECT_EQ(lines[1], "base_db:LINE (PID) failed to run as system\n\n");
  EXPECT_EQ(lines[2], "base_db:LINE (PID) db is not good.\n\n");
  EXPECT_EQ(lines[3].compare(0, kQueryFailed.size(), kQueryFailed), 0) << lines[3];
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

TEST_F(SharingDBTest, NothingIsOpenedBeforeTheFirstCall) {
  EXPECT_EQ(RunInChild([] { return Exists(SZF_SHARING_DB_PATH) ? 1 : 0; }), 0);
  EXPECT_FALSE(Exists(SZF_SHARING_DB_PATH));
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
