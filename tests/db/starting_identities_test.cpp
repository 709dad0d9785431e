// The database's operations from each identity that a program may start under: what it can do
// there, what is logged where it cannot, and that the process is afterwards what it was before.
#include <dlfcn.h>
#include <grp.h>
#include <gtest/gtest.h>
#include <internal/sharing_db_private.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <iterator>
#include <memory>
#include <ostream>
#include <stdexcept>
#include <string>
#include <tuple>
#include <vector>

#include "identity_lines.h"
#include "sqlite_file.h"
#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::SharingDBPrivate;
using tuvo_test::CurrentIds;
using tuvo_test::Exists;
using tuvo_test::Ids;
using tuvo_test::kPrivateFolder;
using tuvo_test::LastChild;
using tuvo_test::NewPath;
using tuvo_test::OwnerAndMode;
using tuvo_test::Place;
using tuvo_test::ReturnFailed;
using tuvo_test::RunInChild;
using tuvo_test::SqliteFile;
using tuvo_test::SwitchFailed;
using tuvo_test::SyslogListener;
using tuvo_test::TakeWritten;
using tuvo_test::ToText;
using tuvo_test::WriteFile;
using Lines = std::vector<std::string>;

// --- The identities ---------------------------------------------------------------------------

struct Start {
  const char* name;
  Ids ids;
};

void PrintTo(const Start& start, std::ostream* out) {
  *out << start.name;
}

constexpr Start kRoot{"Root", {0, 0, 0, 0, 0, 0}};
// As a set-user-id program of root's that gives root up for the time being.
constexpr Start kSavedRoot{"OrdinaryUserWithSavedRoot", {2001, 2001, 0, 3001, 3001, 3001}};
// As such a program when it starts.
constexpr Start kSetUserId{"SetUserIdRoot", {33, 0, 0, 33, 33, 33}};
constexpr Start kSystem{"SystemIdentity", {1, 1, 1, 1, 1, 1}};
constexpr Start kSystemWithRoot{"SystemIdentityWithSavedRoot", {1, 1, 0, 1, 1, 0}};
constexpr Start kSavedGroup{"SystemUserWithItsGroupSaved", {1, 1, 1, 3001, 3001, 1}};
constexpr Start kOtherGroup{"SystemUserOfAnotherGroup", {1, 1, 1, 3001, 3001, 3001}};
// The user is the right one, so root is not regained, without which the group cannot be had.
constexpr Start kOtherGroupWithRoot{"SystemUserOfAnotherGroupWithSavedRoot",
                                    {1, 1, 0, 3001, 3001, 3001}};
constexpr Start kOrdinary{"OrdinaryUser", {2001, 2001, 2001, 3001, 3001, 3001}};
// The way to other ids goes through root alone.
constexpr Start kRealSystem{"OrdinaryUserWithRealAndSavedSystem", {1, 65534, 1, 1, 65534, 1}};

const auto kAll =
    testing::Values(kRoot, kSavedRoot, kSetUserId, kSystem, kSystemWithRoot, kSavedGroup,
                    kOtherGroup, kOtherGroupWithRoot, kOrdinary, kRealSystem);
const auto kCanBeSystem =
    testing::Values(kRoot, kSavedRoot, kSetUserId, kSystem, kSystemWithRoot, kSavedGroup);
const auto kCannotBeSystem =
    testing::Values(kOtherGroup, kOtherGroupWithRoot, kOrdinary, kRealSystem);
const auto kCanBeRoot =
    testing::Values(kRoot, kSavedRoot, kSetUserId, kSystemWithRoot, kOtherGroupWithRoot);
const auto kCannotBeRoot =
    testing::Values(kSystem, kSavedGroup, kOtherGroup, kOrdinary, kRealSystem);

std::string NameOf(const testing::TestParamInfo<Start>& info) {
  return info.param.name;
}

// Groups and umask are none of the switch's business; unusual ones show when they change.
constexpr gid_t kGroups[] = {5, 3002};
constexpr mode_t kUmask = 0137;

void Take(const Ids& ids) {
  umask(kUmask);
  ASSERT_EQ(setgroups(std::size(kGroups), kGroups), 0);
  ASSERT_EQ(setresgid(ids.rgid, ids.egid, ids.sgid), 0);
  ASSERT_EQ(setresuid(ids.ruid, ids.euid, ids.suid), 0);
}

