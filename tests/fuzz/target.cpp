#include "target.h"

#include <cstdio>
#include <cstdlib>

namespace fuzz {

namespace {

void Print(const char* name, const std::string& text) {
  std::fprintf(stderr, "  %s: \"", name);
  for (const char c : text) {
    if (c >= ' ' && c < '\x7f' && c != '\\') {
      std::fputc(c, stderr);
    } else {
      std::fprintf(stderr, "\\x%02x", static_cast<unsigned int>(static_cast<unsigned char>(c)));
    }
  }
  std::fputs("\"\n", stderr);
}

}  // namespace

void Require(bool holds, const char* what) {
  if (!holds) {
    std::fprintf(stderr, "does not hold: %s\n", what);
    std::abort();
  }
}

void RequireEqual(const std::string& actual, const std::string& expected, const char* what) {
  if (actual != expected) {
    std::fprintf(stderr, "differs: %s\n", what);
    Print("actual", actual);
    Print("expected", expected);
    std::abort();
  }
}

}  // namespace fuzz
