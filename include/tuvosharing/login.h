/* How a web program logs a visitor into a protected link, checks every later request, logs the
 * visitor out and counts a link's uses. Usable from C and from C++.
 *
 * The client's address, and the request parameter "_sid", come from the CGI environment of this
 * process. All state is in the process-wide database; call from one thread at a time.
 *
 * Result codes (login and authorisation check):
 *    1  success
 *   -1  session or token expired (an expired token is deleted)
 *   -2  account login refused, or account no longer allowed
 *   -3  link unknown or not valid, link password missing, or account check failed otherwise (login)
 *   -4  internal failure or missing input
 *   -5  no such session
 *   -6  link not valid (authorisation check)
 *   -7  no such link, or no token for this session and link
 *   -8  address denied (login), or not the session's while the link demands it (check)
 *   -9  wrong link password
 *  -10  account not among the link's users or groups
 *  -11  the link's limit of uses is reached
 */
#ifndef TUVOSHARING_LOGIN_H_
#define TUVOSHARING_LOGIN_H_

#include <tuvosharing/export.h>

#ifdef __cplusplus
#include <string>
extern "C" {
#endif

/* What the visitor's request carries. Any pointer may be null; the library neither writes nor frees
 * the texts and keeps none of them after the call. */
struct _tag_sharing_login_params {
  const char* sharing_id;   /* the link's hash */
  const char* password;     /* the link password that the visitor typed */
  const char* zor_username; /* account name */
  const char* zor_password; /* account password */
  const char* sharing_sid;  /* the visitor's session identifier, from the cookie */
};

/* Logs a visitor into a link: see TUVO::TuvoSharingLogin, with `skip_autoblock` when `flag` is 1.
 * Writes the session identifier, cut to fit, and a zero behind it into the `out_size` bytes at
 * `out`, whose last byte is zero in any case; on a refusal the text is empty. Pass at least 33
 * bytes. Precondition: `out` is not null and `out_size` at least 1. */
TUVOSHARING_API int TuvoSharingLogin(char* out, unsigned int out_size,
                                     struct _tag_sharing_login_params* params, int flag);

/* See TUVO::TuvoSharingIsAuthorized. */
TUVOSHARING_API int TuvoSharingIsAuthorized(const struct _tag_sharing_login_params* params);

/* See TUVO::TuvoSharingLogout and TUVO::TuvoSharingIncreaseUseCount; 1 for true, 0 for false.
 * Precondition: the texts are not null. A null pointer raises a C++ exception (std::logic_error),
 * which a C program cannot catch. */
TUVOSHARING_API int TuvoSharingLogout(const char* hash, const char* session_id);
TUVOSHARING_API int TuvoSharingIncreaseUseCount(const char* hash);

#ifdef __cplusplus
} /* extern "C" */

namespace TUVO {

// Checks the link (`sharing_id`) and its protection, counts one use, and creates or renews the
// visitor's session (`sharing_sid`, when it names a usable one) and its token for the link; both
// end 86400 seconds later. On success (1) `session_id` is the identifier to set as the visitor's
// cookie; otherwise it is untouched. A refused link password or account is counted as a failed
// login of the client's address, and a success clears that count; with `skip_autoblock` an account
// that is merely not listed is not counted and a success does not clear. A login that fails after
// the use was counted (-4) does not take the count back.
TUVOSHARING_API int TuvoSharingLogin(std::string& session_id, _tag_sharing_login_params* params,
                                     bool skip_autoblock);

// Decides whether the visitor's session (`sharing_sid`) may still open the link (`sharing_id`); on
// success session and token both end 86400 seconds after this request. With `zor_username` set the
// account of a link for accounts is logged in again, else the session's account is checked.
TUVOSHARING_API int TuvoSharingIsAuthorized(const _tag_sharing_login_params* params);

// Ends the session's access to one link; the session stays, for other links. False, logged, when
// there is no such session, link or token, or the session or token has expired.
TUVOSHARING_API bool TuvoSharingLogout(const std::string& hash, const std::string& session_id);

// Counts one use of a link. False when there is no such link or it could not be written.
TUVOSHARING_API bool TuvoSharingIncreaseUseCount(const std::string& hash);

}  // namespace TUVO
#endif

#endif /* TUVOSHARING_LOGIN_H_ */
