#include "concurrency/figure.h"

#include <algorithm>
#include <cstdio>

namespace tuvo_test {

Measure::~Measure() {
  const auto taken = std::chrono::steady_clock::now() - begin_;
  const auto time =
      static_cast<long>(std::chrono::duration_cast<std::chrono::microseconds>(taken).count());
  ++figure_.calls;
  figure_.all += time;
  long longest = figure_.longest;
  while (time > longest && !figure_.longest.compare_exchange_weak(longest, time)) {
  }
}

void Tell(const char* name, const Figure& figure) {
  const long calls = figure.calls;
  const double mean = static_cast<double>(figure.all) / static_cast<double>(std::max(calls, 1L));
  std::printf("%-8s %8ld  mean %8.1f ms  longest %8.1f ms\n", name, calls, mean / 1000,
              static_cast<double>(figure.longest) / 1000);
}

}  // namespace tuvo_test
