#include "pam_library.h"

#include <dlfcn.h>
#include <syslog.h>

#include <exception>
#include <stdexcept>

namespace tuvo_platform {

namespace {

[[noreturn]] void Throw() {
  const char* reason = dlerror();
  throw std::runtime_error(reason != nullptr ? reason : TUVO_LIBPAM_SONAME " is not usable");
}

// As a program linked with libpam would get it.
template <typename Function>
void Find(const char* name, Function*& function) {
  function = reinterpret_cast<Function*>(dlsym(RTLD_DEFAULT, name));
  if (function == nullptr) {
    Throw();
  }
}

}  // namespace

PamLibrary::PamLibrary() {
  // For all of the process to see: there are PAM modules that name no libpam and count on finding
  // it.
  if (dlopen(TUVO_LIBPAM_SONAME, RTLD_NOW | RTLD_GLOBAL) == nullptr) {
    Throw();
  }
  Find("pam_start", start);
  Find("pam_end", end);
  Find("pam_set_item", set_item);
  Find("pam_get_item", get_item);
  Find("pam_authenticate", authenticate);
  Find("pam_acct_mgmt", acct_mgmt);
  Find("pam_strerror", strerror);
}

const PamLibrary* PamLibrary::Get(const char* service) {
  try {
    static const PamLibrary library;
    return &library;
  } catch (const std::exception& failure) {
    syslog(LOG_ERR, "pam_library:%d PAM service %s: %s", __LINE__, service, failure.what());
    return nullptr;
  }
}

}  // namespace tuvo_platform
