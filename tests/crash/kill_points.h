// Ends this process by SIGKILL at a chosen call that changes a file or a lock.
#ifndef TESTS_CRASH_KILL_POINTS_H_
#define TESTS_CRASH_KILL_POINTS_H_

namespace tuvo_test {

enum class Death {
  kBeforeACall,
  kWithinAWrite,  // only writes count; half of the bytes have got through
};

// From now on counts this process's calls; before the `number`-th, from 1, or within it, the
// process dies.
void KillAt(long number, Death death);

}  // namespace tuvo_test

#endif  // TESTS_CRASH_KILL_POINTS_H_
