// A library that is loaded when it is first needed, not with the program.
//
// Most processes answer one request and make no digest, and what the loader does for libcrypto
// alone takes longer than that request. A library stays loaded for the life of the process.
#ifndef INTERNAL_LATE_LIBRARY_H_
#define INTERNAL_LATE_LIBRARY_H_

#include <internal/log.h>

#include <cerrno>
#include <exception>

namespace TUVO::sharing::internal {

class LateLibrary {
 public:
  // Loads the library into the scope that all of the process see, where the loader would have put
  // it. Throws std::runtime_error with the loader's reason when it cannot.
  explicit LateLibrary(const char* soname);

  // The function by its name, whatever its version: a definition that comes earlier in the process
  // goes before the library's. Throws std::runtime_error when there is none.
  template <typename Function>
  Function* Find(const char* name) const {
    return reinterpret_cast<Function*>(Address(name));
  }

 private:
  void* Address(const char* name) const;
  const char* const soname_;
};

// The one `Functions`, whose default constructor finds what it needs in a LateLibrary; null, with
// a line in the log, when that throws. Then the next call tries again: a process that was out of
// descriptors for a moment does not refuse passwords for the rest of its life. Leaves errno alone,
// which the loader does not.
template <typename Functions>
const Functions* LateFunctions() {
  const int error = errno;
  const Functions* found = nullptr;
  try {
    static const Functions functions;
    found = &functions;
  } catch (const std::exception& failure) {
    SHARING_LOG("%s", failure.what());
  }
  errno = error;
  return found;
}

}  // namespace TUVO::sharing::internal

#endif  // INTERNAL_LATE_LIBRARY_H_
