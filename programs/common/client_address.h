// Where a request comes from.
#ifndef PROGRAMS_COMMON_CLIENT_ADDRESS_H_
#define PROGRAMS_COMMON_CLIENT_ADDRESS_H_

#include <string>

namespace common {

// The client's address as the web server gave it, in its canonical spelling; empty when there is
// none.
std::string ClientAddress();

}  // namespace common

#endif  // PROGRAMS_COMMON_CLIENT_ADDRESS_H_
