// The full address of a link, as the platform's tool /usr/tuvo/bin/tuvosharingurl tells it.
#ifndef TUVOSHARING_SHARING_URL_H_
#define TUVOSHARING_SHARING_URL_H_

#include <tuvosharing/export.h>

#include <string>

namespace TUVO::sharing {

// What kind of address it is: the number that the tool prints. What the numbers mean is the tool's
// business, so none has a name here; any that the tool can print is a value of this type.
enum _tag_SHARING_URL_TYPE : int {};

// Runs the tool with five arguments: `s1`, `n` in decimal, `b` as "1" or "0", `s2`, `s3`. They
// reach it as they are, without a shell, each up to its first NUL byte, and other local users may
// see them, the hash among them, while the tool starts (in /proc). What they mean is the tool's
// business. The one of this system takes the project, the port (0: the usual one), whether
// it is https, a host or address to use instead of the configured one, and the link's hash.
//
// `url` is the first line of the tool's output without its last character, which is dropped even
// when it is no line feed; of a line longer than 4095 characters, the first 4095 count. `type` is
// the number at the beginning of what follows, of which three characters are read: 0 when there is
// no number.
//
// False, with a line in the system log, when the tool cannot be started (`url` and `type` are
// untouched), when it prints nothing (the same), and when it prints a single line (`url` is set,
// `type` untouched). The tool's exit status does not count. Waits for the tool to end.
TUVOSHARING_API bool GetSharingURL(const std::string& s1, int n, bool b, const std::string& s2,
                                   const std::string& s3, std::string& url,
                                   _tag_SHARING_URL_TYPE& type);

// The same with the empty text in place of `s2`.
TUVOSHARING_API bool GetSharingURL(const std::string& s1, int n, bool b, const std::string& s3,
                                   std::string& url, _tag_SHARING_URL_TYPE& type);

}  // namespace TUVO::sharing

#endif  // TUVOSHARING_SHARING_URL_H_