// All that must be the same after every operation.
std::string State() {
  gid_t groups[64];
  const int count = getgroups(static_cast<int>(std::size(groups)), groups);
  const mode_t mask = umask(0);
  umask(mask);
  std::string state = ToText(CurrentIds()) + " umask " + std::to_string(mask) + " groups";
  for (int i = 0; i < count; ++i) {
    state += " " + std::to_string(groups[i]);
  }
  return state;
}

// --- Operations -------------------------------------------------------------------------------

constexpr unsigned int kMode = 0660;
constexpr char kBaseDb[] = "db/base_db.cpp";
constexpr char kSharingDb[] = "db/sharing_db.cpp";
constexpr char kCreate[] = "bool BaseDBPrivate::Create(";
constexpr char kConnect[] = "bool BaseDBPrivate::Connect(";
constexpr char kExecute[] = "bool BaseDBPrivate::ExecuteAsSystem(";
constexpr char kMove[] = "bool BaseDBPrivate::MoveRootDB(";
constexpr char kClose[] = "BaseDBPrivate::~BaseDBPrivate(";
constexpr char kMigration[] = "bool SharingDBPrivate::Migration(";
constexpr char kMigrateTo[] = "bool SharingDBPrivate::MigrateTo(";

// What the operations work on.
struct Database {
  std::unique_ptr<SharingDB> db;  // of the current version
  std::string path;               // its file
  std::string missing;            // where there is none yet
};

using Operation = void (*)(Database&);

void Construct(Database& database) {
  const BaseDB db(database.missing, kMode);
}
void ConstructOnAnExistingFile(Database& database) {
  const BaseDB db(database.path, kMode);
}
void ConstructInVain(Database& /*database*/) {
  const BaseDB db("/tmp/no such folder/x.db", kMode);
}
void Execute(Database& database) {
  database.db->Execute("SELECT * FROM entry");
}
void ExecuteInVain(Database& database) {
  database.db->Execute("nonsense");
}
void Migrate(Database& database) {
  database.db->Execute("PRAGMA user_version = 0");
  const SharingDBPrivate migration(database.db.get());
}
void MigrateInVain(Database& database) {
  database.db->Execute("PRAGMA user_version = -1");  // there is no script 0
  const SharingDBPrivate migration(database.db.get());
}
void Move(Database& database) {
  database.db->MoveRootDB();
}
void MoveInVain(Database& /*database*/) {
  const BaseDB db("/tmp/no such folder/x.db", kMode);
  db.MoveRootDB();
}
void Close(Database& database) {
  database.db.reset();
}

struct NamedOperation {
  const char* name;
  Operation run;
};

void PrintTo(const NamedOperation& operation, std::ostream* out) {
  *out << operation.name;
}

// Runs operations in processes of their own.
class StartingIdentity : public testing::Test {
 protected:
  StartingIdentity()
      : path_(NewPath(kPrivateFolder + std::string("start.db"))),
        missing_(NewPath(kPrivateFolder + std::string("missing.db"))) {
    NewPath("/tmp/start.db");
  }

  // In a process that opens the database as root and takes `ids` then. What `body` leaves open
  // stays open: closing is an operation like the others.
  void InProcess(const Ids& ids, const std::function<void(Database&)>& body) {
    EXPECT_EQ(RunInChild([&] {
                Database database{std::make_unique<SharingDB>(path_), path_, missing_};
                EXPECT_TRUE(database.db->IsGood());
                Take(ids);
                EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
                body(database);
                std::fflush(nullptr);
                _exit(testing::Test::HasFailure() ? 1 : 0);
                return 0;
              }),
              0);
  }

  // "user.err base_db:70 (345) failed to run as system\n\n", of the process that ran last.
  static std::string ErrorOf(const std::string& place, const std::string& text) {
    return "user.err " + place + " (" + std::to_string(LastChild()) + ") " + text + "\n\n";
  }
  static std::string NotSystem(const std::string& function) {
    return ErrorOf(Place(kBaseDb, "SHARING_LOG_PID(\"failed to run as system", function),
                   "failed to run as system");
  }

  std::string path_;
  std::string missing_;
  SyslogListener listener_;
};

// --- The process afterwards -------------------------------------------------------------------

