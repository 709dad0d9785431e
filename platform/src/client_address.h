// Spellings of network addresses.
#ifndef PLATFORM_SRC_CLIENT_ADDRESS_H_
#define PLATFORM_SRC_CLIENT_ADDRESS_H_

#include <optional>
#include <string>

namespace tuvo_platform {

// The one spelling of the address in `text`, as inet_ntop writes it: an IPv4 address that is
// written as IPv6 (::ffff:192.0.2.1) becomes the IPv4 address, the zone of a link-local address
// (fe80::1%eth0) is dropped. Nothing when `text` is null or no address.
std::optional<std::string> CanonicalAddress(const char* text);

// What stands for one visitor: the canonical IPv4 address, or the IPv6 address's /64 network
// ("2001:db8::/64"). Nothing when `text` is null or no address.
std::optional<std::string> VisitorNetwork(const char* text);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_CLIENT_ADDRESS_H_
