#include "owner/shareable_file.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>

#include "support/child.h"
#include "support/syslog_listener.h"

namespace owner {
namespace {

namespace fs = std::filesystem;

const Account kAlice{2001, "alice", false};
const Account kBob{2002, "bob", false};

// /tmp/share is the one folder that may be shared from.
class OwnerShareableFile : public testing::Test {
 protected:
  void SetUp() override {
    fs::create_directories("/tmp/share/sub");
    fs::create_directories("/tmp/outside");
    Make("/tmp/share/alices", 2001, 0600);
    Make("/tmp/share/open", 0, 0644);
    Make("/tmp/share/sub/friends", 0, 0640, 3001);
    Make("/tmp/outside/open", 0, 0644);
  }
  void TearDown() override {
    fs::remove_all("/tmp/share");
    fs::remove_all("/tmp/outside");
  }

  static void Make(const std::string& path, uid_t uid, mode_t mode, gid_t gid = 0) {
    std::ofstream(path) << "x";
    ASSERT_EQ(chown(path.c_str(), uid, gid), 0);
    ASSERT_EQ(chmod(path.c_str(), mode), 0);
  }

  FileAnswer Check(const std::string& path, const Account& owner = kAlice) {
    resolved_.clear();
    return CheckShareable(path, owner, folders_, &resolved_);
  }

