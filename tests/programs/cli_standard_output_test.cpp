#include "cli/standard_output.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <fstream>
#include <iostream>
#include <iterator>
#include <string>

#include "cli/interrupt.h"
#include "support/child.h"

namespace cli {
namespace {

// Runs `body` with standard output led to `fd`.
int RunWithOutput(int fd, const std::function<int()>& body) {
  return tuvo_test::RunInChild([&] {
    dup2(fd, STDOUT_FILENO);
    return body();
  });
}

std::string Content(const std::string& path) {
  std::ifstream file(path);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

TEST(CliStandardOutput, EverythingThatIsPrintedComesOut) {
  const int file = open("/tmp/out", O_CREAT | O_TRUNC | O_WRONLY | O_CLOEXEC, 0600);
  std::string expected;
  for (int i = 0; i < 30000; ++i) {
    expected += std::to_string(i) + "\n";
  }
  EXPECT_EQ(RunWithOutput(file,
                          [&] {
                            const StandardOutput output;
                            for (int i = 0; i < 30000; ++i) {
                              std::cout << i << '\n';
                            }
                            std::cout << expected << std::flush;
                            EXPECT_TRUE(std::cout);
                            return 0;
                          }),
            0);
  EXPECT_EQ(Content("/tmp/out"), expected + expected);
}

TEST(CliStandardOutput, OutputThatCannotBeWrittenMakesTheStreamBad) {
  const int full = open("/dev/full", O_WRONLY | O_CLOEXEC);
  EXPECT_EQ(RunWithOutput(full,
                          [] {
                            const StandardOutput output;
                            std::cout << "x";
                            EXPECT_TRUE(std::cout);
                            EXPECT_FALSE(std::cout.flush());
                            EXPECT_EQ(errno, ENOSPC);
                            EXPECT_EQ(NotedSignal(), 0);
                            return 0;
                          }),
            0);
}

TEST(CliStandardOutput, SignalEndsTheWaitingForAReaderWhoDoesNotRead) {
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  EXPECT_EQ(RunWithOutput(ends[1],
                          [] {
                            NoteSignals();
                            const StandardOutput output;
                            const pid_t parent = getpid();
                            const pid_t child = fork();
                            if (child == 0) {
                              usleep(200000);
                              (void)kill(parent, SIGTERM);
                              _exit(0);
                            }
                            std::cout << std::string(1 << 20, 'x') << std::flush;
                            EXPECT_FALSE(std::cout);
                            EXPECT_EQ(NotedSignal(), SIGTERM);
                            EXPECT_EQ(waitpid(child, nullptr, 0), child);
                            return 0;
                          }),
            0);
}

TEST(CliStandardOutput, WhatIsSaidAfterASignalComesOut) {
  const int file = open("/tmp/after", O_CREAT | O_TRUNC | O_WRONLY | O_CLOEXEC, 0600);
  EXPECT_EQ(RunWithOutput(file,
                          [] {
                            NoteSignals();
                            const StandardOutput output;
                            (void)raise(SIGINT);
                            std::cout << "said" << std::flush;
                            return std::cout ? 0 : 1;
                          }),
            0);
  EXPECT_EQ(Content("/tmp/after"), "said");
}

TEST(CliStandardOutput, DescriptorThatDoesNotWaitIsWaitedFor) {
  int ends[2];
  ASSERT_EQ(pipe2(ends, O_NONBLOCK), 0);
  const std::string text(300000, 'y');
  const pid_t writer = fork();
  if (writer == 0) {
    _exit(WriteOutput(ends[1], text) ? 0 : 1);
  }
  close(ends[1]);
  fcntl(ends[0], F_SETFL, 0);
  std::string read_text;
  char piece[1000];
  for (ssize_t count = 0; (count = read(ends[0], piece, sizeof(piece))) > 0;) {
    read_text.append(piece, static_cast<size_t>(count));
  }
  int status = 0;
  EXPECT_EQ(waitpid(writer, &status, 0), writer);
  EXPECT_EQ(status, 0);
  EXPECT_EQ(read_text, text);
}

}  // namespace
}  // namespace cli
