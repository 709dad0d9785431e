#include "common/core_dump.h"

#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/resource.h>

#include "support/child.h"

namespace common {
namespace {

// 0: neither a file, which the limit is too small for, nor by a program, which a limit of 0 would
// not keep from it. A build with the address sanitizer stays open to its leak check.
int CoresAfterForbidding() {
  const rlimit much{RLIM_INFINITY, RLIM_INFINITY};
  (void)setrlimit(RLIMIT_CORE, &much);
  ForbidCore();
  rlimit now{};
  if (getrlimit(RLIMIT_CORE, &now) != 0 || now.rlim_cur != 1 || now.rlim_max != 1) {
    return 1;
  }
#ifndef __SANITIZE_ADDRESS__
  return prctl(PR_GET_DUMPABLE, 0, 0, 0, 0);
#else
  return 0;
#endif
}

TEST(CoreDump, ThereIsNone) {
  EXPECT_EQ(0, tuvo_test::RunInChild(CoresAfterForbidding));
}

}  // namespace
}  // namespace common
