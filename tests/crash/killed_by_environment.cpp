// For a program that a test starts: TUVO_KILL_AT and TUVO_KILL_WITHIN_A_WRITE in its environment
// choose the call at which it dies.
#include <cstdlib>

#include "crash/kill_points.h"

namespace {

__attribute__((constructor)) void ReadEnvironment() {
  const char* number = std::getenv("TUVO_KILL_AT");
  if (number != nullptr) {
    const bool within = std::getenv("TUVO_KILL_WITHIN_A_WRITE") != nullptr;
    tuvo_test::KillAt(std::atol(number),
                      within ? tuvo_test::Death::kWithinAWrite : tuvo_test::Death::kBeforeACall);
  }
}

}  // namespace
