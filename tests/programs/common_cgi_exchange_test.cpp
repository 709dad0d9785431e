#include "common/cgi_exchange.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <string>

#include "support/child.h"

namespace common {
namespace {

// Makes `fd` read from, or write to, a pipe; the pipe's other end.
int Pipe(int fd) {
  int ends[2];
  EXPECT_EQ(pipe(ends), 0);
  const int own = fd == STDIN_FILENO ? 0 : 1;
  EXPECT_EQ(dup2(ends[own], fd), fd);
  close(ends[own]);
  return ends[1 - own];
}

std::string All(int fd) {
  std::string all;
  char piece[100];
  for (ssize_t count = 0; (count = read(fd, piece, sizeof piece)) > 0;) {
    all.append(piece, static_cast<size_t>(count));
  }
  return all;
}

TEST(CommonCgiExchange, BodyIsStandardInput) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const int body = Pipe(STDIN_FILENO);
              EXPECT_EQ(write(body, "abc", 3), 3);
              close(body);
              CgiExchange exchange;
              char data[10] = {};
              EXPECT_EQ(exchange.Read(data, 2), 2U);
              EXPECT_EQ(exchange.Read(data + 2, 8), 1U);
              EXPECT_STREQ(data, "abc");
              EXPECT_EQ(exchange.Read(data, 10), 0U);
              return 0;
            }),
            0);
}

TEST(CommonCgiExchange, ErrorIsTheBodysEnd) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              close(STDIN_FILENO);
              char data[10] = {};
              return static_cast<int>(CgiExchange().Read(data, sizeof data));
            }),
            0);
}

TEST(CommonCgiExchange, AnswerIsStandardOutputAndEndsWithFinish) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const int reader = Pipe(STDOUT_FILENO);
              char path[] = "/tmp/exchange-XXXXXX";
              const int file = mkstemp(path);
              EXPECT_EQ(write(file, "0123456789", 10), 10);
              CgiExchange exchange;
              EXPECT_TRUE(exchange.Write("head;"));
              EXPECT_TRUE(exchange.WriteFile(file, 3, 4));
              EXPECT_FALSE(exchange.WriteFile(file, 9, 2));  // the file is shorter
              EXPECT_TRUE(exchange.Finish());
              EXPECT_EQ(All(reader), "head;34569");
              return 0;
            }),
            0);
}

TEST(CommonCgiExchange, ProgramOutlivesTheWebServersSignalBehindTheAnswer) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              Pipe(STDOUT_FILENO);
              CgiExchange().Finish();
              raise(SIGTERM);
              return 0;
            }),
            0);
}

TEST(CommonCgiExchange, ProgramOutlivesTheWebServersSignalWhileAFileIsSent) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              std::signal(SIGPIPE, SIG_IGN);
              close(Pipe(STDOUT_FILENO));
              const int file = open("/proc/self/exe", O_RDONLY);
              EXPECT_FALSE(CgiExchange().WriteFile(file, 0, 1000));
              raise(SIGTERM);
              return 0;
            }),
            0);
}

TEST(CommonCgiExchange, ProgramEndsByTheSignalBefore) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const CgiExchange exchange;
              raise(SIGTERM);
              return 0;
            }),
            256 + SIGTERM);
}

}  // namespace
}  // namespace common
