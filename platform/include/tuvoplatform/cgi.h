// The platform's CGI interface: the request that this process serves, and the account login.
//
// The request is read and parsed once, by whichever TuvoCgiInit comes first; all contexts look at
// the same request. A process that serves several, one after another, says where each begins
// (TuvoCgiNextRequest). Sizes are limited (docs/platform-cgi.md); a request over a limit, or one
// that does not parse, makes TuvoCgiInit fail in every context. Without REQUEST_METHOD in the
// environment there is no web server: the request is then an empty one.
//
// To be called from one thread at a time: a login switches the effective ids of the whole process.
#ifndef TUVOPLATFORM_CGI_H_
#define TUVOPLATFORM_CGI_H_

#include <stddef.h>
#include <stdio.h>
#include <tuvoplatform/export.h>

#ifdef __cplusplus
extern "C" {
#endif

// A context on the caller's stack; its members are the platform's own.
typedef struct TUVOCGI_tag {
  void* request;       // what was parsed
  int cookies_loaded;  // whether TuvoCgiLoadInCookies was called
} TUVOCGI;

// An account login. The members are in the order that the platform fixes.
typedef struct LoginInfo_tag {
  const char* szUser;      // the account's name
  const char* szPassword;  // its password
  const char* szClient;    // name of the client program; also the name of the PAM service
  int nType;               // 15: a login with a password over the web; not looked at on plain Linux
  int nFlag;               // 1: no session of the appliance's own; not looked at on plain Linux
} LoginInfo;

// Stores up to `length` further bytes of a request's body in `data` and returns how many; 0 at the
// body's end and on an error.
typedef size_t (*TuvoCgiBodyReader)(void* context, char* data, size_t length);

// Begins the next request of a process that serves one after another: forgets the parsed request,
// whose texts are overwritten, and every queued cookie. The next TuvoCgiInit parses the environment
// as it is then, and takes the body from `read`, which gets `context` (null: from standard input);
// nothing else ever calls `read`. Texts and contexts of the former request must no longer be used:
// free the contexts before. Without a call the process's request is that of its start.
TUVOPLATFORM_API void TuvoCgiNextRequest(TuvoCgiBodyReader read, void* context);

// Makes `*cgi` a context of this process's request. `name` is not looked at; pass "".
// Returns 1; another value when the request could not be read, `*cgi` is then fit for TuvoCgiFree
// only.
TUVOPLATFORM_API int TuvoCgiInit(const char* name, TUVOCGI* cgi);

// Makes the request's cookies readable through this context. Returns 1, or another value on
// failure; a request without cookies is no failure.
TUVOPLATFORM_API int TuvoCgiLoadInCookies(TUVOCGI* cgi);

// The value of a request parameter: of the body's fields (url-encoded or multipart, without
// files) first, then of the query string's; the first of several. Names are compared exactly, case
// included. Null when there is none. Owned by the platform, valid until the next request begins.
TUVOPLATFORM_API const char* TuvoCgiGetRequestParam(const TUVOCGI* cgi, const char* name);

// The value of a cookie, the first of several; null when there is none or the cookies were not
// loaded. Owned by the platform, valid until the next request begins.
TUVOPLATFORM_API const char* TuvoCgiGetCookie(const TUVOCGI* cgi, const char* name);

// Queues the line "Set-Cookie: name=value; Path=path; HttpOnly; SameSite=Lax", with "; Secure"
// under HTTPS, for the program to send (TuvoCgiWriteCookies); a queued cookie of the same name and
// path is replaced. The queue is the request's: it outlives this context. Returns 1; another value,
// with the queue unchanged, when a text is null or holds a character that a cookie cannot (name: an
// RFC 6265 token; value: RFC 6265 cookie octets, or empty; path: begins with '/', printable ASCII
// and blanks without ';').
TUVOPLATFORM_API int TuvoCgiSetCookies(TUVOCGI* cgi, const char* name, const char* value,
                                       const char* path);

// Writes the queued Set-Cookie lines of the named cookie (null: of all), each ended by a carriage
// return and a line feed, flushes `out` and forgets them. Returns the number of lines; -1 on a
// write error, with the cookies still queued.
TUVOPLATFORM_API int TuvoCgiWriteCookies(TUVOCGI* cgi, const char* name, FILE* out);

// Checks an account through PAM, authentication and account management both; the PAM service is
// `login->szClient`. Regains root for the check when the process kept it as its saved id, and puts
// the effective ids back; ends the process (abort) when it cannot put them back. A null or empty
// user or password is refused, and so is one that PAM cannot take (512 bytes or more) and a service
// name of other characters than ASCII letters, digits, '-' and '_'.
// The reply, at most `size` bytes with its zero, is the account's name as PAM has it, cut short if
// need be; it is written on success only, and may be null.
// Returns 1 when the account may log in, another value otherwise.
TUVOPLATFORM_API int TuvoCgiLogin(TUVOCGI* cgi, char* reply, unsigned int size,
                                  const LoginInfo* login);

// Writes the client's address as the web server gave it in REMOTE_ADDR, in its canonical spelling
// (inet_ntop's; IPv4 that is mapped into IPv6 as IPv4, link-local addresses without their zone). No
// header that the client sends is ever looked at, and no context is needed. Returns 0; -1, with
// `ip` untouched, when there is none, it is no address, or `size` is too small.
TUVOPLATFORM_API int TuvoCgiGetRemoteIP(char* ip, unsigned int size);

// Ends a context, also one whose TuvoCgiInit failed. The parsed request stays for other contexts.
TUVOPLATFORM_API void TuvoCgiFree(TUVOCGI* cgi);

#ifdef __cplusplus
}
#endif

#endif  // TUVOPLATFORM_CGI_H_
