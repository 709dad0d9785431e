// Where lack of memory ends: operations answer, they do not throw.
#ifndef INTERNAL_CONTAINED_H_
#define INTERNAL_CONTAINED_H_

#include <exception>

namespace TUVO::sharing {

// What `operation` returns, or `failure` when it throws. Whatever it made is released by then, and
// the effective ids are back.
template <typename Operation, typename Answer = bool>
Answer Contained(Operation operation, Answer failure = Answer()) {
  try {
    return operation();
  } catch (const std::exception&) {
    return failure;
  }
}

}  // namespace TUVO::sharing

#endif  // INTERNAL_CONTAINED_H_
