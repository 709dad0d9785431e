#include "common/client_address.h"

#include <tuvoplatform/cgi.h>

#include <array>

namespace common {

std::string ClientAddress() {
  constexpr size_t kAddressSize = 65;
  std::array<char, kAddressSize> address{};
  return TuvoCgiGetRemoteIP(address.data(), address.size()) == 0 ? address.data() : "";
}

}  // namespace common
