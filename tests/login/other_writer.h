// A process that writes to the database file while a test's own does.
#ifndef TESTS_LOGIN_OTHER_WRITER_H_
#define TESTS_LOGIN_OTHER_WRITER_H_

#include <sys/types.h>

#include <chrono>
#include <string>

namespace tuvo_test {

// Starts a process that holds the file for writing, has run `change` and commits after `hold`.
// Returns when the change is made, with the process's id, which the caller waits for; it ends with
// 0.
pid_t StartWriter(const std::string& change,
                  std::chrono::milliseconds hold = std::chrono::milliseconds(500));

}  // namespace tuvo_test

#endif  // TESTS_LOGIN_OTHER_WRITER_H_
