// Many processes at work at once: starting them, letting them go at one instant, what they share,
// and what became of them.
#ifndef TESTS_CONCURRENCY_CREW_H_
#define TESTS_CONCURRENCY_CREW_H_

#include <sys/mman.h>
#include <sys/types.h>

#include <array>
#include <functional>
#include <new>
#include <stdexcept>
#include <vector>

#include "support/child.h"

namespace tuvo_test {

// A number from the environment, for the long forms of these tests; `usual` when it is not set.
long FromEnvironment(const char* name, long usual);

// A zeroed T that this process and those that it forks from now on have in common.
template <typename T>
class Shared {
 public:
  Shared() : memory_(mmap(nullptr, sizeof(T), PROT_READ | PROT_WRITE, kFlags, -1, 0)) {
    if (memory_ == MAP_FAILED) {
      throw std::runtime_error("mmap");
    }
    value_ = new (memory_) T;
  }
  ~Shared() { munmap(memory_, sizeof(T)); }
  Shared(const Shared&) = delete;
  Shared& operator=(const Shared&) = delete;

  T* operator->() const { return value_; }
  T& operator*() const { return *value_; }

 private:
  // Without reserving memory for it: tables are made as long as they could ever have to be.
  static constexpr int kFlags = MAP_SHARED | MAP_ANONYMOUS | MAP_NORESERVE;

  void* memory_;
  T* value_;
};

// Lets processes go on together. It opens for all when the last one that has it has come to Pass,
// or has ended, and the process that made it has called Open.
class Gate {
 public:
  Gate();
  ~Gate();
  Gate(const Gate&) = delete;
  Gate& operator=(const Gate&) = delete;

  void Pass();
  void Open();

 private:
  std::array<int, 2> ends_;
};

// Forks a process that takes `ids`, runs `body` and ends by exit, so that what belongs to the whole
// process is destroyed as in a real program; its status is what `body` returned. 254: an exception
// ended `body`; 252: the ids could not be taken.
pid_t Start(const Ids& ids, const std::function<int()>& body);

// Waits until `pid` ends; its status, or 256 plus the signal that ended it.
int Wait(pid_t pid);

// The same for all: how many did not end with 0.
int WaitForAll(const std::vector<pid_t>& pids);

// The identities that web programs start with: mostly root, for every fourth one the system's own
// and a user who can become root again.
const Ids& IdsOf(int process);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_CREW_H_
