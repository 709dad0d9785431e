// The beginning of links' addresses, as somebody configures or demands it.
#ifndef PROGRAMS_SHARINGURL_ADDRESS_H_
#define PROGRAMS_SHARINGURL_ADDRESS_H_

#include <optional>
#include <string>
#include <string_view>

namespace sharingurl {

struct Address {
  std::optional<bool> https;  // nothing: the text had no scheme
  std::string host;           // as HostInAddress gives it
  int port = 0;               // 0: the text had none
  std::string prefix;  // the path: empty, or with a slash at its beginning and none at its end
};

// Reads a port, 1 to 65535 in decimal digits alone; with `or_zero`, 0 too. Nothing for all else.
std::optional<int> ReadPort(std::string_view text, bool or_zero);

// Reads a host as HostInAddress does, possibly with ":port" (IPv6: in brackets then) and a single
// slash at the end; or a whole address: "http://" or "https://" (in any case) before a host (IPv6:
// in brackets) and, behind it, possibly a path of at most 1024 characters: letters, digits, '-',
// '.', '_', '~' and slashes, without the parts "." and "..". An empty part in the path is left out.
// Nothing for all else, so that nothing gets out of its place in an address, in a line or in a
// page.
std::optional<Address> ReadAddress(std::string_view text);

// The address of the link `hash`. What `address` leaves open is filled in: the scheme by `https`,
// the port by `port` (0: the scheme's own) unless `address` has a scheme, and with it is whole.
// The port is left out when it is the scheme's own.
std::string LinkAddress(const Address& address, bool https, int port, std::string_view hash);

}  // namespace sharingurl

#endif  // PROGRAMS_SHARINGURL_ADDRESS_H_
