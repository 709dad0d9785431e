// The platform's auto-block service: failed logins are counted per address and service, in a file
// that all processes share, and an address that fails too often is denied for a while.
//
// The limits come from /usr/tuvo/etc/autoblock.conf (lines `name = value`; defaults in brackets):
// `failures` [10] within `window_seconds` [300] deny the address for `block_seconds` [1800].
// A missing file, or a value that is no whole number from 1 to 2147483647, means the default. The
// file is read at each counted failure.
//
// IPv6 addresses count per /64, since one visitor commonly owns all of it; an IPv4 address written
// as IPv6 counts as the IPv4 address.
//
// The file, /usr/tuvo/etc/private/session/autoblock.db, belongs to uid 1 and gid 1. A process that
// runs as root, or keeps root as its real or saved id, takes these as its effective ids for the
// call; any other process uses the file as far as its permissions let it.
#ifndef TUVOPLATFORM_AUTO_BLOCK_H_
#define TUVOPLATFORM_AUTO_BLOCK_H_

#include <tuvoplatform/export.h>

#ifdef __cplusplus
extern "C" {
#endif

// Counts one failed login of `ip` at `service` (1 to 64 bytes); the one that reaches the limit
// denies the address, at every service. The failures are forgotten with that, and a failure of an
// address that is denied already is not counted: the denial is neither lost nor made longer.
// Returns 0; -1 when an argument is null or no such text, or the count could not be kept. Each
// failure logs one line "auto_block:<line> <reason>".
TUVOPLATFORM_API int AutoBlockFailLoginSet(const char* ip, const char* service);

// Forgets every failed login of `ip`, at any service, and lifts its denial.
// Returns 0; -1 as above.
TUVOPLATFORM_API int TUVOAutoBlockFailLoginReset(const char* ip);

// Returns 1 while `ip` is denied, 0 while it is not, -1 when that cannot be told (logged).
TUVOPLATFORM_API int TuvoCgiIsDeniedIP(const char* ip);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_AUTO_BLOCK_H_
