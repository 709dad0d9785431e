#include "common/core_dump.h"

#include <sys/prctl.h>
#include <sys/resource.h>

namespace common {

void ForbidCore() {
  constexpr rlimit kNone{};
  (void)setrlimit(RLIMIT_CORE, &kNone);
#ifndef __SANITIZE_ADDRESS__
  (void)prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
#endif
}

}  // namespace common
