#include "cli/terminal.h"

#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <csignal>
#include <iostream>

#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/line_reader.h"

namespace cli {

namespace {

constexpr std::size_t kUsualWidth = 80;
constexpr std::size_t kLongestAnswer = 4096;  // what a terminal gives as one line

// What is typed is not shown, for a scope. A stop from the keyboard would leave the shell without
// echo, hence has to wait; other signals end the reading and so the scope.
class Unseen {
 public:
  Unseen() {
    sigset_t stop;
    sigemptyset(&stop);
    sigaddset(&stop, SIGTSTP);
    sigprocmask(SIG_BLOCK, &stop, &former_mask_);
    termios silent{};
    if (tcgetattr(STDIN_FILENO, &former_) == 0) {
      silent = former_;
      silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);
      silent.c_lflag |= static_cast<tcflag_t>(ECHONL) | static_cast<tcflag_t>(ICANON);
      changed_ = tcsetattr(STDIN_FILENO, TCSAFLUSH, &silent) == 0;
    }
  }
  ~Unseen() {
    if (changed_) {
      tcsetattr(STDIN_FILENO, TCSAFLUSH, &former_);
    }
    sigprocmask(SIG_SETMASK, &former_mask_, nullptr);
  }
  Unseen(const Unseen&) = delete;
  Unseen& operator=(const Unseen&) = delete;

  bool ok() const { return changed_; }

 private:
  termios former_{};
  sigset_t former_mask_{};
  bool changed_ = false;
};

std::string AskLine(const std::string& question) {
  std::cerr << question << std::flush;
  std::string line;
  LineReader(STDIN_FILENO, kLongestAnswer).Next(&line);
  return line;
}

}  // namespace

std::size_t TerminalWidth(int fd) {
  if (isatty(fd) == 0) {
    return 0;
  }
  winsize size{};
  return ioctl(fd, TIOCGWINSZ, &size) == 0 && size.ws_col != 0 ? size.ws_col : kUsualWidth;
}

bool CanAsk() {
  return isatty(STDIN_FILENO) != 0 && isatty(STDERR_FILENO) != 0;
}

bool Confirm(const std::string& question) {
  const std::string answer = AskLine(question + " [y/N] ");
  return answer == "y" || answer == "Y" || answer == "yes";
}

std::string AskPassword() {
  if (!CanAsk()) {
    throw Failure(ExitStatus::kUsage, "--password: needs a terminal; there is --password-stdin");
  }
  const Unseen unseen;
  if (!unseen.ok()) {
    throw SystemFailure("the terminal cannot be kept from showing the password");
  }
  std::string first = AskLine("Password: ");
  StopIfInterrupted();
  const std::string second = AskLine("The same again: ");
  StopIfInterrupted();
  if (first != second) {
    throw Failure(ExitStatus::kUsage, "--password: the two are not the same");
  }
  return first;
}

}  // namespace cli
