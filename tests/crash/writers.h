// Processes that use the library and are killed in the middle of it, and what is on record of each:
// what it was told is done, and what it was doing.
#ifndef TESTS_CRASH_WRITERS_H_
#define TESTS_CRASH_WRITERS_H_

#include <array>
#include <atomic>
#include <cstddef>

namespace tuvo_test {

constexpr int kWriters = 4;
constexpr int kMaxLinks = 4000;
constexpr int kMaxVisits = 20000;
constexpr int kUseLimit = 120;  // of the link that all log in to
constexpr std::size_t kIdRoom = 40;

using Id = std::array<char, kIdRoom>;

// A call sets what it is doing before, and what is done, then kNothing, after.
enum Doing {
  kNothing,
  kCreating,
  kChanging,
  kDeleting,
  kCounting,
  kVisiting,
  kLoggingOut,
  kAllOut
};

// A link that one writer alone writes to.
struct WrittenLink {
  Id hash;
  int generation;
  int uses;
  bool there;
};

// A login that was acknowledged.
struct Visit {
  Id session;
  int link;     // of the writer's; -1: the one that all log in to
  bool inside;  // not logged out since
};

struct WriterRecord {
  int links;
  int visits;
  int admitted;  // to the link that all log in to
  Doing doing;
  int link;   // which it is doing that to; -1: the one that all log in to
  int visit;  // the same
  std::array<WrittenLink, kMaxLinks> link_at;
  std::array<Visit, kMaxVisits> visit_at;
};

struct Record {
  Id limited_link;
  std::atomic<int> calls;  // begun, by all of them
  std::atomic<bool> stop;
  std::atomic<int> failed_calls;
  std::array<char, 300> failure;  // one of them
  std::array<WriterRecord, kWriters> writer;
};

// The owner of a writer's links.
unsigned int OwnerOf(int writer);

// One writer: call after call, until told to stop. `seed` decides which.
void Write(Record& record, int writer, unsigned int seed);

}  // namespace tuvo_test

#endif  // TESTS_CRASH_WRITERS_H_
