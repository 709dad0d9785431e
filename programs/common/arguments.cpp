#include "common/arguments.h"

#include <cstring>

namespace common {

void WipeArguments(int argc, char** argv) {
  for (int i = 1; i < argc; ++i) {
    explicit_bzero(argv[i], std::strlen(argv[i]));
  }
}

}  // namespace common
