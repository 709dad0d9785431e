// The whole address of a link.
#ifndef PROGRAMS_OWNER_LINK_ADDRESS_H_
#define PROGRAMS_OWNER_LINK_ADDRESS_H_

#include <tuvosharing/entry.h>

#include <string>

namespace owner {

// Where this request reached the server; what the address tool falls back on for the port.
struct ServerPlace {
  int port = 0;  // 0: the scheme's own
  bool https = false;
};

struct LinkAddress {
  std::string url;  // empty: the tool had no answer (logged)
  int type = -1;    // the tool's number
};

// Asks the platform's address tool, a process of its own.
LinkAddress AddressOf(const TUVO::sharing::record::Entry& link, const ServerPlace& place);

}  // namespace owner

#endif  // PROGRAMS_OWNER_LINK_ADDRESS_H_
