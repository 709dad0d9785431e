// The login API in processes that run under different ids. That every operation ends with the six
// ids it began with is expected by VisitTest itself.
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <map>

#include "login/visit.h"

namespace tuvo_test {
namespace {

// A set-user-id program of root's, started by the web server's user.
constexpr Ids kSetUserId{33, 0, 0, 33, 33, 33};

struct Starter {
  const char* name;
  Ids ids;
};

class UnderIds : public VisitTest, public testing::WithParamInterface<Starter> {
 protected:
  static const Ids& ids() { return GetParam().ids; }
};

class UnderRootsIds : public UnderIds {};
// Those that neither are nor can become the system identity.
class UnderNobodysIds : public UnderIds {};
class UnderSystemsIds : public VisitTest {};

std::string NameOf(const testing::TestParamInfo<Starter>& info) {
  return info.param.name;
}

// Owner, group and mode of every file in the data folder, by name.
std::map<std::string, std::string> Files() {
  std::map<std::string, std::string> files;
  for (const auto& file : std::filesystem::directory_iterator(kFolder)) {
    struct stat status {};
    stat(file.path().c_str(), &status);
    char text[64];
    std::snprintf(text, sizeof text, "%u:%u %04o", status.st_uid, status.st_gid,
                  status.st_mode & 07777U);
    files[file.path().filename()] = text;
  }
  return files;
}

TEST_P(UnderIds, AWholeVisitSucceeds) {
  const std::string hash = MakePasswordLink();
  const Visit visit = Visit(hash).As(ids());
  EXPECT_EQ(-9, Login(Visit(visit).Password("wrong")).code);
  EXPECT_EQ(1, FailedLogins());
  const Reply login = Login(Visit(visit).Password("sesame"));
  EXPECT_EQ(1, login.code);
  EXPECT_EQ(Lines{}, login.log);
  EXPECT_EQ(0, FailedLogins());
  const Reply check = Check(Visit(visit).Session(login.session_id));
  EXPECT_EQ(1, check.code);
  EXPECT_EQ(Lines{}, check.log);
  EXPECT_EQ(1, CountUse(hash, ids()).code);
  EXPECT_EQ("2", Value("SELECT use_count FROM entry"));
  EXPECT_EQ(1, Logout(hash, login.session_id, ids()).code);
  EXPECT_EQ(-7, Check(Visit(visit).Session(login.session_id)).code);
}

TEST_P(UnderIds, FilesBelongToTheSystemWhoeverMadeThem) {
  EXPECT_EQ(-3, Login(Visit("unknown").As(ids())).code);
  EXPECT_EQ((std::map<std::string, std::string>{{"autoblock.db", "1:1 0660"},
                                                {"sharing.db", "1:1 0660"}}),
            Files());
}

TEST_P(UnderIds, ASessionsAccountIsChecked) {
  const std::string hash = MakeAccountLink();
  const std::string id = LoggedIn(Visit(hash).Account("alice", "alice-secret"));
  EXPECT_EQ(1, Check(Visit(hash).Session(id).As(ids())).code);
  Change("UPDATE session SET uid = 2002");
  EXPECT_EQ(-2, Check(Visit(hash).Session(id).As(ids())).code);
}

INSTANTIATE_TEST_SUITE_P(All, UnderIds,
                         testing::Values(Starter{"Root", kRoot}, Starter{"SavedRoot", kSavedRoot},
                                         Starter{"SetUserId", kSetUserId},
                                         Starter{"System", kSystem}),
                         NameOf);

TEST_P(UnderRootsIds, AnAccountLogsIn) {
  const std::string hash = MakeAccountLink();
  const Visit visit = Visit(hash).As(ids());
  EXPECT_EQ(-2, Login(Visit(visit).Account("alice", "wrong")).code);
  EXPECT_EQ(-10, Login(Visit(visit).Account("bob", "bob-secret")).code);
  EXPECT_EQ(1, Login(Visit(visit).Account("alice", "alice-secret")).code);
  EXPECT_EQ(std::to_string(kAlice), Value("SELECT uid FROM session"));
}

TEST_P(UnderRootsIds, AFileOfRootsIsMovedAside) {
  MakeLink();
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  ASSERT_EQ(0, chmod(kDatabase, 0600));
  EXPECT_EQ(-5, Check(Visit("unknown").Session("unknown").As(ids())).code);
  EXPECT_EQ(0U, Files().count("sharing.db"));
  EXPECT_TRUE(std::filesystem::exists(kMovedDatabase));
}

INSTANTIATE_TEST_SUITE_P(All, UnderRootsIds,
                         testing::Values(Starter{"Root", kRoot}, Starter{"SavedRoot", kSavedRoot},
                                         Starter{"SetUserId", kSetUserId}),
                         NameOf);

// The system's password file is root's alone to read: a program without root can serve links with
// passwords, and accounts that have logged in elsewhere, but log no account in.
TEST_F(UnderSystemsIds, NoAccountCanLogIn) {
  const std::string hash = MakeAccountLink();
  const Reply reply = Login(Visit(hash).Account("alice", "alice-secret").As(kSystem));
  EXPECT_EQ(-2, reply.code);
  EXPECT_EQ("0", Value("SELECT COUNT(*) FROM session"));
  EXPECT_EQ(1, FailedLogins());
}

TEST_P(UnderNobodysIds, EverythingIsRefusedAndNothingChanges) {
  const std::string hash = MakePasswordLink();
  const std::string id = LoggedIn(Visit(hash).Password("sesame"));
  FailLogins(1);
  const auto files = Files();
  const std::string all = "SELECT * FROM entry, session, token";
  const auto rows = Rows(all);
  EXPECT_EQ(-4, Login(Visit(hash).Password("sesame").As(ids())).code);
  EXPECT_EQ(-4, Login(Visit(hash).Password("wrong").As(ids())).code);
  EXPECT_EQ(-4, Check(Visit(hash).Session(id).As(ids())).code);
  EXPECT_EQ(0, Logout(hash, id, ids()).code);
  EXPECT_EQ(0, CountUse(hash, ids()).code);
  EXPECT_EQ(rows, Rows(all));
  EXPECT_EQ(files, Files());
  EXPECT_EQ(1, FailedLogins());
}

TEST_P(UnderNobodysIds, TheReasonIsLogged) {
  MakeLink();
  const Lines cannot_open{
      "base_db:LINE ERROR: IF_RUN_AS(1, 1)", "base_db:LINE (PID) failed to run as system\n\n",
      "base_db:LINE (PID) db is not good.\n\n",
      "sharing_db:LINE (PID) Failed [!pdb_->Execute(\"PRAGMA user_version\", result)], "
      "err=ERRNO\n\n"};
  EXPECT_EQ(cannot_open, Login(Visit("unknown").As(ids())).log);
  Lines check = cannot_open;
  check.emplace_back("sharinglogin:LINE db is not good");
  // Each of the three stores tries to shorten the log when it ends.
  check.insert(check.end(), 3, "base_db:LINE (PID) db is not good.\n\n");
  EXPECT_EQ(check, Check(Visit("unknown").Session("unknown").As(ids())).log);
}

TEST_P(UnderNobodysIds, NoFileIsMade) {
  EXPECT_EQ(-4, Login(Visit("unknown").As(ids())).code);
  EXPECT_EQ(-4, Check(Visit("unknown").Session("unknown").As(ids())).code);
  EXPECT_EQ(0U, Files().size());
}

TEST_P(UnderNobodysIds, AFileOfRootsIsNotMoved) {
  MakeLink();
  ASSERT_EQ(0, chown(kDatabase, 0, 0));
  const Reply reply = Check(Visit("unknown").Session("unknown").As(ids()));
  EXPECT_EQ(-5, reply.code);
  EXPECT_EQ(1, std::count(reply.log.begin(), reply.log.end(),
                          "base_db:LINE Permssion denied. uid=" + std::to_string(ids().ruid)));
  EXPECT_EQ(1U, Files().count("sharing.db"));
}

INSTANTIATE_TEST_SUITE_P(All, UnderNobodysIds,
                         testing::Values(Starter{"Nobody", kNobody},
                                         Starter{"SystemUserOfAnotherGroup",
                                                 {1, 1, 1, 3001, 3001, 3001}}),
                         NameOf);

}  // namespace
}  // namespace tuvo_test
