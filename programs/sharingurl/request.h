// What the tool is asked.
#ifndef PROGRAMS_SHARINGURL_REQUEST_H_
#define PROGRAMS_SHARINGURL_REQUEST_H_

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "sharingurl/address.h"

namespace sharingurl {

struct Request {
  int port = 0;  // 0: the scheme's own
  bool https = false;
  std::optional<Address> instead;  // instead of the configured address
  std::string hash;
};

// Reads the arguments behind the program's name: project, port, "1" for https or "0", a host or
// address or the empty text, hash. The project has no part in the address; like all of them it must
// not have control characters. Otherwise, what is wrong with them.
std::variant<Request, std::string> ReadRequest(const std::vector<std::string>& arguments);

}  // namespace sharingurl

#endif  // PROGRAMS_SHARINGURL_REQUEST_H_
