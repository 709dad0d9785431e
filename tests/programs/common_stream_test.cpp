#include "common/stream.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <string>
#include <thread>

#include "common/unique_fd.h"

namespace common {
namespace {

// A temporary file with contents that do not repeat.
class CommonStream : public testing::Test {
 protected:
  void SetUp() override {
    char path[] = "/tmp/stream-XXXXXX";
    file_ = UniqueFd(mkstemp(path));
    ASSERT_GE(file_.get(), 0);
    unlink(path);
    for (int i = 0; content_.size() < 700000; ++i) {
      content_ += std::to_string(i) + ";";
    }
    ASSERT_TRUE(WriteAll(file_.get(), content_));
    int ends[2];
    ASSERT_EQ(pipe(ends), 0);
    reading_ = UniqueFd(ends[0]);
    writing_ = UniqueFd(ends[1]);
  }

  // What `write` writes into a pipe that is read in small pieces.
  template <typename Write>
  std::string Through(Write write) {
    std::string received;
    std::thread reader([&] {
      char piece[777];
      for (ssize_t count = 0; (count = read(reading_.get(), piece, sizeof piece)) > 0;) {
        received.append(piece, static_cast<size_t>(count));
      }
    });
    write(writing_.get());
    writing_ = UniqueFd();
    reader.join();
    return received;
  }

  UniqueFd file_;
  UniqueFd reading_;
  UniqueFd writing_;
  std::string content_;
};

TEST_F(CommonStream, WritesMoreThanAPipeHolds) {
  EXPECT_EQ(Through([&](int fd) { EXPECT_TRUE(WriteAll(fd, content_)); }), content_);
}

TEST_F(CommonStream, CopiesAWholeFile) {
  const auto size = static_cast<std::int64_t>(content_.size());
  EXPECT_EQ(Through([&](int fd) { EXPECT_TRUE(CopyAll(file_.get(), 0, size, fd)); }), content_);
}

TEST_F(CommonStream, CopiesAPartAcrossPieces) {
  EXPECT_EQ(Through([&](int fd) { EXPECT_TRUE(CopyAll(file_.get(), 65530, 131080, fd)); }),
            content_.substr(65530, 131080));
}

TEST_F(CommonStream, CopiesNothing) {
  EXPECT_EQ(Through([&](int fd) { EXPECT_TRUE(CopyAll(file_.get(), 5, 0, fd)); }), "");
}

// The kernel does not copy to a descriptor opened for appending.
TEST_F(CommonStream, CopiesWhereTheKernelDoesNot) {
  const UniqueFd out(open("/tmp/stream-append", O_RDWR | O_CREAT | O_TRUNC | O_APPEND, 0600));
  ASSERT_TRUE(CopyAll(file_.get(), 3, 200000, out.get()));
  std::string copied(200000, '\0');
  ASSERT_EQ(pread(out.get(), copied.data(), copied.size(), 0), 200000);
  EXPECT_EQ(copied, content_.substr(3, 200000));
}

TEST_F(CommonStream, FileThatIsShorterThanPromisedIsAFailure) {
  const auto size = static_cast<std::int64_t>(content_.size());
  EXPECT_EQ(Through([&](int fd) { EXPECT_FALSE(CopyAll(file_.get(), size - 10, 20, fd)); }),
            content_.substr(content_.size() - 10));
}

TEST_F(CommonStream, ReaderThatLeavesIsAFailure) {
  std::signal(SIGPIPE, SIG_IGN);
  reading_ = UniqueFd();
  EXPECT_FALSE(WriteAll(writing_.get(), "x"));
  EXPECT_EQ(errno, EPIPE);
  EXPECT_FALSE(CopyAll(file_.get(), 0, 10, writing_.get()));
}

void OnSignal(int /*signal*/) {}

TEST_F(CommonStream, SignalsInterruptNothing) {
  struct sigaction action {};
  action.sa_handler = OnSignal;  // without SA_RESTART
  sigaction(SIGUSR1, &action, nullptr);
  const pthread_t writer = pthread_self();
  bool done = false;
  std::thread pest([&] {
    while (!__atomic_load_n(&done, __ATOMIC_SEQ_CST)) {
      pthread_kill(writer, SIGUSR1);
      usleep(50);
    }
  });
  const auto size = static_cast<std::int64_t>(content_.size());
  const std::string received = Through([&](int fd) {
    EXPECT_TRUE(WriteAll(fd, content_));
    EXPECT_TRUE(CopyAll(file_.get(), 0, size, fd));
  });
  __atomic_store_n(&done, true, __ATOMIC_SEQ_CST);
  pest.join();
  EXPECT_TRUE(received == content_ + content_);
}

}  // namespace
}  // namespace common
