#include "common/core_dump.h"

#include <sys/prctl.h>
#include <sys/resource.h>

namespace common {

void ForbidCore() {
  // Not 0: where cores are handed to a program (a pipe in core_pattern) the system passes over
  // every limit but 1, at which it hands out nothing. No file is that small, so that none is left
  // either.
  constexpr rlimit kTooSmall{1, 1};
  (void)setrlimit(RLIMIT_CORE, &kTooSmall);
#ifndef __SANITIZE_ADDRESS__
  (void)prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
#endif
}

}  // namespace common
