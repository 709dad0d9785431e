#include "webapi/caller_limits.h"

#include <sys/resource.h>
#include <sys/time.h>
#include <syslog.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>

namespace webapi {

namespace {

// The database's files, its connection's temporary ones, a pipe, the configuration and the log need
// half of it.
constexpr rlim_t kFewestDescriptors = 32;

constexpr rlim_t kLargeStack = rlim_t{8} << 20;

extern "C" void DoNothing(int /*signal*/) {}

// Unlike one that is ignored, a signal that has a handler is back at its default in what this
// process executes.
void Survive(int signal) {
  struct sigaction action {};
  action.sa_handler = DoNothing;
  action.sa_flags = SA_RESTART;
  (void)sigaction(signal, &action, nullptr);
}

// Whether it works out or not; the one that belongs to the user alone can be taken at least.
template <typename Resource>
void Lift(Resource resource, rlim_t enough) {
  struct rlimit limit {};
  if (getrlimit(resource, &limit) != 0) {
    return;
  }
  const struct rlimit wanted { std::max(limit.rlim_cur, enough), std::max(limit.rlim_max, enough) };
  if (setrlimit(resource, &wanted) != 0) {
    limit.rlim_cur = std::min(wanted.rlim_cur, limit.rlim_max);
    (void)setrlimit(resource, &limit);
  }
}

}  // namespace

bool TakeDescriptors() {
  closefrom(STDERR_FILENO + 1);
  struct rlimit limit {};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) {
    syslog(LOG_ERR, "caller_limits:%d getrlimit failed: %s", __LINE__, std::strerror(errno));
    return false;
  }
  limit.rlim_cur = limit.rlim_max;
  if (setrlimit(RLIMIT_NOFILE, &limit) != 0 || limit.rlim_cur < kFewestDescriptors) {
    syslog(LOG_ERR, "caller_limits:%d too few files may be open", __LINE__);
    return false;
  }
  return true;
}

void OutliveCallersSignals() {
  for (const int signal :
       {SIGALRM, SIGVTALRM, SIGPROF, SIGXCPU, SIGXFSZ, SIGINT, SIGQUIT, SIGHUP}) {
    Survive(signal);
  }
  // Those that are set stay set over an exec.
  const struct itimerval none {};
  for (const auto timer : {ITIMER_REAL, ITIMER_VIRTUAL, ITIMER_PROF}) {
    (void)setitimer(timer, &none, nullptr);
  }
  (void)std::signal(SIGTSTP, SIG_IGN);
  (void)std::signal(SIGTTIN, SIG_IGN);
  (void)std::signal(SIGTTOU, SIG_IGN);
}

void LiftLimits() {
  for (const auto resource : {RLIMIT_CPU, RLIMIT_FSIZE, RLIMIT_AS, RLIMIT_DATA, RLIMIT_RTTIME}) {
    Lift(resource, RLIM_INFINITY);
  }
  Lift(RLIMIT_STACK, kLargeStack);
}

}  // namespace webapi
