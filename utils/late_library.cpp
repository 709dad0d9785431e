#include <dlfcn.h>
#include <internal/late_library.h>

#include <stdexcept>
#include <string>

namespace TUVO::sharing::internal {

namespace {

[[noreturn]] void Throw(const char* soname) {
  const char* reason = dlerror();
  throw std::runtime_error(reason != nullptr ? reason : std::string(soname) + " is not usable");
}

}  // namespace

LateLibrary::LateLibrary(const char* soname) : soname_(soname) {
  if (dlopen(soname, RTLD_NOW | RTLD_GLOBAL) == nullptr) {
    Throw(soname);
  }
}

void* LateLibrary::Address(const char* name) const {
  void* address = dlsym(RTLD_DEFAULT, name);
  if (address == nullptr) {
    Throw(soname_);
  }
  return address;
}

}  // namespace TUVO::sharing::internal
