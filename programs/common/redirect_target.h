// Where a link may send its visitor on to.
#ifndef PROGRAMS_COMMON_REDIRECT_TARGET_H_
#define PROGRAMS_COMMON_REDIRECT_TARGET_H_

#include <optional>
#include <string>
#include <string_view>

namespace common {

// `uri` as it goes into a Location header: an http or https address, or a path on this server
// (absolute or relative; with query and fragment). Bytes that cannot stand in an address are
// percent-encoded. Nothing for everything else: other schemes, "//host" and its spellings with
// backslashes, texts that hold control characters, the empty text.
std::optional<std::string> RedirectTarget(std::string_view uri);

// Whether such a target leads to a host named in it.
bool NamesHost(std::string_view uri);

}  // namespace common

#endif  // PROGRAMS_COMMON_REDIRECT_TARGET_H_
