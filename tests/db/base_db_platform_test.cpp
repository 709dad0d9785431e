// What the connection asks of the platform, in which order, under which identity, and what it makes
// of answers that cannot be provoked for real. This program stands between the library and the
// platform, hence it is one of its own.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <pthread.h>
#include <syslog.h>
#include <tuvoplatform/database.h>
#include <tuvoplatform/file.h>
#include <tuvoplatform/process.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <cstdio>
#include <functional>
#include <map>
#include <memory>
#include <new>
#include <optional>
#include <string>
#include <vector>

#include "log_lines.h"
#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "test_files.h"

namespace {

std::vector<std::string> calls;      // "name(arguments) as euid:egid", in order
std::map<std::string, int> answers;  // in place of the platform's own
DBResult_tag* rows_on_failure = nullptr;
std::function<void()> at_execute;  // runs within the next statement

std::vector<size_t> scratches;  // taken from the heap, by size
bool no_memory = false;         // for the next one
bool on_stack = false;          // whether the last text was escaped into the thread's stack

int within = 0;  // calls of the platform among its own functions are its own business

void Note(const std::string& call) {
  if (within > 0) {
    return;
  }
  calls.push_back(call + " as " + std::to_string(geteuid()) + ":" + std::to_string(getegid()));
}

std::string Text(const char* text) {
  return text == nullptr ? "null" : "\"" + std::string(text) + "\"";
}

std::optional<int> Answer(const char* name) {
  const auto found = answers.find(name);
  return found == answers.end() ? std::nullopt : std::optional<int>(found->second);
}

bool IsOnStack(const char* place) {
  pthread_attr_t attributes;
  void* lowest = nullptr;
  size_t size = 0;
  EXPECT_EQ(pthread_getattr_np(pthread_self(), &attributes), 0);
  EXPECT_EQ(pthread_attr_getstack(&attributes, &lowest, &size), 0);
  pthread_attr_destroy(&attributes);
  const char* bottom = static_cast<const char*>(lowest);
  return std::less_equal<>()(bottom, place) && std::less<>()(place, bottom + size);
}

// The platform's own function.
template <typename Result, typename... Parameters>
auto Real(Result (* /*same*/)(Parameters...), const char* name) {
  return [name](Parameters... arguments) -> Result {
    struct Within {
      Within() { ++within; }
      ~Within() { --within; }
    } scope;
    return reinterpret_cast<Result (*)(Parameters...)>(dlsym(RTLD_NEXT, name))(arguments...);
  };
}

}  // namespace

#define REAL(name) Real(&(name), #name)

