#include "webapi/caller_limits.h"

#include <sys/resource.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstring>

namespace webapi {

namespace {

// The database's files, its connection's temporary ones, a pipe, the configuration and the log need
// half of it.
constexpr rlim_t kFewestDescriptors = 32;

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

void IgnoreTerminalStops() {
  (void)std::signal(SIGTSTP, SIG_IGN);
  (void)std::signal(SIGTTIN, SIG_IGN);
  (void)std::signal(SIGTTOU, SIG_IGN);
}

}  // namespace webapi
