#include "common/stop_signal.h"

#include <fcntl.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <system_error>

namespace common {

namespace {

// What a signal's handler may look at.
volatile std::sig_atomic_t stop_came = 0;
volatile std::sig_atomic_t listening_fd = -1;
volatile std::sig_atomic_t nothing_fd = -1;

extern "C" void OnStop(int /*signal*/) {
  const int error = errno;
  stop_came = 1;
  dup2(nothing_fd, listening_fd);
  errno = error;
}

[[noreturn]] void Fail(const char* what) {
  throw std::system_error(errno, std::generic_category(), what);
}

}  // namespace

void EndByStopSignal(int listening) {
  listening_fd = listening;
  nothing_fd = open("/dev/null", O_RDONLY | O_CLOEXEC);
  if (nothing_fd < 0) {
    Fail("/dev/null");
  }
  // Interrupted calls are restarted: an accept then finds no socket, all others go on.
  struct sigaction action {};
  action.sa_handler = OnStop;
  action.sa_flags = SA_RESTART;
  if (sigaction(SIGTERM, &action, nullptr) != 0) {
    Fail("SIGTERM");
  }
}

bool StopSignalCame() {
  return stop_came != 0;
}

}  // namespace common
