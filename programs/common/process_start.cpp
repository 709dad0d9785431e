#include "common/process_start.h"

#include <fcntl.h>
#include <unistd.h>

#include <csignal>
#include <initializer_list>

namespace common {

bool StartProcess() {
  (void)std::signal(SIGCHLD, SIG_DFL);
  // From the lowest on: open takes the lowest that is free.
  for (const int fd : {STDIN_FILENO, STDOUT_FILENO, STDERR_FILENO}) {
    const int wrong_way = fd == STDIN_FILENO ? O_WRONLY : O_RDONLY;
    if (fcntl(fd, F_GETFD) < 0 && open("/dev/null", wrong_way) != fd) {
      return false;
    }
  }
  return true;
}

}  // namespace common
