// What every fuzz target is made of: one function that meets one input, and the way in which it
// says that something is wrong. The same function is driven by libFuzzer (scripts/fuzz) and, over
// the kept inputs alone, by replay_main.cpp (scripts/test).
#ifndef TESTS_FUZZ_TARGET_H_
#define TESTS_FUZZ_TARGET_H_

#include <cstddef>
#include <cstdint>
#include <string>

// Answers 0. Ends the process when a check fails.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size);

namespace fuzz {

// Ends the process, with `what` on standard error, unless `holds`.
void Require(bool holds, const char* what);

// The same for two texts that have to be equal; both are printed, with escapes, when they are not.
void RequireEqual(const std::string& actual, const std::string& expected, const char* what);

}  // namespace fuzz

#endif  // TESTS_FUZZ_TARGET_H_
