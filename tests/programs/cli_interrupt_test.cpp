#include "cli/interrupt.h"

#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <string>

#include "support/child.h"

namespace cli {
namespace {

constexpr int kSignalled = 256;  // and the signal: RunInChild

// Both ends of a pipe that nobody writes to.
struct Pipe {
  Pipe() { EXPECT_EQ(pipe(ends), 0); }
  int ends[2] = {-1, -1};
};

TEST(CliInterrupt, SignalIsNotedAndStopsTheCommand) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    StopIfInterrupted();
    (void)raise(SIGTERM);
    EXPECT_EQ(NotedSignal(), SIGTERM);
    EXPECT_THROW(StopIfInterrupted(), Interruption);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, SecondSignalEndsTheProcess) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    (void)raise(SIGINT);
    (void)raise(SIGINT);
    return 0;
  });
  EXPECT_EQ(status, kSignalled + SIGINT);
}

TEST(CliInterrupt, SignalThatIsIgnoredStaysSo) {
  const int status = tuvo_test::RunInChild([] {
    (void)std::signal(SIGHUP, SIG_IGN);
    NoteSignals();
    (void)raise(SIGHUP);
    return NotedSignal();
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, ProcessEndsByItsSignal) {
  EXPECT_EQ(tuvo_test::RunInChild([]() -> int {
              NoteSignals();
              EndBySignal(SIGTERM);
            }),
            kSignalled + SIGTERM);
}

TEST(CliInterrupt, SignalRightBeforeTheWaitingIsNotMissed) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    const Pipe empty;
    (void)raise(SIGTERM);
    EXPECT_THROW(WaitForInput(empty.ends[0]), Interruption);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, SignalEndsTheWaiting) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    const Pipe empty;
    const pid_t parent = getpid();
    const pid_t child = fork();
    if (child == 0) {
      usleep(200000);
      (void)kill(parent, SIGHUP);
      _exit(0);
    }
    EXPECT_THROW(WaitForInput(empty.ends[0]), Interruption);
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

// Fills a pipe that nobody reads.
void Fill(int fd) {
  const std::string piece(4096, 'x');
  fcntl(fd, F_SETFL, O_NONBLOCK);
  while (write(fd, piece.data(), piece.size()) > 0) {
  }
  fcntl(fd, F_SETFL, 0);
}

TEST(CliInterrupt, SignalEndsTheWaitingForAReader) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    const Pipe full;
    Fill(full.ends[1]);
    const pid_t parent = getpid();
    const pid_t child = fork();
    if (child == 0) {
      usleep(200000);
      (void)kill(parent, SIGTERM);
      _exit(0);
    }
    EXPECT_THROW(WaitForOutput(full.ends[1]), Interruption);
    EXPECT_THROW(WaitForOutput(full.ends[1]), Interruption);
    EXPECT_EQ(waitpid(child, nullptr, 0), child);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, AfterASignalThereIsStillOutputWithoutWaiting) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    (void)raise(SIGTERM);
    const Pipe empty;
    WaitForOutput(empty.ends[1]);
    const Pipe broken;
    close(broken.ends[0]);
    WaitForOutput(broken.ends[1]);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, FileThatBecomesTooLargeIsAnError) {
  const int status = tuvo_test::RunInChild([] {
    NoteSignals();
    const rlimit kSmall{10, 10};
    EXPECT_EQ(setrlimit(RLIMIT_FSIZE, &kSmall), 0);
    const int fd = open("/tmp/large", O_CREAT | O_WRONLY | O_CLOEXEC, 0600);
    EXPECT_EQ(write(fd, "0123456789", 10), 10);
    EXPECT_EQ(write(fd, "x", 1), -1);
    EXPECT_EQ(errno, EFBIG);
    return 0;
  });
  EXPECT_EQ(status, 0);
}

TEST(CliInterrupt, InputAndItsEndEndTheWaiting) {
  const Pipe pipe;
  ASSERT_EQ(write(pipe.ends[1], "x", 1), 1);
  WaitForInput(pipe.ends[0]);
  const Pipe closed;
  close(closed.ends[1]);
  WaitForInput(closed.ends[0]);
}

}  // namespace
}  // namespace cli