class AnyOperation : public StartingIdentity,
                     public testing::WithParamInterface<std::tuple<Start, NamedOperation>> {};

std::string NameOfBoth(const testing::TestParamInfo<std::tuple<Start, NamedOperation>>& info) {
  return std::string(std::get<0>(info.param).name) + std::get<1>(info.param).name;
}

TEST_P(AnyOperation, LeavesIdsGroupsAndUmaskAsTheyWere) {
  const auto& [start, operation] = GetParam();
  InProcess(start.ids, [&, run = operation.run](Database& database) {
    const std::string before = State();
    run(database);
    EXPECT_EQ(State(), before);
  });
}

INSTANTIATE_TEST_SUITE_P(
    From, AnyOperation,
    testing::Combine(kAll, testing::Values(NamedOperation{"Constructing", Construct},
                                           NamedOperation{"ConstructingInVain", ConstructInVain},
                                           NamedOperation{"Executing", Execute},
                                           NamedOperation{"ExecutingInVain", ExecuteInVain},
                                           NamedOperation{"Migrating", Migrate},
                                           NamedOperation{"MigratingInVain", MigrateInVain},
                                           NamedOperation{"Moving", Move},
                                           NamedOperation{"MovingInVain", MoveInVain},
                                           NamedOperation{"Closing", Close})),
    NameOfBoth);

// --- Those who can be the system identity -----------------------------------------------------

class Identity : public StartingIdentity, public testing::WithParamInterface<Start> {
 protected:
  // In a process that has the start's ids from the beginning.
  void InChild(const std::function<void()>& body) {
    EXPECT_EQ(RunInChild([&] {
                Take(GetParam().ids);
                body();
                return 0;
              }),
              0);
  }
};

// A folder where nobody else may write shows that the system identity was in force.
TEST_P(Identity, AMissingFileIsMadeForTheSystemIdentityWithTheModeAskedFor) {
  InChild([&] { EXPECT_TRUE(BaseDB(missing_, kMode).IsGood()); });
  EXPECT_EQ(OwnerAndMode(missing_), "1:1 0660");
  EXPECT_EQ(TakeWritten(listener_), Lines{});
}

TEST_P(Identity, AnExistingFileOfTheSystemIdentityIsOpened) {
  WriteFile(missing_, "");
  ASSERT_EQ(chown(missing_.c_str(), 1, 1), 0);
  ASSERT_EQ(chmod(missing_.c_str(), 0600), 0);
  InChild([&] { EXPECT_TRUE(BaseDB(missing_, kMode).IsGood()); });
  EXPECT_EQ(OwnerAndMode(missing_), "1:1 0600");
}

TEST_P(Identity, AFileThatCannotBeMadeLeavesItsReason) {
  InChild([&] {
    EXPECT_FALSE(BaseDB("/tmp/no such folder/x.db", kMode).IsGood());
    EXPECT_EQ(errno, ENOENT);
  });
}

TEST_P(Identity, StatementsRun) {
  InChild([&] {
    BaseDB db(missing_, kMode);
    EXPECT_TRUE(db.Execute("CREATE TABLE t (id INTEGER PRIMARY KEY, a)"));
    EXPECT_TRUE(db.Insert("t", {"x"}));
    EXPECT_FALSE(db.Execute("nonsense"));
    EXPECT_TRUE(db.ExecuteWALCheckPoint());
    EXPECT_TRUE(db.Vacuum());
  });
  EXPECT_EQ(SqliteFile(missing_).Value("SELECT a FROM t"), "x");
  EXPECT_EQ(TakeWritten(listener_), Lines{});
}

// The statement itself touches no file and so no errno: what changes it would be the switch.
TEST_P(Identity, SwitchingAndReturningAroundAStatementLeaveErrno) {
  InProcess(GetParam().ids, [](Database& database) {
    errno = EDOM;
    EXPECT_TRUE(database.db->Execute("SELECT 1"));
    EXPECT_EQ(errno, EDOM);
  });
}

TEST_P(Identity, TheFilesBesideTheDatabaseBelongToTheSystemIdentityToo) {
  InChild([&] {
    BaseDB db(missing_, kMode);
    EXPECT_TRUE(db.Execute("CREATE TABLE t (a)"));
    EXPECT_EQ(OwnerAndMode(missing_ + "-wal"), "1:1 0660");
    EXPECT_EQ(OwnerAndMode(missing_ + "-shm"), "1:1 0660");
  });
}

