// libpam, loaded with the process's first account login and kept from then on: most processes check
// none, and need not wait for libpam and the libraries that it brings at every start.
#ifndef TUVO_PLATFORM_PAM_LIBRARY_H_
#define TUVO_PLATFORM_PAM_LIBRARY_H_

#include <security/pam_appl.h>

namespace tuvo_platform {

class PamLibrary {
 public:
  // libpam's functions; null, with a line in the log that names the PAM service, when they cannot
  // be loaded. The next call tries again.
  static const PamLibrary* Get(const char* service);

  decltype(pam_start)* start;
  decltype(pam_end)* end;
  decltype(pam_set_item)* set_item;
  decltype(pam_get_item)* get_item;
  decltype(pam_authenticate)* authenticate;
  decltype(pam_acct_mgmt)* acct_mgmt;
  decltype(pam_strerror)* strerror;

 private:
  // Throws std::runtime_error with the loader's reason.
  PamLibrary();
};

}  // namespace tuvo_platform

#endif  // TUVO_PLATFORM_PAM_LIBRARY_H_
