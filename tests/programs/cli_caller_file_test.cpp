#include "cli/caller_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>
#include <fstream>
#include <string>

#include "cli/failure.h"
#include "cli/interrupt.h"
#include "common/privileges.h"
#include "common/stream.h"
#include "support/child.h"

namespace cli {
namespace {

namespace fs = std::filesystem;

class CliCallerFile : public testing::Test {
 protected:
  CliCallerFile() {
    fs::remove_all(kFolder);
    fs::create_directory(kFolder);
    fs::permissions(kFolder, fs::perms::owner_all);
  }

  static std::string Content(const std::string& path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
  }
  static std::size_t Files() {
    return static_cast<std::size_t>(
        std::distance(fs::directory_iterator(kFolder), fs::directory_iterator()));
  }

  static constexpr const char* kFolder = "/tmp/callers";
  const std::string path_ = std::string(kFolder) + "/file";
};

TEST_F(CliCallerFile, NewFileAppearsWhenItIsKept) {
  {
    NewFile file(path_, false);
    ASSERT_TRUE(common::WriteAll(file.fd(), "content"));
    EXPECT_FALSE(fs::exists(path_));
    file.Keep();
  }
  EXPECT_EQ(Content(path_), "content");
  EXPECT_EQ(Files(), 1U);
  struct stat st {};
  ASSERT_EQ(stat(path_.c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 07777U, 0600U);
}

TEST_F(CliCallerFile, FileThatIsNotKeptLeavesNothing) {
  {
    const NewFile file(path_, false);
    EXPECT_EQ(Files(), 1U);
  }
  EXPECT_EQ(Files(), 0U);
}

TEST_F(CliCallerFile, FileThatIsThereStays) {
  std::ofstream(path_) << "old";
  EXPECT_THROW(NewFile(path_, false), Failure);
  EXPECT_EQ(Content(path_), "old");
  EXPECT_EQ(Files(), 1U);
}

TEST_F(CliCallerFile, FileThatAppearsMeanwhileStays) {
  {
    NewFile file(path_, false);
    std::ofstream(path_) << "theirs";
    EXPECT_THROW(file.Keep(), Failure);
  }
  EXPECT_EQ(Content(path_), "theirs");
  EXPECT_EQ(Files(), 1U);
}

TEST_F(CliCallerFile, FileIsReplacedWhenTold) {
  std::ofstream(path_) << "old";
  NewFile file(path_, true);
  ASSERT_TRUE(common::WriteAll(file.fd(), "new"));
  EXPECT_EQ(Content(path_), "old");
  file.Keep();
  EXPECT_EQ(Content(path_), "new");
}

TEST_F(CliCallerFile, NothingButFilesIsReplaced) {
  EXPECT_THROW(NewFile(kFolder, true), Failure);
  fs::create_symlink("/tmp/callers/elsewhere", path_);
  EXPECT_THROW(NewFile(path_, true), Failure);
  EXPECT_THROW(NewFile(path_, false), Failure);
  EXPECT_FALSE(fs::exists("/tmp/callers/elsewhere"));
}

TEST_F(CliCallerFile, DatabaseInUseIsNotReplaced) {
  ASSERT_TRUE(TUVO::sharing::db::SharingDB::Instance().IsGood());
  const std::string database = TUVO::sharing::SZF_SHARING_DB_PATH;
  for (const bool replace : {false, true}) {
    for (const char* name : {"", "-wal", ".copy"}) {
      try {
        const NewFile file(database + name, replace);
        FAIL() << name;
      } catch (const Failure& failure) {
        EXPECT_EQ(failure.status(), ExitStatus::kUsage);
      }
    }
  }
}

TEST_F(CliCallerFile, SignalEndsTheWaitingForAPipesOtherEnd) {
  ASSERT_EQ(mkfifo(path_.c_str(), 0600), 0);
  const int status = tuvo_test::RunInChild([this] {
    NoteSignals();
    const pid_t parent = getpid();
    const pid_t child = fork();
    if (child == 0) {
      usleep(200000);
      (void)kill(parent, SIGTERM);
      _exit(0);
    }
    EXPECT_THROW(OpenCallersFile(path_), Interruption);
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST_F(CliCallerFile, FileIsReadUpToTheMost) {
  std::ofstream(path_) << "12345";
  EXPECT_EQ(ReadCallersFile(path_, 5), "12345");
  EXPECT_THROW(ReadCallersFile(path_, 4), Failure);
  EXPECT_THROW(ReadCallersFile(path_ + "none", 4), Failure);
}

// The folder is root's alone: as the system account neither would go.
TEST_F(CliCallerFile, RootsFilesAreRootsWhileTheProgramIsTheSystemAccount) {
  std::ofstream(path_) << "secret";
  const int status = tuvo_test::RunInChild([this] {
    if (!common::DropPrivileges() || geteuid() != 1) {
      return 1;
    }
    EXPECT_FALSE(std::ifstream(path_).is_open());
    EXPECT_EQ(ReadCallersFile(path_, 100), "secret");
    NewFile file(path_ + "2", false);
    file.Keep();
    { const NewFile other(path_ + "3", false); }
    EXPECT_EQ(geteuid(), 1U);
    EXPECT_EQ(getegid(), 1U);
    return 0;
  });
  EXPECT_EQ(status, 0);
  EXPECT_EQ(Files(), 2U);
  struct stat st {};
  ASSERT_EQ(stat((path_ + "2").c_str(), &st), 0);
  EXPECT_EQ(st.st_uid, 0U);
}

}  // namespace
}  // namespace cli