TEST_P(Identity, ClosingFoldsTheLogBackAndRemovesIt) {
  InChild([&] {
    BaseDB db(missing_, kMode);
    EXPECT_TRUE(db.Execute("CREATE TABLE t (a)"));
  });
  EXPECT_TRUE(Exists(missing_));
  EXPECT_FALSE(Exists(missing_ + "-wal"));
  EXPECT_FALSE(Exists(missing_ + "-shm"));
}

// A script that nobody but the system identity and root may read.
TEST_P(Identity, TheSchemaIsMigrated) {
  const std::string script = "/usr/tuvo/share/tuvosharing/db_schema/1.sql";
  ASSERT_EQ(chown(script.c_str(), 1, 1), 0);
  ASSERT_EQ(chmod(script.c_str(), 0400), 0);
  InChild([&] { EXPECT_TRUE(SharingDB(missing_).IsGood()); });
  EXPECT_EQ(SqliteFile(missing_).Value("PRAGMA user_version"), "2");
  EXPECT_EQ(OwnerAndMode(missing_), "1:1 0660");
  EXPECT_EQ(TakeWritten(listener_), Lines{});
}

// Its reason is told after the return.
TEST_P(Identity, AScriptsReasonOutlivesTheReturn) {
  InProcess(GetParam().ids, [](Database& database) {
    EXPECT_TRUE(database.db->Execute("PRAGMA user_version = -1"));
    EXPECT_FALSE(SharingDBPrivate(database.db.get()).IsMigrated());
    EXPECT_EQ(errno, ENOENT);
  });
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{ErrorOf(Place(kSharingDb, "SHARING_LOG_PID(\"file ", kMigrateTo),
                           "file /usr/tuvo/share/tuvosharing/db_schema/0.sql open failed No such "
                           "file or directory."),
                   ErrorOf(Place(kSharingDb, "SHARING_LOG_PID(\"cannot migrate", kMigration),
                           "cannot migrate from -1 to 0")}));
}

INSTANTIATE_TEST_SUITE_P(From, Identity, kCanBeSystem, NameOf);

// --- Those who cannot -------------------------------------------------------------------------

class WithoutIdentity : public Identity {};

TEST_P(WithoutIdentity, AMissingFileIsNotMade) {
  // Where this process itself could make one.
  const std::string path = NewPath("/tmp/nobodys.db");
  InChild([&] {
    EXPECT_FALSE(BaseDB(path, kMode).IsGood());
    EXPECT_EQ(errno, EPERM);
  });
  EXPECT_FALSE(Exists(path));
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kCreate, "1, 1"), NotSystem(kCreate)}));
}

TEST_P(WithoutIdentity, AnExistingFileIsNotOpened) {
  const std::string path = NewPath("/tmp/everybodys.db");
  WriteFile(path, "");
  ASSERT_EQ(chmod(path.c_str(), 0666), 0);
  InChild([&] {
    EXPECT_FALSE(BaseDB(path, kMode).IsGood());
    EXPECT_EQ(errno, EPERM);
  });
  EXPECT_EQ(OwnerAndMode(path), "0:0 0666");
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kConnect, "1, 1"), NotSystem(kConnect)}));
}

TEST_P(WithoutIdentity, AStatementFails) {
  InProcess(GetParam().ids, [](Database& database) {
    EXPECT_FALSE(database.db->Execute("INSERT INTO entry (hash) VALUES ('mark')"));
    EXPECT_EQ(errno, EPERM);
  });
  EXPECT_EQ(SqliteFile(path_).Value("SELECT COUNT(*) FROM entry"), "0");
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kExecute, "1, 1"), NotSystem(kExecute)}));
}

TEST_P(WithoutIdentity, TheSchemaIsNotMigrated) {
  InProcess(GetParam().ids, [](Database& database) {
    EXPECT_FALSE(SharingDBPrivate(database.db.get()).IsMigrated());
    EXPECT_EQ(errno, EPERM);
  });
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kExecute, "1, 1"), NotSystem(kExecute),
                   ErrorOf(Place(kSharingDb, "SHARING_RETURN_FALSE_IF(", kMigration),
                           "Failed [!pdb_->Execute(\"PRAGMA user_version\", result)], "
                           "err=Operation not permitted")}));
}

