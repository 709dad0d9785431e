// A program of the platform and the stream of what it prints, for the length of a scope.
#ifndef INTERNAL_POPEN_H_
#define INTERNAL_POPEN_H_

#include <internal/log.h>
#include <tuvoplatform/process.h>

#include <cstdio>
#include <string>
#include <vector>

namespace TUVO::sharing::internal {

// What the guard's line in the system log names: this header by its place, and not by its name
// alone as the other lines do, since it is part of several source files.
constexpr std::string_view kPopenSource = "include/internal/popen";

class Popen {
 public:
  // Starts the program at `path`, without a shell. `arguments` begins with the program's own name;
  // each is handed over up to its first NUL byte. A failure is logged and leaves `file` null.
  Popen(const char* path, const std::vector<std::string>& arguments) {
    std::vector<const char*> argv;
    argv.reserve(arguments.size() + 1);
    for (const std::string& argument : arguments) {
      argv.push_back(argument.c_str());
    }
    argv.push_back(nullptr);
    file = TLIBCPopenv(path, "r", argv.data());
    if (file == nullptr) {
      LogErrorWithPid(kPopenSource, __LINE__, "TLIBCPopenv failed.\n");
    }
  }
  Popen(const Popen&) = delete;
  Popen& operator=(const Popen&) = delete;

  // Closes the stream and waits for the program's end, so that no exit of a scope, exceptions
  // included, leaves a descriptor or a zombie behind.
  ~Popen() {
    if (file != nullptr) {
      TLIBCPclose(file);
    }
  }

  // What the program prints; null when it could not be started.
  FILE* file = nullptr;
};

}  // namespace TUVO::sharing::internal

#endif  // INTERNAL_POPEN_H_
