// The clock of the targets whose outcome depends on it.
#ifndef TESTS_FUZZ_FIXED_TIME_H_
#define TESTS_FUZZ_FIXED_TIME_H_

#include <ctime>

namespace fuzz {

// What time() answers in targets that are linked with fixed_time.cpp: a moment in June 2026.
constexpr std::time_t kNow = 1781000000;

}  // namespace fuzz

#endif  // TESTS_FUZZ_FIXED_TIME_H_