TEST_P(WithoutIdentity, TheSharingDatabaseIsNotGood) {
  InChild([&] { EXPECT_FALSE(SharingDB(missing_).IsGood()); });
  EXPECT_FALSE(Exists(missing_));
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kCreate, "1, 1"), NotSystem(kCreate),
                   ErrorOf(Place(kBaseDb, "SHARING_LOG_PID(\"db is not good",
                                 "bool BaseDBPrivate::Execute("),
                           "db is not good."),
                   ErrorOf(Place(kSharingDb, "SHARING_RETURN_FALSE_IF(", kMigration),
                           "Failed [!pdb_->Execute(\"PRAGMA user_version\", result)], "
                           "err=Operation not permitted")}));
}

TEST_P(WithoutIdentity, ClosingIsLoggedAndDoneAllTheSame) {
  InProcess(GetParam().ids, [](Database& database) {
    const int before = dup(0);
    close(before);
    database.db.reset();
    const int after = dup(0);
    close(after);
    EXPECT_LT(after, before) << "the database's files are still open";
  });
  EXPECT_EQ(TakeWritten(listener_), Lines{SwitchFailed(kBaseDb, kClose, "1, 1")});
}

INSTANTIATE_TEST_SUITE_P(From, WithoutIdentity, kCannotBeSystem, NameOf);

// --- A file of root's -------------------------------------------------------------------------

class OfRootsFile : public Identity {
 protected:
  OfRootsFile() {
    SqliteFile(path_).Execute("CREATE TABLE t (a)");
    EXPECT_EQ(chmod(path_.c_str(), 0666), 0);
    EXPECT_EQ(OwnerAndMode(path_), "0:0 0666");
  }
};

class RootsIdentity : public OfRootsFile {};

// Mind the sense: false is what a move that succeeded answers. Only root and the system identity
// may move anything out of this folder.
TEST_P(RootsIdentity, TheFileIsMovedAside) {
  InProcess(GetParam().ids, [&](Database& database) {
    EXPECT_TRUE(database.db->IsRoot());
    EXPECT_FALSE(database.db->MoveRootDB());
    EXPECT_FALSE(Exists(path_));
  });
  EXPECT_EQ(OwnerAndMode("/tmp/start.db"), "0:0 0666");
  EXPECT_EQ(TakeWritten(listener_), Lines{});
}

INSTANTIATE_TEST_SUITE_P(From, RootsIdentity, kCanBeRoot, NameOf);

class WithoutRoot : public OfRootsFile {};

TEST_P(WithoutRoot, TheFileIsNotMoved) {
  InProcess(GetParam().ids, [](Database& database) {
    EXPECT_TRUE(database.db->IsRoot());
    EXPECT_FALSE(database.db->MoveRootDB());
    EXPECT_EQ(errno, EPERM);
  });
  EXPECT_TRUE(Exists(path_));
  EXPECT_EQ(TakeWritten(listener_),
            (Lines{SwitchFailed(kBaseDb, kMove, "0, 0"),
                   "user.err " + Place(kBaseDb, "SHARING_LOG(\"Permssion", kMove) +
                       " Permssion denied. uid=" + std::to_string(GetParam().ids.ruid)}));
}

INSTANTIATE_TEST_SUITE_P(From, WithoutRoot, kCannotBeRoot, NameOf);

// --- No way back ------------------------------------------------------------------------------

struct Refused {
  NamedOperation operation;
  const char* function;  // in which the switch stands
};

void PrintTo(const Refused& refused, std::ostream* out) {
  *out << refused.operation.name;
}

class ReturnRefused : public StartingIdentity, public testing::WithParamInterface<Refused> {};

TEST_P(ReturnRefused, IsLoggedOnceWithThePlaceOfItsSwitch) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  InProcess(kSavedRoot.ids, [](Database& database) {
    EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kSetresuid, EPERM, 1, kSavedRoot.ids.euid}}));
    GetParam().operation.run(database);
    EXPECT_EQ(geteuid(), 0U);
    EXPECT_EQ(getegid(), kSavedRoot.ids.egid);
  });
  EXPECT_EQ(TakeWritten(listener_),
            Lines{ReturnFailed(kBaseDb, GetParam().function, "2001, 3001")});
}

