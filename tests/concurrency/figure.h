// How long calls take, measured by many processes together.
#ifndef TESTS_CONCURRENCY_FIGURE_H_
#define TESTS_CONCURRENCY_FIGURE_H_

#include <atomic>
#include <chrono>

namespace tuvo_test {

// Times are in microseconds. Lies in shared memory.
struct Figure {
  std::atomic<long> calls;
  std::atomic<long> longest;
  std::atomic<long> all;
};

// Measures one call, until the end of its scope.
class Measure {
 public:
  explicit Measure(Figure& figure) : figure_(figure) {}
  ~Measure();
  Measure(const Measure&) = delete;
  Measure& operator=(const Measure&) = delete;

 private:
  Figure& figure_;
  const std::chrono::steady_clock::time_point begin_ = std::chrono::steady_clock::now();
};

// Prints one line about it.
void Tell(const char* name, const Figure& figure);

}  // namespace tuvo_test

#endif  // TESTS_CONCURRENCY_FIGURE_H_
