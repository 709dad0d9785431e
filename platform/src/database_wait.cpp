#include "database_wait.h"

#include <sqlite3.h>

#include <algorithm>
#include <thread>

namespace tuvo_platform {

namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;

// SQLite's own waiting looks for the lock less and less often. Among many who want it, those who
// have just come then always find it before those who have long waited, until their time is up.
// Here it is the other way round, with a few quick looks at the beginning, since most locks are
// short.
milliseconds PauseAfter(Clock::duration waited) {
  if (waited < milliseconds(5)) {
    return milliseconds(1);
  }
  if (waited < milliseconds(500)) {
    return milliseconds(10);
  }
  return waited < milliseconds(2000) ? milliseconds(5) : milliseconds(1);
}

// Longer than from one look to the next, on whatever a busy machine: a wait that lies further back
// is over.
constexpr milliseconds kAnotherWait{1000};

// SQLite calls it before every further look for a lock, with 0 for a statement's first. While a
// statement is compiled it goes on counting from the statement before.
int Wait(void* longest, int looks) {
  thread_local Clock::time_point begin;
  thread_local Clock::time_point last;
  const Clock::time_point now = Clock::now();
  if (looks == 0 || now - last > kAnotherWait) {
    begin = now;
  }
  last = now;
  const Clock::duration waited = now - begin;
  const Clock::duration left = *static_cast<const milliseconds*>(longest) - waited;
  if (left <= Clock::duration::zero()) {
    return 0;
  }
  std::this_thread::sleep_for(std::min<Clock::duration>(PauseAfter(waited), left));
  return 1;
}

}  // namespace

int SetBusyWait(sqlite3* sqlite, const milliseconds* longest) {
  // Only read, by Wait above.
  return sqlite3_busy_handler(sqlite, Wait, const_cast<milliseconds*>(longest));
}

}  // namespace tuvo_platform
