// Makes one call into the system, or one allocation, of this program fail: the n-th. The program
// puts functions of its own before those of the C library, for itself and for every library in it,
// SQLite among them.
#ifndef TESTS_FAULTS_FAULT_POINTS_H_
#define TESTS_FAULTS_FAULT_POINTS_H_

#include <string>
#include <vector>

namespace tuvo_test {

// What can fail. Sets of them are made with |.
enum FaultKind : unsigned int {
  kNoFault = 0,
  kOpen = 1,        // EMFILE
  kRead = 2,        // EIO
  kWrite = 4,       // ENOSPC; making a file longer is one
  kSync = 8,        // EIO
  kLock = 16,       // EIO; a lock that is taken, not one that is given back
  kMap = 32,        // ENOMEM
  kMemory = 64,     // a null pointer; std::bad_alloc from operator new
  kIdentity = 128,  // EAGAIN; setresuid and setresgid
};
constexpr unsigned int kFiles = kOpen | kRead | kWrite | kSync | kLock | kMap;

// From now on counts the calls of these kinds; the `number`-th, from 1, fails, and none after it.
void FailAt(unsigned int kinds, long number);

// Ends the counting. Returns the kind that failed, kNoFault when fewer were reached.
FaultKind StopFailing();

// The calls counted since the last FailAt.
long FaultPointsCounted();

const char* NameOf(FaultKind kind);

// In its scope nothing is counted, and nothing fails: for what a test does for itself.
class NotCounted {
 public:
  NotCounted();
  ~NotCounted();
  NotCounted(const NotCounted&) = delete;
  NotCounted& operator=(const NotCounted&) = delete;

 private:
  unsigned int kinds_;
};

// What was written to the system log since the last call; nothing goes out to it.
std::vector<std::string> TakeLogged();

// The blocks of memory that are allocated now, without those of the log. 0 under a sanitizer, which
// keeps its own account.
long BlocksAlive();

}  // namespace tuvo_test

#endif  // TESTS_FAULTS_FAULT_POINTS_H_