extern "C" {

int TLIBCFileExist(const char* path) {
  Note("TLIBCFileExist(" + Text(path) + ")");
  const int real = REAL(TLIBCFileExist)(path);
  return Answer("TLIBCFileExist").value_or(real);
}

int TLIBCFileTouch(const char* path) {
  Note("TLIBCFileTouch(" + Text(path) + ")");
  const int real = REAL(TLIBCFileTouch)(path);
  return Answer("TLIBCFileTouch").value_or(real);
}

int TLIBCFileStat(const char* path, int kind, struct stat* st) {
  Note("TLIBCFileStat(" + Text(path) + "," + std::to_string(kind) + ")");
  const int real = REAL(TLIBCFileStat)(path, kind, st);
  return Answer("TLIBCFileStat").value_or(real);
}

int TUVOFSAclChmod(const char* path, int share, unsigned int mode) {
  Note("TUVOFSAclChmod(" + Text(path) + "," + std::to_string(share) + "," + std::to_string(mode) +
       ")");
  const int real = REAL(TUVOFSAclChmod)(path, share, mode);
  return Answer("TUVOFSAclChmod").value_or(real);
}

TUVODB* TUVODBConnect(const char* host, const char* user, const char* password, const char* path) {
  Note("TUVODBConnect(" + Text(host) + "," + Text(user) + "," + Text(password) + "," + Text(path) +
       ")");
  return Answer("TUVODBConnect") ? nullptr : REAL(TUVODBConnect)(host, user, password, path);
}

int TUVODBExecute(TUVODB* db, const char* sql, DBResult_tag** result) {
  Note("TUVODBExecute(" + Text(sql) + ")");
  if (at_execute) {
    at_execute();
    at_execute = nullptr;
  }
  if (const std::optional<int> answer = Answer("TUVODBExecute")) {
    *result = rows_on_failure;
    return *answer;
  }
  return REAL(TUVODBExecute)(db, sql, result);
}

const char* TUVODBErrorGet(TUVODB* db) {
  Note("TUVODBErrorGet()");
  return Answer("TUVODBExecute") ? "made up" : REAL(TUVODBErrorGet)(db);
}

void TUVODBFreeResult(DBResult_tag* result) {
  Note(result == nullptr ? "TUVODBFreeResult(null)" : "TUVODBFreeResult(rows)");
  REAL(TUVODBFreeResult)(result);
}

int TUVODBEscapeStringEX2(TUVODB* db, char* out, unsigned int size, const char* text,
                          unsigned int length) {
  Note(std::string("TUVODBEscapeStringEX2(") + (db == nullptr ? "null" : "connection") + "," +
       std::to_string(size) + "," + std::string(text, length) + "," + std::to_string(length) + ")");
  on_stack = IsOnStack(out);
  const int real = REAL(TUVODBEscapeStringEX2)(db, out, size, text, length);
  return Answer("TUVODBEscapeStringEX2").value_or(real);
}

void TUVODBClose(TUVODB* db) {
  Note("TUVODBClose()");
  REAL(TUVODBClose)(db);
}

FILE* TLIBCPopen(const char* path, const char* mode, ...) {
  std::vector<const char*> argv{path};
  std::string call = "TLIBCPopen(" + Text(path) + "," + Text(mode);
  va_list arguments;
  va_start(arguments, mode);
  do {
    argv.push_back(va_arg(arguments, const char*));
    call += "," + Text(argv.back());
  } while (argv.back() != nullptr);
  va_end(arguments);
  Note(call + ")");
  return Answer("TLIBCPopen") ? nullptr : REAL(TLIBCPopenv)(path, mode, argv.data());
}

int TLIBCPclose(FILE* stream) {
  Note("TLIBCPclose()");
  const int real = REAL(TLIBCPclose)(stream);
  return Answer("TLIBCPclose").value_or(real);
}

}  // extern "C"

