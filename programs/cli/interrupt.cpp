#include "cli/interrupt.h"

#include <poll.h>

#include <array>
#include <csignal>
#include <cstdlib>

namespace cli {

namespace {

volatile std::sig_atomic_t noted = 0;

extern "C" void Note(int signal) {
  if (noted != 0) {
    (void)std::signal(signal, SIG_DFL);
    (void)std::raise(signal);
    return;
  }
  noted = signal;
}

constexpr std::array<int, 4> kSignals = {SIGINT, SIGQUIT, SIGTERM, SIGHUP};

// The noted signals wait for a scope.
class Held {
 public:
  Held() {
    sigset_t signals;
    sigemptyset(&signals);
    for (const int signal : kSignals) {
      sigaddset(&signals, signal);
    }
    sigprocmask(SIG_BLOCK, &signals, &former_);
  }
  ~Held() { sigprocmask(SIG_SETMASK, &former_, nullptr); }
  Held(const Held&) = delete;
  Held& operator=(const Held&) = delete;

  const sigset_t* Former() const { return &former_; }

 private:
  sigset_t former_{};
};

void NoteSignal(int signal) {
  struct sigaction action {};
  if (sigaction(signal, nullptr, &action) != 0 || action.sa_handler == SIG_IGN) {
    return;
  }
  action = {};
  action.sa_handler = Note;  // without SA_RESTART: whatever waits is to end
  sigemptyset(&action.sa_mask);
  sigaction(signal, &action, nullptr);
}

}  // namespace

void NoteSignals() {
  (void)std::signal(SIGXFSZ, SIG_IGN);
  for (const int signal : kSignals) {
    NoteSignal(signal);
  }
}

int NotedSignal() {
  return noted;
}

void StopIfInterrupted() {
  if (noted != 0) {
    throw Interruption();
  }
}

void WaitForInput(int fd) {
  const Held held;
  StopIfInterrupted();
  pollfd input{fd, POLLIN, 0};
  (void)ppoll(&input, 1, nullptr, held.Former());
  StopIfInterrupted();
}

void WaitForOutput(int fd) {
  constexpr timespec kNoTime{};
  const Held held;
  pollfd output{fd, POLLOUT, 0};
  // After a signal nothing is waited for, but what can be said is.
  const timespec* most = noted != 0 ? &kNoTime : nullptr;
  if (ppoll(&output, 1, most, held.Former()) < 1) {
    StopIfInterrupted();
  }
}

void EndBySignal(int signal) {
  (void)std::signal(signal, SIG_DFL);
  (void)std::raise(signal);
  // cppcheck-suppress unreachableCode  ; a signal that is blocked does not end the process
  std::abort();
}

}  // namespace cli
