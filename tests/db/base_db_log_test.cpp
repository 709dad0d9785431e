// Every line that a connection writes to the system log, whole: facility, priority, source line,
// process id and line feeds. This program answers three calls of the platform itself, for failures
// that have no cause of their own, hence it is one of its own.
#include <grp.h>
#include <gtest/gtest.h>
#include <tuvoplatform/database.h>
#include <tuvoplatform/process.h>
#include <tuvosharing/base_db.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <functional>
#include <string>
#include <vector>

#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "test_files.h"

namespace {

std::function<void()> at_error;  // runs within a statement that fails

}  // namespace

extern "C" {

int TUVODBEscapeStringEX2(TUVODB* /*db*/, char* /*out*/, unsigned int /*size*/,
                          const char* /*text*/, unsigned int /*length*/) {
  return -1;
}

FILE* TLIBCPopen(const char* /*path*/, const char* /*mode*/, ...) {
  return nullptr;
}

const char* TUVODBErrorGet(TUVODB* /*db*/) {
  if (at_error) {
    at_error();
  }
  return "made up";
}

}  // extern "C"

namespace {

using TUVO::sharing::db::BaseDB;
using tuvo_test::kNobody;
using tuvo_test::kPrivateFolder;
using tuvo_test::kSavedRoot;
using tuvo_test::kSystem;
using tuvo_test::LastChild;
using tuvo_test::NewPath;
using tuvo_test::RunInChild;
using tuvo_test::RunInChildAs;
using tuvo_test::SyslogListener;
using tuvo_test::TakeWritten;
using tuvo_test::WriteFile;
using Lines = std::vector<std::string>;

constexpr unsigned int kMode = 0660;

// The operations whose beginnings tell apart what stands in the source more than once.
constexpr char kDestruction[] = "BaseDBPrivate::~BaseDBPrivate() {";
constexpr char kCreation[] = "bool BaseDBPrivate::Create(";
constexpr char kConnection[] = "bool BaseDBPrivate::Connect() {";
constexpr char kStatement[] = "bool BaseDBPrivate::ExecuteAsSystem(";
constexpr char kMove[] = "bool BaseDBPrivate::MoveRootDB() const {";

// "base_db:12", where `text` stands (behind `after`).
std::string Place(const std::string& text, const std::string& after = "") {
  return "base_db:" + std::to_string(tuvo_test::SourceLine("db/base_db.cpp", text, after));
}

// The line of an identity that could not be taken in this operation.
std::string NotTaken(const std::string& operation, const std::string& ids) {
  return "auth.err " + Place("IF_RUN_AS(", operation) + " ERROR: IF_RUN_AS(" + ids + ")";
}

// The line of process `pid` with this message, and what follows it in the log alone.
std::string Message(pid_t pid, const std::string& message, const std::string& value = "",
                    const std::string& after = "") {
  return "user.err " + Place("(\"" + message, after) + " (" + std::to_string(pid) + ") " + message +
         value + "\n\n";
}

// What the opening of `path` writes; it must not end good.
Lines WrittenByOpening(const std::string& path) {
  SyslogListener listener;
  EXPECT_FALSE(BaseDB(path, kMode).IsGood());
  return TakeWritten(listener);
}

// The same from an identity that neither is nor can become the system's.
Lines WrittenByNobodysOpening(const std::string& path) {
  SyslogListener listener;
  EXPECT_EQ(RunInChildAs(kNobody, [&] { return BaseDB(path, kMode).IsGood() ? 1 : 0; }), 0);
  return TakeWritten(listener);
}

TEST(BaseDBLog, NoIdentityToMakeTheFile) {
  const Lines written = WrittenByNobodysOpening(NewPath("/tmp/log missing.db"));
  EXPECT_EQ(written, (Lines{NotTaken(kCreation, "1, 1"),
                            Message(LastChild(), "failed to run as system", "", kCreation)}));
}

TEST(BaseDBLog, NoIdentityToConnect) {
  const std::string path = NewPath("/tmp/log existing.db");
  WriteFile(path, "");
  const Lines written = WrittenByNobodysOpening(path);
  EXPECT_EQ(written, (Lines{NotTaken(kConnection, "1, 1"),
                            Message(LastChild(), "failed to run as system", "", kConnection)}));
}

// The process gave root up for good while the connection was open.
TEST(BaseDBLog, NoIdentityForAStatementNorForTheClosing) {
  SyslogListener listener;
  const std::string path = NewPath(kPrivateFolder + std::string("log lost.db"));
  EXPECT_EQ(RunInChild([&] {
              BaseDB db(path, kMode);
              EXPECT_EQ(setgroups(0, nullptr), 0);
              EXPECT_EQ(setresgid(65534, 65534, 65534), 0);
              EXPECT_EQ(setresuid(65534, 65534, 65534), 0);
              EXPECT_FALSE(db.Execute("SELECT 1"));
              return 0;
            }),
            0);
  EXPECT_EQ(TakeWritten(listener),
            (Lines{NotTaken(kStatement, "1, 1"),
                   Message(LastChild(), "failed to run as system", "", kStatement),
                   NotTaken(kDestruction, "1, 1")}));
}

TEST(BaseDBLog, AnIdentityThatCannotBeGivenBack) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  SyslogListener listener;
  const std::string path = NewPath(kPrivateFolder + std::string("log kept.db"));
  EXPECT_EQ(RunInChildAs(kSavedRoot,
                         [&] {
                           BaseDB db(path, kMode);
                           at_error = [] {
                             EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kSetresuid, EPERM}}));
                           };
                           EXPECT_FALSE(db.Execute("nonsense"));
                           return 0;
                         }),
            0);
  EXPECT_EQ(TakeWritten(listener), Lines{"auth.crit " + Place("IF_RUN_AS(", kStatement) +
                                         " ERROR: ~IF_RUN_AS(65534, 65534)"});
}

