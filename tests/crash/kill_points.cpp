#include "crash/kill_points.h"

#include <unistd.h>

#include <csignal>

#include "crash/file_calls.h"

namespace tuvo_test {

namespace {

long calls_left = 0;

// For a process of whatever identity: its own may always be ended.
void Die() {
  for (;;) {
    kill(getpid(), SIGKILL);
  }
}

void Count(const FileAction& /*action*/) {
  if (--calls_left == 0) {
    Die();
  }
}

void WriteHalf(const FileAction& action) {
  if (action.size < 2 || (action.call != FileCall::kWrite && action.call != FileCall::kAppend)) {
    return;
  }
  if (--calls_left == 0) {
    const ssize_t done = action.call == FileCall::kWrite
                             ? pwrite64(action.fd, action.bytes, action.size / 2, action.offset)
                             : write(action.fd, action.bytes, action.size / 2);
    (void)done;
    Die();
  }
}

}  // namespace

void KillAt(long number, Death death) {
  calls_left = number;
  WatchFiles(death == Death::kBeforeACall ? Count : WriteHalf);
}

}  // namespace tuvo_test
