// Failures of the migration that need the platform's help: this program stands between the two.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <tuvoplatform/database.h>
#include <tuvosharing/sharing_db.h>

#include <cerrno>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "identity_lines.h"
#include "sharing_lines.h"
#include "sqlite_file.h"
#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "test_files.h"

namespace {

std::string failing_statement;
bool no_row = false;
bool row_of_nothing = false;  // the version comes without rows, of which there is one all the same
bool empty_version = false;
std::function<void()> at_first_row;

}  // namespace

extern "C" {

int TUVODBExecute(TUVODB* db, const char* sql, DBResult_tag** result) {
  if (failing_statement == sql) {
    *result = nullptr;
    errno = EIO;
    return -1;
  }
  if (row_of_nothing && std::strcmp(sql, "PRAGMA user_version") == 0) {
    *result = nullptr;
    return 0;
  }
  return reinterpret_cast<decltype(&TUVODBExecute)>(dlsym(RTLD_NEXT, "TUVODBExecute"))(db, sql,
                                                                                       result);
}

int TUVODBFetchRow(DBResult_tag* result, unsigned int* row) {
  if (at_first_row) {
    at_first_row();
    at_first_row = nullptr;
  }
  if (no_row) {
    return -1;
  }
  if (row_of_nothing) {
    return 0;
  }
  return reinterpret_cast<decltype(&TUVODBFetchRow)>(dlsym(RTLD_NEXT, "TUVODBFetchRow"))(result,
                                                                                         row);
}

const char* TUVODBFetchField(DBResult_tag* result, unsigned int row, const char* name) {
  if (empty_version && std::strcmp(name, "user_version") == 0) {
    return "";
  }
  return reinterpret_cast<decltype(&TUVODBFetchField)>(dlsym(RTLD_NEXT, "TUVODBFetchField"))(
      result, row, name);
}

}  // extern "C"

namespace {

using TUVO::sharing::db::SharingDB;
using tuvo_test::NewPath;
using tuvo_test::Place;
using tuvo_test::ReturnFailed;
using tuvo_test::SwitchFailed;
using tuvo_test::SyslogListener;
using tuvo_test::TakeWritten;
using Lines = std::vector<std::string>;

constexpr char kSource[] = "db/sharing_db.cpp";
constexpr char kMigration[] = "bool SharingDBPrivate::Migration(";
constexpr char kMigrateTo[] = "bool SharingDBPrivate::MigrateTo(";

class SharingDBPlatform : public testing::Test {
 protected:
  SharingDBPlatform() : path_(NewPath("/tmp/sharing platform.db")) {}
  ~SharingDBPlatform() override {
    failing_statement.clear();
    no_row = false;
    row_of_nothing = false;
    empty_version = false;
    at_first_row = nullptr;
  }

  void ExpectNotMigrated() const {
    const SharingDB db(path_);
    EXPECT_FALSE(db.IsGood());
    EXPECT_TRUE(db.BaseDB::IsGood());
    EXPECT_EQ(db.GetLastQuery(), "PRAGMA user_version") << "no script ran";
  }

  std::string path_;
  SyslogListener listener_;
};

TEST_F(SharingDBPlatform, AVersionThatCannotBeAskedForFails) {
  failing_statement = "PRAGMA user_version";
  ExpectNotMigrated();
  EXPECT_EQ(TakeWritten(listener_), Lines{tuvo_test::VersionNotAsked("Input/output error")});
}

TEST_F(SharingDBPlatform, AVersionWithoutARowFails) {
  no_row = true;
  ExpectNotMigrated();
  EXPECT_EQ(TakeWritten(listener_), Lines{tuvo_test::NoVersion()});
}

TEST_F(SharingDBPlatform, ARowThatIsNotGoodFails) {
  row_of_nothing = true;
  ExpectNotMigrated();
  EXPECT_EQ(TakeWritten(listener_), Lines{tuvo_test::NoVersion()});
}

TEST_F(SharingDBPlatform, AVersionThatIsNoNumberIsZero) {
  empty_version = true;
  EXPECT_TRUE(SharingDB(path_).IsGood());
  EXPECT_EQ(tuvo_test::SqliteFile(path_).Value("PRAGMA user_version"), "2");
  EXPECT_EQ(TakeWritten(listener_), Lines{});
}

TEST_F(SharingDBPlatform, AScriptThatFailsIsLoggedWithTheSystemsReason) {
  failing_statement = tuvo_test::SchemaScript(2);
  const SharingDB db(path_);
  EXPECT_FALSE(db.IsGood());
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{tuvo_test::ScriptFailed("Input/output error"), tuvo_test::CannotMigrate(1, 2)}));
}

// The identity is lost between the question for the version and the first script.
TEST_F(SharingDBPlatform, AScriptThatCannotBeReadAsTheSystemFails) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  at_first_row = [] {
    EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kSetresgid, EPERM, 1, 1}}));
  };
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kSavedRoot,
                                    [&] {
                                      const SharingDB db(path_);
                                      EXPECT_FALSE(db.IsGood());
                                      EXPECT_EQ(tuvo_test::ToText(tuvo_test::CurrentIds()),
                                                tuvo_test::ToText(tuvo_test::kSavedRoot));
                                      _exit(testing::Test::HasFailure() ? 1 : 0);
                                      return 0;
                                    }),
            0);
  const std::string pid = " (" + std::to_string(tuvo_test::LastChild()) + ") ";
  EXPECT_EQ(
      TakeWritten(listener_),
      (Lines{SwitchFailed(kSource, kMigrateTo, "1, 1"),
             "user.err " + Place(kSource, "SHARING_LOG_PID(\"failed to run as system", kMigrateTo) +
                 pid + "failed to run as system\n\n",
             "user.err " + Place(kSource, "SHARING_LOG_PID(\"cannot migrate", kMigration) + pid +
                 "cannot migrate from 0 to 1\n\n"}));
}

// The script is read all the same; later switches start from the ids that the return ended with.
TEST_F(SharingDBPlatform, AReturnRefusedAfterOpeningAScriptIsLoggedWithThePlaceOfItsSwitch) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  at_first_row = [] {
    EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kSetresuid, EPERM, 1, 65534}}));
  };
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kSavedRoot,
                                    [&] {
                                      EXPECT_TRUE(SharingDB(path_).IsGood());
                                      return 0;
                                    }),
            0);
  EXPECT_EQ(TakeWritten(listener_), Lines{ReturnFailed(kSource, kMigrateTo, "65534, 65534")});
}

}  // namespace