// How the library takes scratch space that may be large.
void* operator new[](std::size_t size, const std::nothrow_t& /*tag*/) noexcept {
  scratches.push_back(size);
  try {
    return no_memory ? nullptr : ::operator new[](size);
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Result;
using tuvo_test::NewPath;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using Lines = std::vector<std::string>;

constexpr char kPath[] = "/tmp/platform.db";
constexpr char kSetUpCall[] =
    "TUVODBExecute(\"PRAGMA cache_size = 5000;PRAGMA foreign_keys = ON;PRAGMA journal_mode = WAL;"
    "PRAGMA synchronous = NORMAL;\") as 1:1";
const Lines kCreation{"TLIBCFileExist(\"/tmp/platform.db\") as 0:0",
                      "TLIBCFileExist(\"/tmp/platform.db\") as 1:1",
                      "TLIBCFileTouch(\"/tmp/platform.db\") as 1:1",
                      "TUVOFSAclChmod(\"/tmp/platform.db\",-1,432) as 1:1",
                      "TUVODBConnect(\"\",\"\",\"\",\"/tmp/platform.db\") as 1:1",
                      kSetUpCall,
                      "TUVODBFreeResult(rows) as 0:0"};

Lines FirstOfCreation(size_t count) {
  return {kCreation.begin(), kCreation.begin() + static_cast<Lines::difference_type>(count)};
}

// Runs as root, so that the system identity is seen to be taken.
class BaseDBPlatform : public testing::Test {
 protected:
  BaseDBPlatform() {
    answers.clear();
    rows_on_failure = nullptr;
    NewPath(kPath);
    calls.clear();
    scratches.clear();
  }
  ~BaseDBPlatform() override { answers.clear(); }

  // Opens a connection; what the opening asked for is forgotten.
  void Open() {
    db_ = std::make_unique<BaseDB>(kPath, 0660);
    EXPECT_TRUE(db_->IsGood());
    listener_.Take();
    calls.clear();
  }

  Lines TakeCalls() {
    Lines taken;
    taken.swap(calls);
    return taken;
  }

  SyslogListener listener_;
  std::unique_ptr<BaseDB> db_;
};

// --- Construction -----------------------------------------------------------------------------

TEST_F(BaseDBPlatform, AMissingFileIsMadeReModedConnectedToAndSetUpInThisOrder) {
  const BaseDB db(kPath, 0660);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(calls, kCreation);
}

TEST_F(BaseDBPlatform, AnExistingFileIsNeitherTouchedNorReModed) {
  tuvo_test::WriteFile(kPath, "");
  ASSERT_EQ(chmod(kPath, 0666), 0);
  const BaseDB db(kPath, 0660);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(calls, (Lines{kCreation[0], kCreation[4], kCreation[5], kCreation[6]}));
}

TEST_F(BaseDBPlatform, AFailedTouchIsTheEnd) {
  answers["TLIBCFileTouch"] = -1;
  EXPECT_FALSE(BaseDB(kPath, 0660).IsGood());
  EXPECT_EQ(calls, FirstOfCreation(3));
  EXPECT_EQ(TakeLines(listener_),
            Lines{"base_db:LINE (PID) create database failed on /tmp/platform.db\n\n"});
}

TEST_F(BaseDBPlatform, AFailedChangeOfModeIsTheEnd) {
  answers["TUVOFSAclChmod"] = -1;
  EXPECT_FALSE(BaseDB(kPath, 0660).IsGood());
  EXPECT_EQ(calls, FirstOfCreation(4));
  EXPECT_EQ(TakeLines(listener_),
            Lines{"base_db:LINE (PID) change mode failed on /tmp/platform.db\n\n"});
}

TEST_F(BaseDBPlatform, OnlyMinusOneIsAFailureOfTouchAndChangeOfMode) {
  answers["TLIBCFileTouch"] = 1;
  answers["TUVOFSAclChmod"] = -2;
  const BaseDB db(kPath, 0660);
  EXPECT_TRUE(db.IsGood());
  EXPECT_EQ(calls, kCreation);
}

TEST_F(BaseDBPlatform, AFailedConnectIsTheEndAndNothingIsClosed) {
  answers["TUVODBConnect"] = 0;
  EXPECT_FALSE(BaseDB(kPath, 0660).IsGood());
  EXPECT_EQ(calls, FirstOfCreation(5));
  EXPECT_EQ(TakeLines(listener_), Lines{"base_db:LINE (PID) db connect failed\n\n"});
}

TEST_F(BaseDBPlatform, AFailedSetUpLeavesAHandleThatIsClosed) {
  answers["TUVODBExecute"] = -1;
  EXPECT_FALSE(BaseDB(kPath, 0660).IsGood());
  Lines wanted = FirstOfCreation(6);
  wanted.insert(wanted.end(), {"TUVODBErrorGet() as 1:1", "TUVODBFreeResult(null) as 0:0",
                               "TUVODBClose() as 1:1"});
  EXPECT_EQ(calls, wanted);
  EXPECT_EQ(TakeLines(listener_), Lines{"base_db:LINE (PID) init failed\n\n"});
}

TEST_F(BaseDBPlatform, AnyTruthThatTheFileExistsCounts) {
  answers["TLIBCFileExist"] = 5;
  EXPECT_TRUE(BaseDB(kPath, 0660).IsGood());
  EXPECT_EQ(calls[1], kCreation[4]);
}

TEST_F(BaseDBPlatform, TheHandleIsClosedOnceByTheDestructor) {
  Open();
  db_.reset();
  EXPECT_EQ(calls, Lines{"TUVODBClose() as 1:1"});
}

// --- Statements -------------------------------------------------------------------------------

TEST_F(BaseDBPlatform, AStatementRunsAsTheSystemAndItsRowsAreFreedWhenNobodyWantsThem) {
  Open();
  EXPECT_TRUE(db_->Execute("SELECT 1"));
  EXPECT_EQ(calls, (Lines{"TUVODBExecute(\"SELECT 1\") as 1:1", "TUVODBFreeResult(rows) as 0:0"}));
}

TEST_F(BaseDBPlatform, AStatementWithoutRowsHasItsNullFreed) {
  Open();
  EXPECT_TRUE(db_->Execute("CREATE TABLE t (a)"));
  EXPECT_EQ(calls.back(), "TUVODBFreeResult(null) as 0:0");
}

TEST_F(BaseDBPlatform, RowsThatSomebodyWantsAreFreedByTheirResult) {
  Open();
  {
    Result result;
    EXPECT_TRUE(db_->Execute("SELECT 1", result));
    EXPECT_EQ(TakeCalls(), Lines{"TUVODBExecute(\"SELECT 1\") as 1:1"});
  }
  EXPECT_EQ(calls, Lines{"TUVODBFreeResult(rows) as 0:0"});
}

TEST_F(BaseDBPlatform, TheReasonOfAFailureIsAskedForBeforeTheIdentityIsGivenBack) {
  Open();
  EXPECT_FALSE(db_->Execute("nonsense"));
  EXPECT_EQ(calls, (Lines{"TUVODBExecute(\"nonsense\") as 1:1", "TUVODBErrorGet() as 1:1",
                          "TUVODBFreeResult(null) as 0:0"}));
}

TEST_F(BaseDBPlatform, OnlyMinusOneIsAFailureOfAStatement) {
  Open();
  for (const int answer : {0, 1, -2, 5}) {
    answers["TUVODBExecute"] = answer;
    EXPECT_TRUE(db_->Execute("SELECT 1")) << answer;
  }
  EXPECT_EQ(db_->GetLastError(), "");
  answers["TUVODBExecute"] = -1;
  EXPECT_FALSE(db_->Execute("SELECT 1"));
  EXPECT_EQ(db_->GetLastError(), "made up");
}

DBResult_tag* MadeUpRows() {
  DBResult_tag* rows = nullptr;
  TUVODB* db = REAL(TUVODBConnect)("", "", "", ":memory:");
  REAL(TUVODBExecute)(db, "SELECT 1", &rows);
  REAL(TUVODBClose)(db);
  EXPECT_NE(rows, nullptr);
  return rows;
}

TEST_F(BaseDBPlatform, RowsThatComeWithAFailureAreDeliveredAllTheSame) {
  Open();
  rows_on_failure = MadeUpRows();
  answers["TUVODBExecute"] = -1;
  Result result;
  EXPECT_FALSE(db_->Execute("SELECT 1", result));
  EXPECT_TRUE(result.IsGood());
}

TEST_F(BaseDBPlatform, RowsThatComeWithAFailureAndThatNobodyWantsAreFreed) {
  Open();
  rows_on_failure = MadeUpRows();
  answers["TUVODBExecute"] = -1;
  EXPECT_FALSE(db_->Execute("SELECT 1"));
  EXPECT_EQ(calls.back(), "TUVODBFreeResult(rows) as 0:0");
}

TEST_F(BaseDBPlatform, AConnectionThatIsNotGoodFreesNullAndAsksForNothingElse) {
  answers["TUVODBConnect"] = 0;
  BaseDB db(kPath, 0660);
  calls.clear();
  EXPECT_FALSE(db.Execute("SELECT 1"));
  EXPECT_EQ(TakeCalls(), Lines{"TUVODBFreeResult(null) as 0:0"});
  Result result;
  EXPECT_FALSE(db.Execute("SELECT 1", result));
  EXPECT_EQ(TakeCalls(), Lines{});
}

// A Result that another statement filled must not be taken for this one's.
TEST_F(BaseDBPlatform, AStatementThatIsNotRunHandsOnThatThereAreNoRows) {
  Open();
  answers["TUVODBConnect"] = 0;
  BaseDB bad(kPath, 0660);
  DBResult_tag* rows = MadeUpRows();
  Result result;
  result.SetResult(rows);
  EXPECT_FALSE(bad.Execute("SELECT 1", result));
  EXPECT_FALSE(result.IsGood());
  result.SetResult(rows);
  EXPECT_FALSE(db_->Execute(std::string("SELECT 1\0", 9), result));
  EXPECT_FALSE(result.IsGood());
  EXPECT_EQ(tuvo_test::RunInChild([&] {
              EXPECT_EQ(setresuid(65534, 65534, 65534), 0);
              calls.clear();
              result.SetResult(rows);
              EXPECT_FALSE(db_->Execute("SELECT 1", result));
              EXPECT_FALSE(result.IsGood());
              EXPECT_EQ(calls, Lines{});
              _exit(testing::Test::HasFailure() ? 1 : 0);  // its closing is another matter
              return 0;
            }),
            0);
  REAL(TUVODBFreeResult)(rows);
}

TEST_F(BaseDBPlatform, WithoutTheSystemIdentityTheConnectionIsClosedAllTheSame) {
  Open();
  EXPECT_EQ(tuvo_test::RunInChild([this] {
              EXPECT_EQ(setresuid(65534, 65534, 65534), 0);
              db_.reset();
              EXPECT_EQ(calls, Lines{"TUVODBClose() as 65534:0"});
              return 0;
            }),
            0);
}

TEST_F(BaseDBPlatform, TheWholeTextGoesToThePlatformInOneCall) {
  Open();
  EXPECT_TRUE(db_->Execute("CREATE TABLE a (x);CREATE TABLE b (x);"));
  EXPECT_EQ(calls[0], "TUVODBExecute(\"CREATE TABLE a (x);CREATE TABLE b (x);\") as 1:1");
  EXPECT_EQ(calls.size(), 2U);
}

// The way back is closed while the statement runs. Its outcome counts all the same, and the next
// statement finds the system identity in force.
TEST_F(BaseDBPlatform, AnIdentityThatCannotBeGivenBackIsLogged) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  using tuvo_test::kSavedRoot;
  EXPECT_EQ(tuvo_test::RunInChildAs(
                kSavedRoot,
                [] {
                  BaseDB db(kPath, 0660);
                  at_execute = [] {
                    EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kSetresuid, EPERM}}));
                  };
                  EXPECT_TRUE(db.Execute("SELECT 1"));
                  EXPECT_EQ(geteuid(), 1U);
                  EXPECT_TRUE(db.Execute("SELECT 2"));
                  return 0;
                }),
            0);
  const std::vector<tuvo_test::LogLine> lines = listener_.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(tuvo_test::Normalized(lines[0].text), "base_db:LINE ERROR: ~IF_RUN_AS(65534, 65534)");
  EXPECT_EQ(lines[0].facility, LOG_AUTH);
  EXPECT_EQ(lines[0].priority, LOG_CRIT);
}

