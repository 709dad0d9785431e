// Hosts as they stand in addresses.
#ifndef PROGRAMS_SHARINGURL_HOST_H_
#define PROGRAMS_SHARINGURL_HOST_H_

#include <netinet/in.h>

#include <optional>
#include <string>
#include <string_view>

namespace sharingurl {

// Whether others may open the address: one that is unspecified (0.0.0.0/8, ::), multicast, reserved
// or of one network segment alone (link-local) is not usable. Loopback is, on the machine itself.
// An IPv4 address written as IPv6 (::ffff:...) is what the IPv4 address is.
bool IsUsable(const in_addr& address);
bool IsUsable(const in6_addr& address);

// Whether `text` can be the name of a host: at most 253 characters, in labels of 1 to 63 letters,
// digits, '-' and '_' that neither begin nor end with '-'. A name whose last label is a number,
// which browsers take for an IPv4 address, is none; nor is one that ends in a dot.
bool IsHostName(std::string_view text);

// The host as it goes into an address: a name or an IPv4 address as it is, an IPv6 address (given
// with or without brackets) in its shortest form and in brackets. Nothing for everything else,
// addresses that are not usable and IPv6 addresses with a zone (they mean something on one machine
// alone) among it.
std::optional<std::string> HostInAddress(std::string_view text);

}  // namespace sharingurl

#endif  // PROGRAMS_SHARINGURL_HOST_H_
