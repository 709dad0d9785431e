// Runs an operation again and again, each time in a process of its own that is killed at another of
// its calls, until one gets through.
#ifndef TESTS_CRASH_KILL_SWEEP_H_
#define TESTS_CRASH_KILL_SWEEP_H_

#include <functional>
#include <string>

#include "crash/kill_points.h"

namespace tuvo_test {

// What `operation` sets once it was told that it is done; outlives the process.
using Acknowledge = std::function<void()>;

struct KillSweep {
  std::string name;
  // In the test's own process, before each run.
  std::function<void()> prepare = [] {};
  // In the process, before the calls count.
  std::function<void()> begin = [] {};
  std::function<void(const Acknowledge&)> operation;
  // In the test's own process, after each run.
  std::function<void(bool acknowledged)> examine;
};

// Sweeps over the calls from the operation's begin to the end of its process, which what it leaves
// open is closed by; then over the writes alone, which get halfway through. Gives up after a few
// unmet expectations. Prints how many there were of both.
void SweepKills(const KillSweep& sweep);

// The same for any process: `run` starts one, told where to die, and returns its status, which is
// 256 + SIGKILL when it died. Returns how many did.
long SweepDeaths(const std::string& name, const std::function<int(long number, Death death)>& run);

}  // namespace tuvo_test

#endif  // TESTS_CRASH_KILL_SWEEP_H_
