// For tests that make allocations of C++ fail. A program that has failing_new.cpp among its sources
// defines MayAllocate.
#ifndef TESTS_SUPPORT_FAILING_NEW_H_
#define TESTS_SUPPORT_FAILING_NEW_H_

namespace tuvo_test {

// Whether the allocation that operator new is asked for succeeds. Asked once for each, whoever
// asks.
bool MayAllocate() noexcept;

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_FAILING_NEW_H_
