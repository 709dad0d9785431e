#include "common/process_start.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <functional>
#include <vector>

#include "support/child.h"

namespace common {
namespace {

// What `look` returns in a process that was started with these descriptors closed.
int WithClosed(const std::vector<int>& closed, const std::function<int()>& look) {
  return tuvo_test::RunInChild([&] {
    for (const int fd : closed) {
      close(fd);
    }
    return StartProcess() ? look() : 100;
  });
}

TEST(CommonProcessStart, NextFileIsNoStandardDescriptor) {
  for (const std::vector<int>& closed :
       std::vector<std::vector<int>>{{0}, {1}, {2}, {0, 1}, {1, 2}, {0, 2}, {0, 1, 2}}) {
    EXPECT_EQ(WithClosed(closed, [] { return open("/dev/null", O_RDWR) > STDERR_FILENO ? 0 : 1; }),
              0);
  }
}

TEST(CommonProcessStart, WhatIsFilledInIsOfNoUse) {
  EXPECT_EQ(WithClosed({0, 1, 2},
                       [] {
                         char byte = 0;
                         return (read(STDIN_FILENO, &byte, 1) < 0 ? 0 : 1) +
                                (write(STDOUT_FILENO, "x", 1) < 0 ? 0 : 2) +
                                (write(STDERR_FILENO, "x", 1) < 0 ? 0 : 4);
                       }),
            0);
}

TEST(CommonProcessStart, OpenOnesStay) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const int file = open("/tmp/output", O_RDWR | O_CREAT, 0600);
              dup2(file, STDOUT_FILENO);
              close(STDIN_FILENO);
              if (!StartProcess() || write(STDOUT_FILENO, "x", 1) != 1) {
                return 1;
              }
              return lseek(file, 0, SEEK_END) == 1 ? 0 : 2;
            }),
            0);
  unlink("/tmp/output");
}

TEST(CommonProcessStart, WithoutAnythingToFillInIsFalse) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              close(STDIN_FILENO);
              return chroot("/tmp") != 0 ? 1 : StartProcess() ? 2 : 0;
            }),
            0);
}

TEST(CommonProcessStart, ChildrenCanBeWaitedFor) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              (void)std::signal(SIGCHLD, SIG_IGN);
              if (!StartProcess()) {
                return 1;
              }
              const pid_t child = fork();
              if (child == 0) {
                _exit(7);
              }
              int status = 0;
              return waitpid(child, &status, 0) == child && WEXITSTATUS(status) == 7 ? 0 : 2;
            }),
            0);
}

}  // namespace
}  // namespace common
