#include "common/stop_signal.h"

#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <thread>

#include "support/child.h"

namespace common {
namespace {

// A listening socket that nobody connects to.
int Listening() {
  const int fd = socket(AF_UNIX, SOCK_STREAM, 0);
  sockaddr_un address{};
  address.sun_family = AF_UNIX;  // and no path: the kernel draws one
  EXPECT_EQ(bind(fd, reinterpret_cast<sockaddr*>(&address), sizeof(sa_family_t)), 0);
  EXPECT_EQ(listen(fd, 1), 0);
  return fd;
}

// Signals this thread after a while.
std::thread SignalLater() {
  return std::thread([thread = pthread_self()] {
    std::this_thread::sleep_for(std::chrono::milliseconds(200));
    pthread_kill(thread, SIGTERM);
  });
}

TEST(CommonStopSignal, EndsAWaitingAccept) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const int fd = Listening();
              EndByStopSignal(fd);
              EXPECT_FALSE(StopSignalCame());
              std::thread sender = SignalLater();
              EXPECT_EQ(accept(fd, nullptr, nullptr), -1);
              EXPECT_EQ(errno, ENOTSOCK);
              sender.join();
              return StopSignalCame() ? 0 : 1;
            }),
            0);
}

TEST(CommonStopSignal, EndsAnAcceptThatIsYetToCome) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              const int fd = Listening();
              EndByStopSignal(fd);
              raise(SIGTERM);
              EXPECT_EQ(accept(fd, nullptr, nullptr), -1);
              return StopSignalCame() ? 0 : 1;
            }),
            0);
}

TEST(CommonStopSignal, RunningCallsGoOn) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              EndByStopSignal(Listening());
              int ends[2];
              EXPECT_EQ(pipe(ends), 0);
              const pthread_t reader = pthread_self();
              std::thread sender([&] {
                std::this_thread::sleep_for(std::chrono::milliseconds(200));
                pthread_kill(reader, SIGTERM);
                std::this_thread::sleep_for(std::chrono::milliseconds(100));
                EXPECT_EQ(write(ends[1], "x", 1), 1);
              });
              char c = 0;
              EXPECT_EQ(read(ends[0], &c, 1), 1);
              sender.join();
              return StopSignalCame() ? 0 : 1;
            }),
            0);
}

TEST(CommonStopSignal, MayComeTwice) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              EndByStopSignal(Listening());
              raise(SIGTERM);
              raise(SIGTERM);
              return StopSignalCame() ? 0 : 1;
            }),
            0);
}

TEST(CommonStopSignal, ErrnoIsKept) {
  EXPECT_EQ(tuvo_test::RunInChild([] {
              EndByStopSignal(-1);  // no descriptor: the handler's call fails
              errno = ENOENT;
              raise(SIGTERM);
              return errno == ENOENT ? 0 : 1;
            }),
            0);
}

}  // namespace
}  // namespace common