  std::vector<std::string> folders_ = {"/tmp/share"};
  std::string resolved_;
};

TEST_F(OwnerShareableFile, OwnersOwnFileMay) {
  EXPECT_EQ(Check("/tmp/share/alices"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/alices");
}

TEST_F(OwnerShareableFile, SomebodyElsesPrivateFileMayNot) {
  EXPECT_EQ(Check("/tmp/share/alices", kBob), FileAnswer::kNotReadable);
  EXPECT_EQ(resolved_, "");
}

TEST_F(OwnerShareableFile, FileOfAGroupOfTheOwnerMay) {
  EXPECT_EQ(Check("/tmp/share/sub/friends"), FileAnswer::kMay);
  EXPECT_EQ(Check("/tmp/share/sub/friends", kBob), FileAnswer::kNotReadable);
}

TEST_F(OwnerShareableFile, FileOutsideOfTheFoldersMayNot) {
  EXPECT_EQ(Check("/tmp/outside/open"), FileAnswer::kOutside);
  EXPECT_EQ(resolved_, "");
}

TEST_F(OwnerShareableFile, FolderThatBeginsAlikeIsOutside) {
  fs::create_directories("/tmp/share2");
  Make("/tmp/share2/open", 0, 0644);
  EXPECT_EQ(Check("/tmp/share2/open"), FileAnswer::kOutside);
  fs::remove_all("/tmp/share2");
}

TEST_F(OwnerShareableFile, DotsAreResolved) {
  EXPECT_EQ(Check("/tmp/share/sub/../open"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/open");
  EXPECT_EQ(Check("/tmp/share/../outside/open"), FileAnswer::kOutside);
}

TEST_F(OwnerShareableFile, LinkWithinTheFolderIsResolved) {
  fs::create_symlink("open", "/tmp/share/link");
  EXPECT_EQ(Check("/tmp/share/link"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/open");
}

TEST_F(OwnerShareableFile, LinkThatLeadsOutsideMayNot) {
  fs::create_symlink("/tmp/outside/open", "/tmp/share/link");
  EXPECT_EQ(Check("/tmp/share/link"), FileAnswer::kOutside);
  fs::create_directory_symlink("/tmp/outside", "/tmp/share/folder");
  EXPECT_EQ(Check("/tmp/share/folder/open"), FileAnswer::kOutside);
}

TEST_F(OwnerShareableFile, LinkFromOutsideIntoTheFolderMay) {
  fs::create_symlink("/tmp/share/open", "/tmp/outside/link");
  EXPECT_EQ(Check("/tmp/outside/link"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/open");
}

TEST_F(OwnerShareableFile, FolderMayBeALinkItself) {
  fs::create_directory_symlink("/tmp/share", "/tmp/outside/volume");
  folders_ = {"/tmp/outside/volume"};
  EXPECT_EQ(Check("/tmp/outside/volume/open"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/open");
}

TEST_F(OwnerShareableFile, WhatIsNoRegularFileMayNot) {
  ASSERT_EQ(mkfifo("/tmp/share/pipe", 0644), 0);
  EXPECT_EQ(Check("/tmp/share/pipe"), FileAnswer::kNotReadable);
  EXPECT_EQ(Check("/tmp/share/sub"), FileAnswer::kNotReadable);
  EXPECT_EQ(Check("/tmp/share"), FileAnswer::kNotReadable);
  folders_ = {"/dev"};
  EXPECT_EQ(Check("/dev/null"), FileAnswer::kNotReadable);
}

TEST_F(OwnerShareableFile, WhatIsNotThereMayNot) {
  EXPECT_EQ(Check("/tmp/share/missing"), FileAnswer::kNotReadable);
  fs::create_symlink("missing", "/tmp/share/dangling");
  EXPECT_EQ(Check("/tmp/share/dangling"), FileAnswer::kNotReadable);
}

TEST_F(OwnerShareableFile, FileInAFolderClosedToTheOwnerMayNot) {
  ASSERT_EQ(chmod("/tmp/share/sub", 0700), 0);
  EXPECT_EQ(Check("/tmp/share/sub/friends"), FileAnswer::kNotReadable);
}

TEST_F(OwnerShareableFile, PathsThatAreNotAbsoluteMayNot) {
  ASSERT_EQ(chdir("/tmp/share"), 0);
  EXPECT_EQ(Check("open"), FileAnswer::kNotReadable);
  EXPECT_EQ(Check(""), FileAnswer::kNotReadable);
  EXPECT_EQ(Check(std::string("/tmp/share/open\0x", 17)), FileAnswer::kNotReadable);
  ASSERT_EQ(chdir("/"), 0);
}

// A process of alice's that `prepare`s as root and then sleeps; /proc shows it to her.
pid_t SleepAsAlice(const std::function<bool()>& prepare) {
  std::array<int, 2> ready{};
  EXPECT_EQ(pipe(ready.data()), 0);
  const pid_t sleeper = fork();
  if (sleeper == 0) {
    if (!prepare() || setresgid(2001, 2001, 2001) != 0 || setresuid(2001, 2001, 2001) != 0 ||
        prctl(PR_SET_DUMPABLE, 1) != 0 || write(ready[1], "x", 1) != 1) {
      _exit(1);
    }
    pause();
    _exit(0);
  }
  char byte = 0;
  close(ready[1]);
  EXPECT_EQ(read(ready[0], &byte, 1), 1) << "not prepared";
  close(ready[0]);
  return sleeper;
}

void End(pid_t process) {
  kill(process, SIGKILL);
  waitpid(process, nullptr, 0);
}

// Everybody may have a namespace, in which the path of somebody else's file is one's own.
TEST_F(OwnerShareableFile, FileOfAnotherMountNamespaceMayNot) {
  fs::create_directories("/tmp/share/bobs");
  Make("/tmp/share/bobs/secret", 2002, 0600);
  const pid_t sleeper = SleepAsAlice([] {
    if (unshare(CLONE_NEWNS) != 0 ||
        mount("none", "/tmp/share/bobs", "tmpfs", 0, "mode=0755") != 0) {
      return false;
    }
    Make("/tmp/share/bobs/secret", 2001, 0600);
    return true;
  });
  const std::string root = "/proc/" + std::to_string(sleeper) + "/root";
  ASSERT_TRUE(fs::exists(root + "/tmp/share/bobs/secret"));
  EXPECT_EQ(Check(root + "/tmp/share/bobs/secret"), FileAnswer::kNotReadable);
  EXPECT_EQ(resolved_, "");
  End(sleeper);
}

TEST_F(OwnerShareableFile, FileNamedByWayOfProcIsResolved) {
  EXPECT_EQ(Check("/proc/self/root/tmp/share/alices"), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/alices");
}

// Its path is told with " (deleted)" behind it, and somebody else may have a file of that name.
TEST_F(OwnerShareableFile, DeletedFileThatIsStillOpenMayNot) {
  const pid_t sleeper = SleepAsAlice([] {
    Make("/tmp/share/gone", 2001, 0600);
    const int fd = open("/tmp/share/gone", O_RDONLY);
    return fd >= 0 && dup2(fd, 60) == 60 && unlink("/tmp/share/gone") == 0;
  });
  const std::string open_file = "/proc/" + std::to_string(sleeper) + "/fd/60";
  EXPECT_EQ(Check(open_file), FileAnswer::kNotReadable);
  Make("/tmp/share/gone (deleted)", 2002, 0600);
  EXPECT_EQ(Check(open_file), FileAnswer::kNotReadable);
  EXPECT_EQ(resolved_, "");
  End(sleeper);
}

TEST_F(OwnerShareableFile, WithoutFoldersNothingMay) {
  folders_.clear();
  EXPECT_EQ(Check("/tmp/share/open"), FileAnswer::kOutside);
  folders_ = {"/tmp/nosuchfolder"};
  EXPECT_EQ(Check("/tmp/share/open"), FileAnswer::kOutside);
}

TEST_F(OwnerShareableFile, NameMayHoldLineFeedsAndQuotes) {
  Make("/tmp/share/a\n'b\"", 2001, 0600);
  EXPECT_EQ(Check("/tmp/share/a\n'b\""), FileAnswer::kMay);
  EXPECT_EQ(resolved_, "/tmp/share/a\n'b\"");
}

TEST_F(OwnerShareableFile, SetUserIdRootCanLook) {
  EXPECT_EQ(tuvo_test::RunInChildAs(
                {33, 33, 0, 33, 33, 33},
                [this] {
                  return Check("/tmp/share/alices") == FileAnswer::kMay && geteuid() == 33 ? 0 : 1;
                }),
            0);
}

TEST_F(OwnerShareableFile, WhoCannotBecomeTheOwnerCannotTell) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(tuvo_test::RunInChildAs(
                tuvo_test::kSystem,
                [this] { return Check("/tmp/share/open") == FileAnswer::kCannotTell ? 0 : 1; }),
            0);
}

TEST_F(OwnerShareableFile, UnknownAccountCannotBeAskedAndIsLogged) {
  tuvo_test::SyslogListener log;
  errno = 0;
  EXPECT_EQ(Check("/tmp/share/open", Account{4711, "mallory", false}), FileAnswer::kCannotTell);
  const std::vector<std::string> lines = log.TakeTexts();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].rfind("shareable_file:", 0), 0U);
}

// A process of alice's that holds a lease on a file of hers, so that the look at it takes a while,
// and does `then` meanwhile.
pid_t Lease(const std::string& path, const std::function<void()>& then) {
  std::array<int, 2> ready{};
  EXPECT_EQ(pipe(ready.data()), 0);
  const pid_t holder = fork();
  if (holder == 0) {
    if (setresgid(2001, 2001, 2001) != 0 || setresuid(2001, 2001, 2001) != 0) {
      _exit(1);
    }
    (void)std::signal(SIGIO, SIG_IGN);
    const int fd = open(path.c_str(), O_RDWR);
    if (fcntl(fd, F_SETLEASE, F_WRLCK) != 0 || write(ready[1], "x", 1) != 1) {
      _exit(1);
    }
    then();
    pause();
    _exit(0);
  }
  char byte = 0;
  close(ready[1]);
  EXPECT_EQ(read(ready[0], &byte, 1), 1) << "no lease";
  close(ready[0]);
  return holder;
}

TEST_F(OwnerShareableFile, LeaseThatIsNotGivenBackIsNotWaitedForLong) {
  const pid_t holder = Lease("/tmp/share/alices", [] {});
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(Check("/tmp/share/alices"), FileAnswer::kNotReadable);
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(4));
  End(holder);
  EXPECT_EQ(Check("/tmp/share/alices"), FileAnswer::kMay);
}

// Stops the process of alice's that looks at her file: a child's child of `test`. Others that have
// its name are another run's.
void StopTheLook(pid_t test) {
  const auto parent_in = [](const std::string& text) {
    const size_t at = text.find("\nPPid:\t");
    return at == std::string::npos ? "" : text.substr(at + 7, text.find('\n', at + 1) - at - 7);
  };
  const auto status_of = [](const std::string& process) {
    std::ifstream status("/proc/" + process + "/status");
    return std::string(std::istreambuf_iterator<char>(status), std::istreambuf_iterator<char>());
  };
  for (;;) {
    for (const fs::directory_entry& entry : fs::directory_iterator("/proc")) {
      const std::string name = entry.path().filename();
      if (name.find_first_not_of("0123456789") != std::string::npos) {
        continue;
      }
      const std::string text = status_of(name);
      if (text.find("Uid:\t2001\t2001\t2001\t2001") != std::string::npos &&
          parent_in(status_of(parent_in(text))) == std::to_string(test)) {
        kill(std::stoi(name), SIGSTOP);
        return;
      }
    }
  }
}

// By a process that is not root, but can become it.
TEST_F(OwnerShareableFile, LookThatItsOwnerStopsIsEndedAndLogged) {
  tuvo_test::SyslogListener log;
  const pid_t holder = Lease("/tmp/share/alices", [test = getpid()] { StopTheLook(test); });
  EXPECT_EQ(tuvo_test::RunInChildAs(
                {33, 33, 0, 33, 33, 33},
                [this] {
                  const auto start = std::chrono::steady_clock::now();
                  const FileAnswer answer = Check("/tmp/share/alices");
                  const auto took = std::chrono::steady_clock::now() - start;
                  if (answer != FileAnswer::kCannotTell || took < std::chrono::seconds(4) ||
                      took > std::chrono::seconds(8)) {
                    return 1;
                  }
                  return waitpid(-1, nullptr, WNOHANG) == -1 && geteuid() == 33 ? 0 : 2;
                }),
            0);
  End(holder);
  const std::vector<std::string> lines = log.TakeTexts();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_NE(lines[0].find("timed out"), std::string::npos);
}

TEST_F(OwnerShareableFile, LeavesNoChildAndNoDescriptor) {
  const auto descriptors = [] {
    return std::distance(fs::directory_iterator("/proc/self/fd"), fs::directory_iterator());
  };
  const auto before = descriptors();
  for (int i = 0; i < 20; ++i) {
    Check("/tmp/share/open");
  }
  EXPECT_EQ(descriptors(), before);
  EXPECT_EQ(waitpid(-1, nullptr, WNOHANG), -1);
}

}  // namespace
}  // namespace owner
