#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <tuvoplatform/file.h>
#include <unistd.h>

#include <cerrno>
#include <cstdarg>
#include <filesystem>
#include <fstream>
#include <string>

#include "platform/temp_folder.h"
#include "support/child.h"

namespace {

// How many of the next opens that create a file a signal interrupts, and how many were made.
int interruptions = 0;
int creations = 0;
int creation_flags = 0;

}  // namespace

// Stands in front of the C library's for this program and the library that it tests.
extern "C" __attribute__((visibility("default"))) int open(const char* path, int flags, ...) {
  mode_t mode = 0;
  if ((flags & O_CREAT) != 0) {
    va_list arguments;
    va_start(arguments, flags);
    mode = va_arg(arguments, mode_t);
    va_end(arguments);
    ++creations;
    creation_flags = flags;
    if (interruptions > 0) {
      --interruptions;
      errno = EINTR;
      return -1;
    }
  }
  return static_cast<int>(syscall(SYS_openat, AT_FDCWD, path, flags, mode));
}

namespace {

using tuvo_test::RunInChild;
using tuvo_test::RunInChildAs;
using tuvo_test::TempFolder;

class File : public ::testing::Test {
 protected:
  File() { interruptions = 0; }

  mode_t Mode(const std::string& path) {
    struct stat st {};
    return stat(path.c_str(), &st) == 0 ? st.st_mode & 07777 : 0;
  }

  TempFolder folder_;
  const std::string path_ = folder_ / "file";
};

// TLIBCFileExist

TEST_F(File, ExistsForAnythingAtThePath) {
  EXPECT_EQ(0, TLIBCFileExist(path_.c_str()));
  std::ofstream(path_) << "x";
  EXPECT_EQ(1, TLIBCFileExist(path_.c_str()));
  EXPECT_EQ(1, TLIBCFileExist(folder_.path().c_str()));
  EXPECT_EQ(1, TLIBCFileExist("/dev/null"));
}

TEST_F(File, ExistsFollowsSymbolicLinks) {
  const std::string link = folder_ / "link";
  ASSERT_EQ(0, symlink(path_.c_str(), link.c_str()));
  EXPECT_EQ(0, TLIBCFileExist(link.c_str()));
  std::ofstream(path_) << "x";
  EXPECT_EQ(1, TLIBCFileExist(link.c_str()));
}

TEST_F(File, ExistsIsNoWhereTheCallerMayNotLook) {
  std::ofstream(path_) << "x";
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0700));
  EXPECT_EQ(0, RunInChildAs(tuvo_test::kNobody, [&] { return TLIBCFileExist(path_.c_str()); }));
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0711));
  EXPECT_EQ(1, RunInChildAs(tuvo_test::kNobody, [&] { return TLIBCFileExist(path_.c_str()); }));
}

TEST_F(File, ExistsIsNoForNull) {
  EXPECT_EQ(0, TLIBCFileExist(nullptr));
}

// TLIBCFileTouch

TEST_F(File, TouchCreatesAnEmptyFileForItsOwnerAlone) {
  for (const mode_t mask : {0000, 0022, 0077}) {
    const mode_t before = umask(mask);
    const std::string path = folder_ / ("file" + std::to_string(mask));
    EXPECT_EQ(0, TLIBCFileTouch(path.c_str()));
    umask(before);
    EXPECT_EQ(0600U, Mode(path));
    EXPECT_EQ(0U, std::filesystem::file_size(path));
  }
}

TEST_F(File, TouchedFileBelongsToTheEffectiveIdentity) {
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0777));
  EXPECT_EQ(0, RunInChildAs({0, 1, 0, 0, 1, 0}, [&] { return TLIBCFileTouch(path_.c_str()); }));
  struct stat st {};
  ASSERT_EQ(0, stat(path_.c_str(), &st));
  EXPECT_EQ(1U, st.st_uid);
  EXPECT_EQ(1U, st.st_gid);
}

TEST_F(File, TouchLeavesAnExistingFileAsItIs) {
  std::ofstream(path_) << "content";
  ASSERT_EQ(0, chmod(path_.c_str(), 0444));
  const timespec times[2] = {{1000, 0}, {2000, 0}};
  ASSERT_EQ(0, utimensat(AT_FDCWD, path_.c_str(), times, 0));
  EXPECT_EQ(0, TLIBCFileTouch(path_.c_str()));
  struct stat st {};
  ASSERT_EQ(0, stat(path_.c_str(), &st));
  EXPECT_EQ(0444U, st.st_mode & 07777);
  EXPECT_EQ(2000, st.st_mtime);
  EXPECT_EQ(7, st.st_size);
}

TEST_F(File, TouchAcceptsAnExistingFileThatTheCallerMayNotOpen) {
  std::ofstream(path_) << "x";
  ASSERT_EQ(0, chmod(path_.c_str(), 0000));
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0755));
  EXPECT_EQ(0, RunInChildAs(tuvo_test::kNobody, [&] { return TLIBCFileTouch(path_.c_str()); }));
}

