// The administrator's command is killed at every call by which it changes files or locks, while it
// copies the database or takes links in.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "concurrency/crew.h"
#include "concurrency/visitors.h"
#include "crash/kill_sweep.h"
#include "crash/stored.h"
#include "db/sqlite_file.h"
#include "db/test_files.h"

namespace tuvo_test {
namespace {

namespace fs = std::filesystem;
using TUVO::sharing::record::Entry;

constexpr int kLinks = 8;
constexpr char kPlace[] = "/tmp/crash";
constexpr char kBackup[] = "/tmp/crash/backup.db";
constexpr char kExport[] = "/tmp/crash/links.json";

constexpr long kNeverKilled = 1000000000;

// Runs the command; its status, 256 + SIGKILL when it died.
int RunCommand(std::vector<const char*> arguments, long number = kNeverKilled,
               Death death = Death::kBeforeACall) {
  return Wait(Start(kRoot, [&] {
    arguments.insert(arguments.begin(), "tuvosharing");
    arguments.push_back(nullptr);
    setenv("TUVO_KILL_AT", std::to_string(number).c_str(), 1);
    if (death == Death::kWithinAWrite) {
      setenv("TUVO_KILL_WITHIN_A_WRITE", "1", 1);
    }
    if (std::freopen("/dev/null", "w", stdout) == nullptr) {
      return 126;
    }
    execv(TUVO_KILLED_CLI, const_cast<char* const*>(arguments.data()));
    return 127;
  }));
}

class CliKills : public testing::Test {
 protected:
  CliKills() {
    fs::remove_all(kPlace);
    fs::create_directory(kPlace);
    for (const auto& file : fs::directory_iterator(kSharingFolder)) {
      fs::remove_all(file.path());
    }
    for (int i = 0; i < kLinks; ++i) {
      StoreLink([&](Entry& link) { SetGeneration(link, i); });
    }
    contents_ = Contents(kSharingFile);
  }

  // What a killed one leaves lies about under other names, and is nobody else's to read.
  static void RemoveLeftovers() {
    std::vector<fs::path> leftovers;
    for (const char* folder : {kPlace, kSharingFolder}) {
      for (const auto& file : fs::directory_iterator(folder)) {
        const std::string name = file.path().filename();
        if (name.rfind("backup.", 0) == 0 && name != "backup.db") {
          leftovers.push_back(file.path());
        }
      }
    }
    for (const fs::path& path : leftovers) {
      EXPECT_EQ(0U, static_cast<unsigned int>(fs::status(path).permissions()) & 077U) << path;
      fs::remove_all(path);
    }
  }

  void ExpectUnchanged() const {
    ExpectGood(kSharingFile);
    EXPECT_EQ(contents_, Contents(kSharingFile));
  }

  void ExpectWholeBackup() const {
    SqliteFile file(kBackup);
    EXPECT_EQ("ok", file.Value("PRAGMA integrity_check"));
    EXPECT_EQ("2", file.Value("PRAGMA user_version"));
    EXPECT_EQ(contents_, Contents(kBackup));
  }

  std::string contents_;
};

TEST_F(CliKills, ABackupIsThereAsAWholeOrNotAtAll) {
  SweepDeaths("backup", [&](long number, Death death) {
    NewPath(kBackup);
    const int status = RunCommand({"backup", kBackup}, number, death);
    EXPECT_TRUE(status != 0 || Exists(kBackup));
    if (Exists(kBackup)) {
      ExpectWholeBackup();
    }
    RemoveLeftovers();
    ExpectUnchanged();
    return status;
  });
}

TEST_F(CliKills, AReplacedBackupIsTheFormerOrTheNewOne) {
  const std::string former = "the former one";
  SweepDeaths("backup --force", [&](long number, Death death) {
    WriteFile(NewPath(kBackup), former);
    const int status = RunCommand({"backup", "--force", kBackup}, number, death);
    const bool kept = ReadFile(kBackup) == former;
    EXPECT_TRUE(status != 0 || !kept);
    if (!kept) {
      ExpectWholeBackup();
    }
    RemoveLeftovers();
    ExpectUnchanged();
    return status;
  });
}

TEST_F(CliKills, AnImportTakesAllLinksInOrNone) {
  ASSERT_EQ(0, RunCommand({"export", kExport}));
  const auto remove = [] { SqliteFile(kSharingFile).Execute("DELETE FROM entry"); };
  SweepDeaths("import", [&](long number, Death death) {
    remove();
    const int status = RunCommand({"import", kExport}, number, death);
    ExpectGood(kSharingFile);
    const std::vector<Entry> links = StoredLinks(kSharingFile);
    EXPECT_TRUE(links.size() == kLinks || (status != 0 && links.empty())) << links.size();
    for (const Entry& link : links) {
      EXPECT_LE(0, GenerationOf(link));
    }
    return status;
  });
}

// Killed ones are in nobody's way.
TEST_F(CliKills, ABackupAndAnImportSucceedBesideWhatKilledOnesLeft) {
  ASSERT_EQ(0, RunCommand({"export", kExport}));
  for (long number = 5; number < 60; number += 10) {
    RunCommand({"backup", "--force", kBackup}, number);
    RunCommand({"import", "--on-conflict", "replace", kExport}, number);
  }
  EXPECT_EQ(0, RunCommand({"import", "--on-conflict", "replace", kExport}));
  EXPECT_EQ(0, RunCommand({"backup", "--force", kBackup}));
  contents_ = Contents(kSharingFile);
  ExpectWholeBackup();
  ExpectUnchanged();
}

}  // namespace
}  // namespace tuvo_test