// --- Escaping ---------------------------------------------------------------------------------

TEST_F(BaseDBPlatform, EscapingPassesNoConnectionAndTwiceTheLength) {
  Open();
  EXPECT_EQ(db_->Escape("it's"), "it''s");
  EXPECT_EQ(calls, Lines{"TUVODBEscapeStringEX2(null,8,it's,4) as 0:0"});
}

TEST_F(BaseDBPlatform, EscapingNothingPassesABufferOfNoSize) {
  Open();
  EXPECT_EQ(db_->Escape(""), "");
  EXPECT_EQ(calls, Lines{"TUVODBEscapeStringEX2(null,0,,0) as 0:0"});
}

TEST_F(BaseDBPlatform, AFailedEscapeIsLoggedAndEmpty) {
  Open();
  answers["TUVODBEscapeStringEX2"] = -1;
  EXPECT_EQ(db_->Escape("text"), "");
  EXPECT_EQ(db_->Escape(std::string(1000000, 'x')), "");
  EXPECT_EQ(TakeLines(listener_), Lines(2, "base_db:LINE (PID) escape failed\n\n"));
}

TEST_F(BaseDBPlatform, OnlyMinusOneIsAFailureOfEscaping) {
  Open();
  for (const int answer : {0, 1, -2}) {
    answers["TUVODBEscapeStringEX2"] = answer;
    EXPECT_EQ(db_->Escape("text"), "text") << answer;
  }
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(BaseDBPlatform, OrdinaryTextsAreEscapedWithoutTheHeap) {
  Open();
  for (const size_t length : {0, 1, 1000, 32767, 32768}) {
    EXPECT_EQ(db_->Escape(std::string(length, '\'')).size(), 2 * length);
    EXPECT_TRUE(on_stack) << length;
  }
  EXPECT_EQ(scratches, std::vector<size_t>{});
  EXPECT_EQ(db_->Escape(std::string(32769, '\'')).size(), 65538U);
  EXPECT_FALSE(on_stack);
  EXPECT_EQ(scratches, std::vector<size_t>{65538});
}

TEST_F(BaseDBPlatform, WithoutMemoryForALongTextEscapingFailsAndAsksThePlatformForNothing) {
  Open();
  no_memory = true;
  EXPECT_EQ(db_->Escape(std::string(1000000, 'x')), "");
  no_memory = false;
  EXPECT_EQ(calls, Lines{});
  const int line = tuvo_test::SourceLine("db/base_db.cpp", "(\"escape failed",
                                         "std::string BaseDBPrivate::Escape(");
  EXPECT_EQ(tuvo_test::TakeWritten(listener_),
            Lines{"user.err base_db:" + std::to_string(line) + " (" + std::to_string(getpid()) +
                  ") escape failed\n\n"});
}

// The empty text in its place would be a row without its data.
TEST_F(BaseDBPlatform, WhatCannotBeEscapedIsNotStored) {
  Open();
  ASSERT_TRUE(db_->Execute("CREATE TABLE t (id INTEGER PRIMARY KEY, value TEXT)"));
  ASSERT_TRUE(db_->Insert("t", {"before"}));
  const std::string query = db_->GetLastQuery();
  calls.clear();
  const std::string text(40000, 'x');
  no_memory = true;
  EXPECT_FALSE(db_->Insert("t", {text}));
  EXPECT_FALSE(db_->Update("t", {{"value", text}}, 1));
  EXPECT_FALSE(db_->Update("t", {{text, "value"}}, 1));
  no_memory = false;
  EXPECT_EQ(calls, Lines{"TUVODBEscapeStringEX2(null,10,value,5) as 0:0"}) << "a column's name";
  EXPECT_EQ(db_->GetLastError(), "escape failed");
  EXPECT_EQ(db_->GetLastQuery(), query);
  EXPECT_EQ(tuvo_test::TakeWritten(listener_).size(), 3U);
}

// --- A file of root ---------------------------------------------------------------------------

TEST_F(BaseDBPlatform, TheOwnerIsAskedForUnderTheCallersIdentity) {
  Open();
  EXPECT_FALSE(db_->IsRoot());
  EXPECT_EQ(calls, Lines{"TLIBCFileStat(\"/tmp/platform.db\",1) as 0:0"});
}

TEST_F(BaseDBPlatform, WithoutAnAnswerTheFileIsNotRoots) {
  Open();
  ASSERT_EQ(chown(kPath, 0, 0), 0);
  EXPECT_TRUE(db_->IsRoot());
  for (const int answer : {-1, 1}) {
    answers["TLIBCFileStat"] = answer;
    EXPECT_FALSE(db_->IsRoot()) << answer;
  }
}

TEST_F(BaseDBPlatform, TheMoveNamesProgramAndFolderAndRunsAsRoot) {
  Open();
  EXPECT_TRUE(db_->MoveRootDB());  // it is in /tmp already: mv refuses
  EXPECT_EQ(calls,
            (Lines{"TLIBCPopen(\"/bin/mv\",\"r\",\"/tmp/platform.db\",\"/tmp/\",null) as 0:0",
                   "TLIBCPclose() as 0:0"}));
}

TEST_F(BaseDBPlatform, TheMoveAnswersTrueForEveryStatusButZero) {
  Open();
  for (const int status : {1, 256, -1}) {
    answers["TLIBCPclose"] = status;
    EXPECT_TRUE(db_->MoveRootDB()) << status;
  }
  answers["TLIBCPclose"] = 0;
  EXPECT_FALSE(db_->MoveRootDB());
}

TEST_F(BaseDBPlatform, AMoveThatCannotBeStartedIsLoggedAndNothingIsClosed) {
  Open();
  answers["TLIBCPopen"] = 0;
  EXPECT_FALSE(db_->MoveRootDB());
  EXPECT_EQ(calls.size(), 1U);
  EXPECT_EQ(TakeLines(listener_), Lines{"base_db:LINE TLIBCPopen failed, path=/tmp/platform.db"});
}

}  // namespace
