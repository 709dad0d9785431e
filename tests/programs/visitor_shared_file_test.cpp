#include "visitor/shared_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>

#include "support/child.h"

namespace visitor {
namespace {

constexpr const char* kPath = "/tmp/shared-file.txt";

class VisitorSharedFile : public testing::Test {
 protected:
  void SetUp() override {
    unlink(kPath);
    std::ofstream(kPath) << "hello";
    ASSERT_EQ(chmod(kPath, 0644), 0);
  }
};

OpenResult Open(const std::string& path) {
  SharedFile file;
  return OpenShared(path, &file);
}

TEST_F(VisitorSharedFile, RegularFileIsOpenedAndDescribed) {
  SharedFile file;
  ASSERT_EQ(OpenShared(kPath, &file), OpenResult::kOpened);
  EXPECT_EQ(file.name, "shared-file.txt");
  EXPECT_EQ(file.size, 5);
  struct stat st {};
  ASSERT_EQ(stat(kPath, &st), 0);
  EXPECT_EQ(file.validators.modified, st.st_mtime);
  EXPECT_EQ(file.validators.etag.front(), '"');
  EXPECT_EQ(file.validators.etag.back(), '"');
  EXPECT_EQ(fcntl(file.fd.get(), F_GETFD), FD_CLOEXEC);
  char text[5];
  EXPECT_EQ(read(file.fd.get(), text, sizeof text), 5);
}

TEST_F(VisitorSharedFile, TagChangesWithTheContentsAlthoughTimeAndSizeAreSetBack) {
  SharedFile before;
  ASSERT_EQ(OpenShared(kPath, &before), OpenResult::kOpened);
  struct stat st {};
  ASSERT_EQ(stat(kPath, &st), 0);
  usleep(20000);  // more than a step of the file system's clock
  std::ofstream(kPath) << "HELLO";
  const struct timespec times[] = {st.st_atim, st.st_mtim};
  ASSERT_EQ(utimensat(AT_FDCWD, kPath, times, 0), 0);
  SharedFile after;
  ASSERT_EQ(OpenShared(kPath, &after), OpenResult::kOpened);
  EXPECT_NE(before.validators.etag, after.validators.etag);
}

TEST_F(VisitorSharedFile, OnlyRegularFilesAreFiles) {
  unlink("/tmp/shared-pipe");
  unlink("/tmp/shared-link");
  ASSERT_EQ(mkfifo("/tmp/shared-pipe", 0666), 0);
  ASSERT_EQ(symlink(kPath, "/tmp/shared-link"), 0);
  for (const char* path : {"/tmp/shared-pipe", "/tmp/shared-link", "/tmp", "/dev/null",
                           "/tmp/no-such-file", "/tmp/shared-file.txt/x"}) {
    EXPECT_EQ(Open(path), OpenResult::kGone) << path;
  }
}

TEST_F(VisitorSharedFile, FolderThatHasBecomeASymbolicLinkLeadsNowhere) {
  std::filesystem::create_directories("/tmp/shared-real");
  std::filesystem::remove("/tmp/shared-folder");
  std::filesystem::create_directory_symlink("/tmp/shared-real", "/tmp/shared-folder");
  std::ofstream("/tmp/shared-real/file") << "x";
  EXPECT_EQ(Open("/tmp/shared-real/file"), OpenResult::kOpened);
  EXPECT_EQ(Open("/tmp/shared-folder/file"), OpenResult::kGone);
}

TEST_F(VisitorSharedFile, DotsInAPathGoByItsText) {
  EXPECT_EQ(Open("/tmp/../tmp/./shared-file.txt"), OpenResult::kOpened);
}

TEST_F(VisitorSharedFile, PathMustBeAbsoluteAndWhole) {
  EXPECT_EQ(Open(""), OpenResult::kNotReadable);
  EXPECT_EQ(Open("shared-file.txt"), OpenResult::kNotReadable);
  EXPECT_EQ(Open(std::string(kPath) + std::string("\0.png", 5)), OpenResult::kNotReadable);
}

TEST_F(VisitorSharedFile, FileOfSomebodyElseIsNotReadable) {
  ASSERT_EQ(chmod(kPath, 0600), 0);
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kNobody,
                                    [] { return Open(kPath) == OpenResult::kNotReadable ? 0 : 1; }),
            0);
}

TEST_F(VisitorSharedFile, SystemsOwnFilesAreClosedToEverybody) {
  ASSERT_EQ(chown(kPath, 1, 1), 0);
  ASSERT_EQ(chmod(kPath, 0660), 0);
  EXPECT_EQ(Open(kPath), OpenResult::kNotReadable);
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kSystem,
                                    [] { return Open(kPath) == OpenResult::kNotReadable ? 0 : 1; }),
            0);
  ASSERT_EQ(chmod(kPath, 0644), 0);
  EXPECT_EQ(Open(kPath), OpenResult::kOpened);
}

}  // namespace
}  // namespace visitor
