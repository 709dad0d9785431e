// Programs that meet a new or old file at the same moment all find it good.
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <tuvosharing/session.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <ctime>
#include <functional>
#include <string>

#include "sqlite_file.h"

namespace {

using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;
using tuvo_test::SchemaScript;
using tuvo_test::SqliteFile;

constexpr int kProcesses = 12;
constexpr int kRounds = 20;

// Opens the file and stores one session in it: 0 when both went well.
int OpenAndStore(const std::string& path) {
  SharingDB db(path);
  if (!db.IsGood()) {
    return 1;
  }
  Session session;
  session.set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
  return SessionDB(db).CreateWithSessionId(session) ? 0 : 2;
}

// Runs `body` in so many processes, all let go at once; the number of those that returned 0.
int Together(int processes, const std::function<int()>& body) {
  std::array<int, 2> gate{};
  if (pipe(gate.data()) != 0) {
    throw std::runtime_error("pipe");
  }
  for (int i = 0; i < processes; ++i) {
    const pid_t pid = fork();
    if (pid == 0) {
      close(gate[1]);
      char byte = 0;
      while (read(gate[0], &byte, 1) < 0 && errno == EINTR) {
      }
      _exit(body());
    }
  }
  close(gate[0]);
  close(gate[1]);  // the last writer: every reader sees the end now
  int good = 0;
  for (int i = 0; i < processes; ++i) {
    int status = 0;
    if (wait(&status) > 0 && status == 0) {
      ++good;
    }
  }
  return good;
}

std::string Objects(SqliteFile& db) {
  std::string all;
  for (const auto& row : db.Rows("SELECT name, sql FROM sqlite_schema ORDER BY name")) {
    all += row[0] + "|" + row[1] + "\n";
  }
  return all;
}

std::string WantedObjects() {
  SqliteFile db(":memory:");
  db.Execute(SchemaScript(1));
  db.Execute(SchemaScript(2));
  return Objects(db);
}

// A file name that no round before has used, so that no round finds another's log beside it.
std::string NewPath(const std::string& name, int round) {
  return "/tmp/" + name + std::to_string(round) + ".db";
}

void ExpectGood(const std::string& path, int sessions) {
  SqliteFile db(path);
  EXPECT_EQ(db.Value("PRAGMA user_version"), "2");
  EXPECT_EQ(db.Value("PRAGMA integrity_check"), "ok");
  EXPECT_EQ(db.Value("PRAGMA journal_mode"), "wal");
  EXPECT_EQ(Objects(db), WantedObjects());
  EXPECT_EQ(db.Value("SELECT COUNT(*) FROM session"), std::to_string(sessions));
}

TEST(SchemaProcesses, AllThatOpenANewFileTogetherFindItGood) {
  for (int round = 0; round < kRounds; ++round) {
    const std::string path = NewPath("new", round);
    ASSERT_EQ(Together(kProcesses, [&] { return OpenAndStore(path); }), kProcesses)
        << "round " << round;
    ExpectGood(path, kProcesses);
  }
}

TEST(SchemaProcesses, AllThatOpenAFileOfVersionOneTogetherFindItGood) {
  for (int round = 0; round < kRounds; ++round) {
    const std::string path = NewPath("old", round);
    {
      SqliteFile old(path);
      old.Execute(SchemaScript(1));
      ASSERT_EQ(chown(path.c_str(), 1, 1), 0);
    }
    ASSERT_EQ(Together(kProcesses, [&] { return OpenAndStore(path); }), kProcesses)
        << "round " << round;
    ExpectGood(path, kProcesses);
  }
}

}  // namespace
