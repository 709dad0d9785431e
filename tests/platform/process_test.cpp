#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/time.h>
#include <sys/wait.h>
#include <tuvoplatform/process.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include "platform/failing_allocations.h"
#include "platform/temp_folder.h"
#include "support/child.h"

namespace {

using std::chrono::milliseconds;
using tuvo_test::RunInChild;
using tuvo_test::RunInChildAs;
using tuvo_test::TempFolder;

std::string ReadAll(FILE* stream) {
  std::string text;
  char chunk[4096];
  for (size_t got = 0; (got = std::fread(chunk, 1, sizeof chunk, stream)) != 0;) {
    text.append(chunk, got);
  }
  return text;
}

struct Finished {
  std::string output;
  int status;
};

Finished Finish(const char* path, std::vector<const char*> argv) {
  argv.push_back(nullptr);
  FILE* stream = TLIBCPopenv(path, "r", argv.data());
  if (stream == nullptr) {
    return {"(not started)", -1};
  }
  std::string output = ReadAll(stream);
  return {output, TLIBCPclose(stream)};
}

std::string Shell(const char* script) {
  return Finish("/bin/sh", {"sh", "-c", script}).output;
}

std::string FileText(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

size_t OpenDescriptors() {
  const std::filesystem::directory_iterator folder("/proc/self/fd");
  return static_cast<size_t>(std::distance(begin(folder), end(folder)));
}

// Starting.

TEST(Process, ReadsWhatTheProgramPrints) {
  FILE* stream = TLIBCPopen("/bin/echo", "r", "one", "two", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ("one two\n", ReadAll(stream));
  EXPECT_EQ(0, TLIBCPclose(stream));
}

TEST(Process, StreamHasNoDescriptorOfItsOwn) {
  FILE* stream = TLIBCPopen("/bin/echo", "r", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ(-1, fileno(stream));
  TLIBCPclose(stream);
}

TEST(Process, ArgumentsReachTheProgramUnchanged) {
  const Finished finished = Finish("/usr/bin/printf", {"printf", "[%s]", "a b", "", "$HOME", "`id`",
                                                       "*", "'\"", "; exit 3", "\xc3\xbc\n"});
  EXPECT_EQ("[a b][][$HOME][`id`][*]['\"][; exit 3][\xc3\xbc\n]", finished.output);
}

TEST(Process, ArgumentZeroIsThePathItself) {
  FILE* stream = TLIBCPopen("/bin/cat", "r", "/proc/self/cmdline", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ(std::string("/bin/cat\0/proc/self/cmdline\0", 28), ReadAll(stream));
  TLIBCPclose(stream);
}

TEST(Process, VectorNamesItsOwnArgumentZero) {
  EXPECT_EQ(std::string("other\0/proc/self/cmdline\0", 25),
            Finish("/bin/cat", {"other", "/proc/self/cmdline"}).output);
}

TEST(Process, ReadingGivesTheChildAnEmptyInput) {
  const TempFolder folder;
  const std::string path = folder / "input";
  std::ofstream(path) << "for the parent alone";
  EXPECT_EQ(
      0, RunInChild([&] {
        const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC);
        dup2(fd, STDIN_FILENO);
        EXPECT_EQ("/dev/null\n", Finish("/bin/readlink", {"readlink", "/proc/self/fd/0"}).output);
        EXPECT_EQ("", Finish("/bin/cat", {"cat"}).output);
        return 0;
      }));
}

TEST(Process, WritingFeedsTheChildsInput) {
  const TempFolder folder;
  const std::string target = "of=" + folder / "out";
  FILE* stream = TLIBCPopen("/bin/dd", "w", target.c_str(), "status=none", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_GE(std::fputs("what was written", stream), 0);
  EXPECT_EQ(0, TLIBCPclose(stream));
  EXPECT_EQ("what was written", FileText(folder / "out"));
}

TEST(Process, LargeAmountsPassBothWays) {
  const TempFolder folder;
  const std::string path = folder / "out";
  std::string text;
  for (int i = 0; text.size() < 5000000; ++i) {
    text += std::to_string(i) + "\n";
  }
  const std::string target = "of=" + path;
  FILE* stream = TLIBCPopen("/bin/dd", "w", target.c_str(), "status=none", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ(text.size(), std::fwrite(text.data(), 1, text.size(), stream));
  EXPECT_EQ(0, TLIBCPclose(stream));
  EXPECT_EQ(text, FileText(path));
  EXPECT_EQ(text, Finish("/bin/cat", {"cat", path.c_str()}).output);
}

TEST(Process, EnvironmentIsPassedOn) {
  ASSERT_EQ(0, setenv("TUVO_PROCESS_TEST", "passed", 1));
  EXPECT_EQ("passed\n", Finish("/usr/bin/printenv", {"printenv", "TUVO_PROCESS_TEST"}).output);
  ASSERT_EQ(0, unsetenv("TUVO_PROCESS_TEST"));
}

TEST(Process, ProgramThatCannotStartGivesNullAndTheReason) {
  const TempFolder folder;
  const std::string text = folder / "text";
  const std::string script = folder / "script";
  std::ofstream(text) << "text";
  // A shell would run it; an exec without a shell cannot.
  std::ofstream(script) << "echo started by a shell\n";
  ASSERT_EQ(0, chmod(script.c_str(), 0755));
  const size_t before = OpenDescriptors();

  errno = 0;
  EXPECT_EQ(nullptr, TLIBCPopen("/no/such/program", "r", "a", nullptr));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(nullptr, TLIBCPopen("/no/such/program", "w", nullptr));
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(nullptr, TLIBCPopen("echo", "r", nullptr));  // nor is PATH searched
  EXPECT_EQ(ENOENT, errno);
  EXPECT_EQ(nullptr, TLIBCPopen(text.c_str(), "r", nullptr));
  EXPECT_EQ(EACCES, errno);
  EXPECT_EQ(nullptr, TLIBCPopen(script.c_str(), "r", nullptr));
  EXPECT_EQ(ENOEXEC, errno);
  EXPECT_EQ(nullptr, TLIBCPopen(folder.path().c_str(), "r", nullptr));
  EXPECT_EQ(EACCES, errno);

  EXPECT_EQ(before, OpenDescriptors());
  EXPECT_EQ(-1, waitpid(-1, nullptr, WNOHANG));  // no child is left either
  EXPECT_EQ(ECHILD, errno);
}

TEST(Process, OtherModesAndNullArgumentsGiveNull) {
  for (const char* mode : {"", "rw", "re", "a", "R", static_cast<const char*>(nullptr)}) {
    errno = 0;
    EXPECT_EQ(nullptr, TLIBCPopen("/bin/true", mode, nullptr));
    EXPECT_EQ(EINVAL, errno);
  }
  const char* const empty[] = {nullptr};
  EXPECT_EQ(nullptr, TLIBCPopenv("/bin/true", "r", nullptr));
  EXPECT_EQ(nullptr, TLIBCPopenv("/bin/true", "r", empty));
  EXPECT_EQ(nullptr, TLIBCPopen(nullptr, "r", nullptr));
  EXPECT_EQ(EINVAL, errno);
}

TEST(Process, RunningOutOfDescriptorsGivesNullAndTheReason) {
  const int lowest = dup(STDIN_FILENO);  // all numbers below are in use
  close(lowest);
  rlimit usual{};
  ASSERT_EQ(0, getrlimit(RLIMIT_NOFILE, &usual));
  for (const int more : {0, 1}) {
    const rlimit tight{static_cast<rlim_t>(lowest + more), usual.rlim_max};
    setrlimit(RLIMIT_NOFILE, &tight);
    FILE* stream = TLIBCPopen("/bin/true", "r", nullptr);
    const int error = errno;
    setrlimit(RLIMIT_NOFILE, &usual);
    EXPECT_EQ(nullptr, stream);
    EXPECT_EQ(EMFILE, error);
    const int next = dup(STDIN_FILENO);
    EXPECT_EQ(lowest, next);  // nothing was left open
    close(next);
  }
}

TEST(Process, EveryLackOfMemoryGivesNullAndTheReason) {
  const size_t before = OpenDescriptors();
  int failing = 0;
  for (FILE* stream = nullptr; stream == nullptr; ++failing) {
    errno = 0;
    tuvo_test::allocations_left = failing;
    stream = TLIBCPopen("/bin/true", "r", "an argument", nullptr);
    const int error = errno;
    tuvo_test::allocations_left = -1;
    if (stream == nullptr) {
      ASSERT_EQ(ENOMEM, error);
      ASSERT_EQ(-1, waitpid(-1, nullptr, WNOHANG));  // no child was started
    } else {
      EXPECT_EQ(0, TLIBCPclose(stream));
    }
  }
  EXPECT_GT(failing, 3);
  EXPECT_EQ(before, OpenDescriptors());
}

// Descriptors.

size_t Pipes(const std::string& listing) {
  size_t count = 0;
  for (size_t at = 0; (at = listing.find(" -> pipe:", at)) != std::string::npos; ++at) {
    ++count;
  }
  return count;
}

TEST(Process, CloseOnExecDescriptorsDoNotReachTheChild) {
  const TempFolder folder;
  const std::string secret = folder / "secret";
  const std::string open_file = folder / "open";
  const int closed = open(secret.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0600);
  const int kept = open(open_file.c_str(), O_RDWR | O_CREAT, 0600);  // NOLINT: meant to reach it
  const size_t before = Pipes(Finish("/bin/ls", {"ls", "-l", "/proc/self/fd"}).output);
  FILE* other = TLIBCPopen("/bin/cat", "w", nullptr);
  ASSERT_NE(nullptr, other);
  const std::string listing = Finish("/bin/ls", {"ls", "-l", "/proc/self/fd"}).output;
  TLIBCPclose(other);
  close(closed);
  close(kept);

  EXPECT_EQ(std::string::npos, listing.find(secret)) << listing;
  EXPECT_NE(std::string::npos, listing.find(open_file)) << listing;
  EXPECT_EQ(before, Pipes(listing)) << listing;
}

TEST(Process, EndOfOneStreamDoesNotWaitForAnotherChild) {
  // The second child would keep the first one's input open if it had inherited the stream.
  FILE* first = TLIBCPopen("/bin/cat", "w", nullptr);
  FILE* second = TLIBCPopen("/bin/cat", "w", nullptr);
  ASSERT_NE(nullptr, first);
  ASSERT_NE(nullptr, second);
  EXPECT_EQ(0, TLIBCPclose(first));
  EXPECT_EQ(0, TLIBCPclose(second));
}

// A letter for each standard descriptor: open or closed.
std::string StandardDescriptors() {
  std::string state;
  for (int fd = 0; fd <= 2; ++fd) {
    state += fcntl(fd, F_GETFD) < 0 ? 'c' : 'o';
  }
  return state;
}

// What both modes do in a process that has the standard descriptors marked in `state` closed. The
// result is an exit code, since there may be nowhere left to print to.
int WorksWithClosed(const std::string& state, const std::string& out) {
  for (int fd = 0; fd <= 2; ++fd) {
    if (state[static_cast<size_t>(fd)] == 'c') {
      close(fd);
    }
  }
  if (Finish("/bin/echo", {"echo", "hello"}).output != "hello\n") {
    return 1;
  }
  if (Finish("/bin/readlink", {"readlink", "/proc/self/fd/0"}).output != "/dev/null\n") {
    return 2;
  }
  const std::string target = "of=" + out;
  FILE* stream = TLIBCPopen("/bin/dd", "w", target.c_str(), "status=none", nullptr);
  if (stream == nullptr || std::fputs("hello", stream) < 0 || TLIBCPclose(stream) != 0) {
    return 3;
  }
  if (FileText(out) != "hello") {
    return 4;
  }
  return StandardDescriptors() == state ? 0 : 5;  // nothing of ours took their place
}

TEST(Process, WorksWithStandardDescriptorsClosed) {
  const TempFolder folder;
  for (const char* state : {"ooo", "coo", "oco", "cco", "ooc", "coc", "occ", "ccc"}) {
    EXPECT_EQ(0, RunInChild([&] { return WorksWithClosed(state, folder / state); })) << state;
  }
}

TEST(Process, StreamNeverTakesTheNumberOfAStandardDescriptor) {
  EXPECT_EQ(0, RunInChild([] {
              // The lowest numbers go to the pipe: its writing end would be standard output, and
              // what this process prints would go to the child.
              close(STDIN_FILENO);
              close(STDOUT_FILENO);
              FILE* stream = TLIBCPopen("/bin/cat", "w", nullptr);
              const bool free = fcntl(STDOUT_FILENO, F_GETFD) < 0;
              TLIBCPclose(stream);
              return free ? 0 : 1;
            }));
}

TEST(Process, StandardDescriptorIsNeverLeftClosedInTheChild) {
  EXPECT_EQ(0, RunInChild([] {
              close(STDERR_FILENO);
              return Shell("readlink /proc/self/fd/2") == "/dev/null\n" ? 0 : 1;
            }));
  EXPECT_EQ(0, RunInChild([] {  // close-on-exec comes to the same
              fcntl(STDERR_FILENO, F_SETFD, FD_CLOEXEC);
              return Shell("readlink /proc/self/fd/2") == "/dev/null\n" ? 0 : 1;
            }));
}

TEST(Process, StandardErrorIsInherited) {
  const TempFolder folder;
  const std::string path = folder / "err";
  EXPECT_EQ(0, RunInChild([&] {
              const int fd = open(path.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC, 0600);
              dup2(fd, STDERR_FILENO);
              return Shell("echo message >&2") == "" ? 0 : 1;
            }));
  EXPECT_EQ("message\n", FileText(path));
}

// Identity and signals.

TEST(Process, ChildKeepsRealAndEffectiveIds) {
  EXPECT_EQ(0, RunInChildAs({0, 1, 0, 0, 1, 0}, [] {
              EXPECT_EQ("1\n", Finish("/usr/bin/id", {"id", "-u"}).output);
              EXPECT_EQ("0\n", Finish("/usr/bin/id", {"id", "-ru"}).output);
              EXPECT_EQ("1\n", Finish("/usr/bin/id", {"id", "-g"}).output);
              EXPECT_EQ("0\n", Finish("/usr/bin/id", {"id", "-rg"}).output);
              return 0;
            }));
}

std::string StatusLine(const std::string& name) {
  const std::string status = Finish("/bin/cat", {"cat", "/proc/self/status"}).output;
  const size_t at = status.find("\n" + name + ":\t") + name.size() + 3;
  return status.substr(at, status.find('\n', at) - at);
}

TEST(Process, ChildStartsWithNoSignalBlockedAndSigpipeAtItsDefault) {
  EXPECT_EQ(0, RunInChild([] {
              sigset_t all;
              sigfillset(&all);
              sigprocmask(SIG_BLOCK, &all, nullptr);
              std::signal(SIGPIPE, SIG_IGN);
              std::signal(SIGUSR1, SIG_IGN);
              EXPECT_EQ(0U, std::stoull(StatusLine("SigBlk"), nullptr, 16));
              // Other ignored signals stay so.
              EXPECT_EQ(1ULL << (SIGUSR1 - 1U),
                        std::stoull(StatusLine("SigIgn"), nullptr, 16) &
                            (1ULL << (SIGUSR1 - 1U) | 1ULL << (SIGPIPE - 1U)));
              return 0;
            }));
}

TEST(Process, ChildWithoutReaderDiesOfTheBrokenPipe) {
  EXPECT_EQ(0, RunInChild([] {
              std::signal(SIGPIPE, SIG_IGN);
              FILE* stream = TLIBCPopen("/usr/bin/yes", "r", nullptr);
              EXPECT_EQ('y', std::fgetc(stream));
              const int status = TLIBCPclose(stream);
              EXPECT_TRUE(WIFSIGNALED(status));
              EXPECT_EQ(SIGPIPE, WTERMSIG(status));
              return 0;
            }));
}

volatile std::sig_atomic_t alarms = 0;

// Interrupts system calls of this process every few milliseconds.
class Alarms {
 public:
  Alarms() {
    alarms = 0;
    struct sigaction action {};
    action.sa_handler = [](int) { alarms = alarms + 1; };  // no SA_RESTART
    sigaction(SIGALRM, &action, nullptr);
    const itimerval timer{{0, 5000}, {0, 5000}};
    setitimer(ITIMER_REAL, &timer, nullptr);
  }
  ~Alarms() {
    const itimerval off{};
    setitimer(ITIMER_REAL, &off, nullptr);
  }
  Alarms(const Alarms&) = delete;
  Alarms& operator=(const Alarms&) = delete;
};

TEST(Process, InterruptedReadsAreTakenUpAgain) {
  const Alarms interrupting;
  EXPECT_EQ("one\ntwo\n", Shell("sleep 0.2; echo one; sleep 0.2; echo two"));
  EXPECT_GT(alarms, 10);
}

TEST(Process, InterruptedWritesAreTakenUpAgainAlsoWhenClosing) {
  const TempFolder folder;
  const std::string path = folder / "out";
  const std::string script = "sleep 0.3; cat > " + path;
  const std::string text(300000, 'x');  // more than a pipe holds
  const std::string rest(5000, 'y');    // stays with the stream until it is closed
  {
    const Alarms interrupting;
    FILE* stream = TLIBCPopen("/bin/sh", "w", "-c", script.c_str(), nullptr);
    ASSERT_NE(nullptr, stream);
    EXPECT_EQ(text.size(), std::fwrite(text.data(), 1, text.size(), stream));
    EXPECT_EQ(rest.size(), std::fwrite(rest.data(), 1, rest.size(), stream));
    EXPECT_EQ(0, TLIBCPclose(stream));
    EXPECT_GT(alarms, 10);
  }
  EXPECT_EQ(text + rest, FileText(path));
}

TEST(Process, FlushAtTheCloseSurvivesInterruptions) {
  const TempFolder folder;
  const std::string path = folder / "out";
  const std::string script = "sleep 0.3; cat > " + path;
  FILE* stream = TLIBCPopen("/bin/sh", "w", "-c", script.c_str(), nullptr);
  ASSERT_NE(nullptr, stream);
  std::vector<char> buffer(300000);
  ASSERT_EQ(0, std::setvbuf(stream, buffer.data(), _IOFBF, buffer.size()));
  const std::string text(200000, 'x');  // all of it still with the stream, and no room in the pipe
  EXPECT_EQ(text.size(), std::fwrite(text.data(), 1, text.size(), stream));
  {
    const Alarms interrupting;
    EXPECT_EQ(0, TLIBCPclose(stream));
    EXPECT_GT(alarms, 10);
  }
  EXPECT_EQ(text, FileText(path));
}

TEST(Process, InterruptedWaitIsTakenUpAgain) {
  const Alarms interrupting;
  // The stream is at its end long before the child is.
  FILE* stream = TLIBCPopen("/bin/sh", "r", "-c", "exec >&-; sleep 0.3; exit 3", nullptr);
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ("", ReadAll(stream));
  const int status = TLIBCPclose(stream);
  EXPECT_TRUE(WIFEXITED(status));
  EXPECT_EQ(3, WEXITSTATUS(status));
  EXPECT_GT(alarms, 10);
}

// Closing.

TEST(Process, ClosingReturnsTheStatusAsWaitpidReportsIt) {
  const Finished failed = Finish("/bin/sh", {"sh", "-c", "exit 7"});
  EXPECT_TRUE(WIFEXITED(failed.status));
  EXPECT_EQ(7, WEXITSTATUS(failed.status));
  const Finished killed = Finish("/bin/sh", {"sh", "-c", "kill -TERM $$"});
  EXPECT_TRUE(WIFSIGNALED(killed.status));
  EXPECT_EQ(SIGTERM, WTERMSIG(killed.status));
  EXPECT_EQ(0, Finish("/bin/true", {"true"}).status);
}

TEST(Process, ClosingWaitsForTheChild) {
  const auto start = std::chrono::steady_clock::now();
  EXPECT_EQ(0, Finish("/bin/sh", {"sh", "-c", "exec >&-; sleep 0.3"}).status);
  EXPECT_GE(std::chrono::steady_clock::now() - start, milliseconds(300));
}

TEST(Process, ClosingLeavesNeitherChildNorDescriptor) {
  const size_t before = OpenDescriptors();
  for (int i = 0; i < 20; ++i) {
    Finish("/bin/echo", {"echo"});
  }
  EXPECT_EQ(before, OpenDescriptors());
  EXPECT_EQ(-1, waitpid(-1, nullptr, WNOHANG));
  EXPECT_EQ(ECHILD, errno);
}

TEST(Process, ClosingAStreamOfAnotherOriginFailsAndLeavesItAlone) {
  FILE* stream = std::fopen("/dev/zero", "re");
  ASSERT_NE(nullptr, stream);
  EXPECT_EQ(-1, TLIBCPclose(stream));
  EXPECT_EQ(0, std::fgetc(stream));
  std::fclose(stream);
  EXPECT_EQ(-1, TLIBCPclose(nullptr));
}

TEST(Process, ClosingWithoutAStatusFails) {
  EXPECT_EQ(0, RunInChild([] {
              std::signal(SIGCHLD, SIG_IGN);
              EXPECT_EQ(-1, Finish("/bin/true", {"true"}).status);
              EXPECT_EQ(ECHILD, errno);
              return 0;
            }));
}

TEST(Process, ThreadsMayStartAndCloseTogether) {
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 8; ++thread) {
    threads.emplace_back([thread] {
      for (int i = 0; i < 25; ++i) {
        const std::string text = std::to_string(thread) + "-" + std::to_string(i);
        const std::string script = "echo " + text + "; exit " + std::to_string(thread);
        const Finished finished = Finish("/bin/sh", {"sh", "-c", script.c_str()});
        EXPECT_EQ(text + "\n", finished.output);
        EXPECT_EQ(thread, WEXITSTATUS(finished.status));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

}  // namespace
