// Makes single allocations of C++ fail, in this program and in the library that it tests, and tells
// what one held when it was freed. It replaces the operators of the whole program: to be included
// by one of its files.
#ifndef TESTS_PLATFORM_FAILING_ALLOCATIONS_H_
#define TESTS_PLATFORM_FAILING_ALLOCATIONS_H_

#include <algorithm>
#include <cstdlib>
#include <new>

namespace tuvo_test {

// The allocation that this counts down to fails. Negative: none does.
inline long allocations_left = -1;

inline void* Allocate(std::size_t size) {
  if (allocations_left >= 0 && allocations_left-- == 0) {
    return nullptr;
  }
  return std::malloc(size == 0 ? 1 : size);
}

// A piece of memory to be looked at when it is freed (only its beginning is known by its address),
// and what was seen.
inline const char* watched = nullptr;
inline std::size_t watched_size = 0;
inline bool watched_was_freed = false;
inline bool watched_was_zero = false;

inline void Free(void* memory) {
  if (memory != nullptr && memory == watched) {
    watched_was_freed = true;
    watched_was_zero =
        std::all_of(watched, watched + watched_size, [](char c) { return c == '\0'; });
    watched = nullptr;
  }
  std::free(memory);
}

}  // namespace tuvo_test

// Not inlined: the compiler would see `free` meet a call of `operator new` and object.
#define NOT_INLINED __attribute__((noinline))

NOT_INLINED void* operator new(std::size_t size) {
  void* memory = tuvo_test::Allocate(size);
  if (memory == nullptr) {
    throw std::bad_alloc();
  }
  return memory;
}
NOT_INLINED void* operator new(std::size_t size, const std::nothrow_t& /*nothrow*/) noexcept {
  return tuvo_test::Allocate(size);
}
NOT_INLINED void operator delete(void* memory) noexcept {
  tuvo_test::Free(memory);
}
NOT_INLINED void operator delete(void* memory, std::size_t /*size*/) noexcept {
  tuvo_test::Free(memory);
}
NOT_INLINED void operator delete(void* memory, const std::nothrow_t& /*nothrow*/) noexcept {
  tuvo_test::Free(memory);
}

#undef NOT_INLINED

#endif  // TESTS_PLATFORM_FAILING_ALLOCATIONS_H_