INSTANTIATE_TEST_SUITE_P(
    After, ReturnRefused,
    testing::Values(Refused{{"MakingTheFile", Construct}, kCreate},
                    Refused{{"Connecting", ConstructOnAnExistingFile}, kConnect},
                    Refused{{"Executing", Execute}, kExecute}, Refused{{"Moving", Move}, kMove},
                    Refused{{"Closing", Close}, kClose}),
    [](const auto& refused) { return refused.param.operation.name; });

// --- The system identity, which needs no switch -----------------------------------------------

// Moving a file of root's is not among them: that is for root alone.
class UnderTheSystemIdentity : public StartingIdentity,
                               public testing::WithParamInterface<NamedOperation> {};

TEST_P(UnderTheSystemIdentity, NoIdIsEverTouched) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  InProcess(kSystem.ids, [](Database& database) {
    EXPECT_TRUE(tuvo_test::EndAtIdChanges());
    GetParam().run(database);
  });
  EXPECT_EQ(tuvo_test::TakeWritten(listener_).size(), 0U);
}

INSTANTIATE_TEST_SUITE_P(By, UnderTheSystemIdentity,
                         testing::Values(NamedOperation{"Constructing", Construct},
                                         NamedOperation{"Executing", Execute},
                                         NamedOperation{"ExecutingInVain", ExecuteInVain},
                                         NamedOperation{"Migrating", Migrate},
                                         NamedOperation{"Closing", Close}),
                         [](const auto& operation) { return operation.param.name; });

constexpr char kWholeRun[] = "/tmp/whole run/whole_run";

// Puts whole_run, and the library that it loads, where everybody may start it: the build folder may
// stand in one that only its owner may search.
void InstallWholeRun() {
  Dl_info platform{};
  if (dladdr(dlsym(RTLD_DEFAULT, "TUVODBConnect"), &platform) == 0) {
    throw std::runtime_error("the platform's library is nowhere");
  }
  const std::string library = "/tmp/whole run/libtuvoplatform.so.1";
  std::filesystem::create_directory("/tmp/whole run");
  const auto replace = std::filesystem::copy_options::overwrite_existing;
  std::filesystem::copy_file(TUVO_WHOLE_RUN, kWholeRun, replace);
  std::filesystem::copy_file(platform.dli_fname, library, replace);
}

// The id-changing calls of whole_run, from its first instruction to its last, as strace lists them.
// Throws when it does not run.
std::string IdChangesOfAWholeRun(const Ids& ids) {
  InstallWholeRun();
  const std::string list = NewPath("/tmp/id changes " + std::to_string(ids.euid));
  const int status = RunInChild([&] {
    Take(ids);
    execlp("strace", "strace", "-f", "-qq", "-e", "signal=none", "-e",
           "trace=/^set(re|res|fs)?[ug]id(32)?$,/^setgroups(32)?$", "-E",
           "ASAN_OPTIONS=detect_leaks=0",  // nobody is traced by two
           "-E", "LD_LIBRARY_PATH=/tmp/whole run", "-o", list.c_str(), kWholeRun, nullptr);
    return 1;
  });
  if (status != 0) {
    throw std::runtime_error("the run ended with " + std::to_string(status));
  }
  return tuvo_test::ReadFile(list);
}

// Whether there is strace, and it may trace.
bool CanTrace() {
  return RunInChild([] {
           Take(kSystem.ids);
           execlp("strace", "strace", "-qq", "-o", "/dev/null", "true", nullptr);
           return 1;
         }) == 0;
}

TEST(WholeRun, UnderTheSystemIdentityMakesNoIdChangingCall) {
  if (!CanTrace()) {
    GTEST_SKIP() << "there is no strace here, or it may not trace";
  }
  EXPECT_EQ(IdChangesOfAWholeRun(kSystem.ids), "");
}

// The list of the test above does show such calls where they are made.
TEST(WholeRun, UnderRootMakesSome) {
  if (!CanTrace()) {
    GTEST_SKIP() << "there is no strace here, or it may not trace";
  }
  const std::string calls = IdChangesOfAWholeRun(kRoot.ids);
  EXPECT_NE(calls.find("setresuid"), std::string::npos) << calls;
  EXPECT_NE(calls.find("setresgid"), std::string::npos) << calls;
}

}  // namespace