TEST(BaseDBLog, AFileThatCannotBeMade) {
  EXPECT_EQ(WrittenByOpening("/tmp/no such folder/x.db"),
            Lines{Message(getpid(), "create database failed on ", "/tmp/no such folder/x.db")});
}

TEST(BaseDBLog, AModeThatCannotBeSet) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  SyslogListener listener;
  const std::string path = NewPath(kPrivateFolder + std::string("log mode.db"));
  EXPECT_EQ(RunInChild([&] {
              EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kChmod, EPERM}}));
              return BaseDB(path, kMode).IsGood() ? 1 : 0;
            }),
            0);
  EXPECT_EQ(TakeWritten(listener), Lines{Message(LastChild(), "change mode failed on ", path)});
}

TEST(BaseDBLog, APathThatCannotBeConnectedTo) {
  EXPECT_EQ(WrittenByOpening("/tmp"), Lines{Message(getpid(), "db connect failed")});
}

TEST(BaseDBLog, AFileThatCannotBeSetUp) {
  const std::string path = NewPath("/tmp/log no database.db");
  WriteFile(path, std::string(5000, 'x'));
  ASSERT_EQ(chmod(path.c_str(), 0666), 0);
  EXPECT_EQ(WrittenByOpening(path), Lines{Message(getpid(), "init failed")});
}

TEST(BaseDBLog, AStatementOfAConnectionThatIsNotGood) {
  SyslogListener listener;
  BaseDB db("/tmp", kMode);
  listener.Take();
  EXPECT_FALSE(db.Execute("SELECT 1"));
  EXPECT_EQ(TakeWritten(listener), Lines{Message(getpid(), "db is not good.")});
}

TEST(BaseDBLog, ATextThatThePlatformDoesNotEscape) {
  SyslogListener listener;
  const BaseDB db(NewPath("/tmp/log escape.db"), kMode);
  EXPECT_EQ(db.Escape("text"), "");
  EXPECT_EQ(TakeWritten(listener),
            Lines{Message(getpid(), "escape failed", "", "std::string EscapeInto(")});
}

TEST(BaseDBLog, AMoveThatCannotBeStarted) {
  SyslogListener listener;
  const std::string path = NewPath("/tmp/log move.db");
  const BaseDB db(path, kMode);
  EXPECT_FALSE(db.MoveRootDB());
  EXPECT_EQ(TakeWritten(listener), Lines{"user.err " + Place("\"TLIBCPopen failed, path=") +
                                         " TLIBCPopen failed, path=" + path});
}

TEST(BaseDBLog, AMoveWithoutTheRightToIt) {
  SyslogListener listener;
  const std::string path = NewPath(kPrivateFolder + std::string("log right.db"));
  EXPECT_EQ(RunInChildAs(kSystem, [&] { return BaseDB(path, kMode).MoveRootDB() ? 1 : 0; }), 0);
  EXPECT_EQ(TakeWritten(listener),
            (Lines{NotTaken(kMove, "0, 0"),
                   "user.err " + Place("\"Permssion denied. uid=") + " Permssion denied. uid=1"}));
}

}  // namespace
