// Waiting for a file that another process has locked.
#ifndef PLATFORM_SRC_DATABASE_WAIT_H_
#define PLATFORM_SRC_DATABASE_WAIT_H_

#include <chrono>

struct sqlite3;

namespace tuvo_platform {

// How long a statement waits for a locked file.
constexpr std::chrono::milliseconds kBusyWait{10000};

// Makes a statement of the connection wait for locks, `*longest` at most, counted from the first
// one that it meets. `*longest` must stay where it is for as long as that holds: `kBusyWait` does.
// Returns SQLite's code.
int SetBusyWait(sqlite3* sqlite, const std::chrono::milliseconds* longest = &kBusyWait);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_DATABASE_WAIT_H_
