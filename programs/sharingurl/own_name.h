// What this machine is called, or reached under, when nobody says so.
#ifndef PROGRAMS_SHARINGURL_OWN_NAME_H_
#define PROGRAMS_SHARINGURL_OWN_NAME_H_

#include <ifaddrs.h>

#include <string>
#include <string_view>

namespace sharingurl {

// Whether `name` is one that others may know the machine by: a host name with a dot in it that is
// not one of every machine's own, such as "localhost.localdomain", in any case of its letters.
bool IsFullName(std::string_view name);

// The first address, IPv4 before IPv6 (which changes more often), of an interface that is up and no
// loopback: as it goes into an address. Loopback addresses and those that are not usable (host.h)
// do not count. Empty when there is none.
std::string FirstGlobalAddress(const ifaddrs* interfaces);

// The host's fully qualified name when it has one that resolves; else FirstGlobalAddress of this
// machine; else its host name; empty when not even that can stand in an address. Asks the resolver,
// for a few seconds at most for each of its servers.
std::string OwnName();

}  // namespace sharingurl

#endif  // PROGRAMS_SHARINGURL_OWN_NAME_H_