TEST_F(File, TouchDropsNoLockThatThisProcessHolds) {
  std::ofstream(path_) << "x";
  const int fd = open(path_.c_str(), O_RDWR | O_CLOEXEC);
  struct flock lock {};
  lock.l_type = F_WRLCK;
  ASSERT_EQ(0, fcntl(fd, F_SETLK, &lock));
  EXPECT_EQ(0, TLIBCFileTouch(path_.c_str()));
  EXPECT_EQ(1, RunInChild([&] {
              struct flock other {};
              other.l_type = F_WRLCK;
              const int own = open(path_.c_str(), O_RDWR | O_CLOEXEC);
              return fcntl(own, F_GETLK, &other) == 0 && other.l_type == F_WRLCK ? 1 : 0;
            }));
  close(fd);
}

TEST_F(File, TouchFailsWithTheReason) {
  errno = 0;
  EXPECT_EQ(-1, TLIBCFileTouch((folder_ / "no/such/file").c_str()));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(-1, TLIBCFileTouch(folder_.path().c_str()));
  EXPECT_EQ(EISDIR, errno);
  EXPECT_EQ(-1, TLIBCFileTouch(nullptr));
  EXPECT_EQ(EINVAL, errno);
  EXPECT_EQ(EACCES, RunInChildAs(tuvo_test::kNobody,
                                 [&] { return TLIBCFileTouch(path_.c_str()) == -1 ? errno : 0; }));
}

TEST_F(File, TouchDoesNotFollowALinkThatLeadsNowhere) {
  const std::string link = folder_ / "link";
  ASSERT_EQ(0, symlink(path_.c_str(), link.c_str()));
  EXPECT_EQ(-1, TLIBCFileTouch(link.c_str()));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_FALSE(std::filesystem::exists(path_));
}

TEST_F(File, TouchIsTriedAgainAfterAnInterruption) {
  interruptions = 3;
  creations = 0;
  EXPECT_EQ(0, TLIBCFileTouch(path_.c_str()));
  EXPECT_EQ(4, creations);
  EXPECT_TRUE(std::filesystem::exists(path_));
}

TEST_F(File, TouchKeepsItsDescriptorToItself) {
  creation_flags = 0;
  EXPECT_EQ(0, TLIBCFileTouch(path_.c_str()));
  EXPECT_NE(0, creation_flags & O_CLOEXEC);
  const int next = open(path_.c_str(), O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(0, TLIBCFileTouch((folder_ / "other").c_str()));
  const int after = open(path_.c_str(), O_RDONLY | O_CLOEXEC);
  EXPECT_EQ(next + 1, after);  // nothing was left open in between
  close(next);
  close(after);
}

// TLIBCFileStat

TEST_F(File, StatTellsOwnerModeSizeAndTimes) {
  std::ofstream(path_) << "12345";
  ASSERT_EQ(0, chmod(path_.c_str(), 0640));
  ASSERT_EQ(0, chown(path_.c_str(), 1, 2));
  const timespec times[2] = {{1000, 0}, {2000, 0}};
  ASSERT_EQ(0, utimensat(AT_FDCWD, path_.c_str(), times, 0));
  for (const int kind : {1, 0, -1, 7}) {
    struct stat st {};
    EXPECT_EQ(0, TLIBCFileStat(path_.c_str(), kind, &st));
    EXPECT_EQ(1U, st.st_uid);
    EXPECT_EQ(2U, st.st_gid);
    EXPECT_EQ(0640U, st.st_mode & 07777);
    EXPECT_EQ(5, st.st_size);
    EXPECT_EQ(1000, st.st_atime);
    EXPECT_EQ(2000, st.st_mtime);
  }
}

TEST_F(File, StatFailsWithTheReason) {
  struct stat st {};
  EXPECT_EQ(-1, TLIBCFileStat(path_.c_str(), 1, &st));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(-1, TLIBCFileStat(nullptr, 1, &st));
  EXPECT_EQ(EINVAL, errno);
  EXPECT_EQ(-1, TLIBCFileStat("/dev/null", 1, nullptr));
  EXPECT_EQ(EINVAL, errno);
}

// TUVOFSAclChmod

TEST_F(File, ChmodSetsThePermissionBits) {
  std::ofstream(path_) << "x";
  EXPECT_EQ(0, TUVOFSAclChmod(path_.c_str(), -1, 0660));
  EXPECT_EQ(0660U, Mode(path_));
  EXPECT_EQ(0, TUVOFSAclChmod(path_.c_str(), 3, 0400));
  EXPECT_EQ(0400U, Mode(path_));
}

TEST_F(File, ChmodFailsWithTheReason) {
  EXPECT_EQ(-1, TUVOFSAclChmod(path_.c_str(), -1, 0660));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(-1, TUVOFSAclChmod(nullptr, -1, 0660));
  EXPECT_EQ(EINVAL, errno);
  std::ofstream(path_) << "x";
  ASSERT_EQ(0, chmod(folder_.path().c_str(), 0755));
  EXPECT_EQ(EPERM, RunInChildAs(tuvo_test::kNobody, [&] {
              return TUVOFSAclChmod(path_.c_str(), -1, 0666) == -1 ? errno : 0;
            }));
}

}  // namespace
