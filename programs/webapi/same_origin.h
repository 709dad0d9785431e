// Whether a browser sent a request for a page of this very server.
#ifndef PROGRAMS_WEBAPI_SAME_ORIGIN_H_
#define PROGRAMS_WEBAPI_SAME_ORIGIN_H_

#include <optional>
#include <string>

namespace webapi {

// The headers that tell, as the web server passed them on.
struct OriginHeaders {
  std::optional<std::string> fetch_site;  // Sec-Fetch-Site
  std::optional<std::string> origin;      // Origin
  std::string host;                       // Host
  bool https = false;                     // how the request came in
};

// False when one of the two headers that are there says otherwise: Sec-Fetch-Site is neither
// "same-origin" nor "none" (typed in by the user), or Origin is not the scheme, host and port that
// the request was sent to. "null", several origins and what is no origin at all are not. A program
// that is no browser sends neither, and may pass: nobody can make it send what it does not want to.
bool IsSameOrigin(const OriginHeaders& headers);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_SAME_ORIGIN_H_
