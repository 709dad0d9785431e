#include "cli/check_files.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <string>

namespace cli {
namespace {

namespace fs = std::filesystem;

class CliCheckFiles : public testing::Test {
 protected:
  CliCheckFiles() {
    fs::remove_all("/tmp/private");
    fs::create_directories("/tmp/private/session");
    std::ofstream(path_) << "x";
    Set("/tmp/private", 0, 0711);
    Set("/tmp/private/session", 1, 0711);
    Set(path_, 1, 0660);
  }

  static void Set(const std::string& path, uid_t owner, mode_t mode) {
    EXPECT_EQ(chown(path.c_str(), owner, owner), 0);
    EXPECT_EQ(chmod(path.c_str(), mode), 0);
  }

  // The findings as "path: reason" lines.
  std::string Found() {
    Findings findings;
    usable_ = CheckFiles(path_, &findings);
    std::string text;
    for (const Finding& finding : findings) {
      EXPECT_EQ(finding.kind, "file");
      text += finding.subject + ": " + finding.reason + "\n";
    }
    return text;
  }

  const std::string path_ = "/tmp/private/session/sharing.db";
  bool usable_ = false;
};

TEST_F(CliCheckFiles, WhatIsAsItShouldBeIsNotMentioned) {
  EXPECT_EQ(Found(), "");
  EXPECT_TRUE(usable_);
  Set(path_, 1, 0600);
  Set("/tmp/private", 1, 0700);
  EXPECT_EQ(Found(), "");
}

TEST_F(CliCheckFiles, AnotherOwnerIsFound) {
  Set(path_, 0, 0660);
  EXPECT_EQ(Found(), path_ + ": belongs to 0:0, not to 1:1\n");
  EXPECT_TRUE(usable_);
}

TEST_F(CliCheckFiles, ModesThatLetOthersInAreFound) {
  Set(path_, 1, 0664);
  EXPECT_EQ(Found(), path_ + ": has the mode 0664, not 0660\n");
}

TEST_F(CliCheckFiles, CompanionsAreLookedAt) {
  std::ofstream(path_ + "-wal") << "x";
  std::ofstream(path_ + "-shm") << "x";
  Set(path_ + "-wal", 0, 0660);
  Set(path_ + "-shm", 1, 0644);
  EXPECT_EQ(Found(), path_ + "-wal: belongs to 0:0, not to 1:1\n" + path_ +
                         "-shm: has the mode 0644, not 0660\n");
}

TEST_F(CliCheckFiles, FoldersThatOthersMayWriteToAreFound) {
  Set("/tmp/private", 0, 0777);
  EXPECT_EQ(Found(), "/tmp/private: has the mode 0777: others may write\n");
  Set("/tmp/private", 5, 0700);
  EXPECT_EQ(Found(), "/tmp/private: belongs to 5, not to the system account\n");
  Set("/tmp/private", 0, 0711);
  Set("/tmp/private/session", 0, 0711);
  EXPECT_EQ(Found(), "/tmp/private/session: belongs to 0, not to the system account\n");
}

TEST_F(CliCheckFiles, MissingFileIsFoundAndNotUsable) {
  fs::remove(path_);
  EXPECT_EQ(Found(), path_ + ": No such file or directory\n");
  EXPECT_FALSE(usable_);
}

TEST_F(CliCheckFiles, WhatIsNoFileIsNotUsable) {
  fs::remove(path_);
  fs::create_symlink("/tmp/private/elsewhere", path_);
  EXPECT_EQ(Found(), path_ + ": is no regular file\n");
  EXPECT_FALSE(usable_);
}

}  // namespace
}  // namespace cli
