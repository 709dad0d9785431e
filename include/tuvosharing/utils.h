// Strings, digests and dice that the library shares with its callers. No function here logs or
// throws for ordinary input; on a false result the output argument keeps what it held. Callable
// from any thread.
#ifndef TUVOSHARING_UTILS_H_
#define TUVOSHARING_UTILS_H_

#include <tuvosharing/export.h>

#include <string>
#include <vector>

namespace TUVO::sharing {

// Splits `str` at every occurrence of the whole text `separator` and replaces `out` by the pieces;
// empty pieces are left out, nothing is trimmed. False, `out` untouched, when `separator` is null.
// Precondition: `separator` is not the empty text (the call would not return).
TUVOSHARING_API bool StringExplode(std::vector<std::string>& out, const std::string& str,
                                   const char* separator);

// Replaces `out` by the MD5 digest of the password's bytes: 32 lower-case hexadecimal digits. False
// for an empty password and when the digest cannot be computed.
TUVOSHARING_API bool MD5HashPassword(const std::string& password, std::string& out);

// Replaces `out` by the SHA-1 digest of the password's bytes followed by the salt's: 40 lower-case
// hexadecimal digits. Both may be empty. False when memory runs out.
TUVOSHARING_API bool Sha1WithSaltHashPassword(const std::string& password, const std::string& salt,
                                              std::string& out);

// True with the given probability, which counts in whole per cent with the fraction cut off (0.015
// acts as 1 %, 0.009 as 0 %): never for 0 and below, always for 1 and above.
TUVOSHARING_API bool IsProbabilityHit(float probability);

// The text of a value as it goes into SQL and command lines: strings unchanged, integers in decimal
// with a minus sign and no grouping whatever the locale, booleans as "1" and "0". Exists for the
// five types below; any other does not link.
template <typename T>
std::string ToString(T& value);

// The five types.
template <>
TUVOSHARING_API std::string ToString<std::string>(std::string& value);
template <>
TUVOSHARING_API std::string ToString<bool>(bool& value);
template <>
TUVOSHARING_API std::string ToString<int const>(int const& value);
template <>
TUVOSHARING_API std::string ToString<long const>(long const& value);
template <>
TUVOSHARING_API std::string ToString<bool const>(bool const& value);

}  // namespace TUVO::sharing

#endif  // TUVOSHARING_UTILS_H_
