// The one spelling of every column, JSON member, enumeration text and request parameter, and the
// library's sizes and paths. The column texts are the persistent format.
//
// All are exported variables, initialised before any function of the library can run; nothing
// modifies them. Two texts are shared by two names each: "password" and "none"; code that maps
// texts back to enumerations decides by the member that it reads, not by the text alone.
#ifndef TUVOSHARING_KEYS_H_
#define TUVOSHARING_KEYS_H_

#include <tuvosharing/export.h>

#include <cstdint>

// Name of the CGI environment variable that carries the sharing request header. For callers; the
// library does not read it.
TUVOSHARING_API extern const char* SZ_X_SHARING_HEADER;

namespace TUVO::sharing {

// Starting length of a link's random hash.
TUVOSHARING_API extern const std::int32_t SHARING_HASH_LENGTH;
// Length of a visitor session's identifier.
TUVOSHARING_API extern const std::int32_t SHARING_SESSION_LENGTH;
// Retry bound when a unique hash or session identifier is drawn.
TUVOSHARING_API extern const std::int32_t SHARING_MAX_RETRY_TIMES;
// Length of the random salt of a link password.
TUVOSHARING_API extern const std::int32_t SHARING_PASS_HASH_LENGTH;

// The file that SharingDB opens by default.
TUVOSHARING_API extern const char* SZF_SHARING_DB_PATH;

TUVOSHARING_API extern const char* SZK_UID_;                   // column of "session"
TUVOSHARING_API extern const char* SZK_SESSION_ID_;            // of "session" and "token"
TUVOSHARING_API extern const char* SZK_TIMEOUT;                // of "session" and "token"
TUVOSHARING_API extern const char* SZK_IP_;                    // of "session"
TUVOSHARING_API extern const char* SZK_ENTRY_ID;               // of "token"
TUVOSHARING_API extern const char* SZK_DATA;                   // of "entry": a JSON document
TUVOSHARING_API extern const char* SZK_PRIVATE_DATA;           // member of that document
TUVOSHARING_API extern const char* SZK_APP;                    // member of it and of the JSON form
TUVOSHARING_API extern const char* SZK_PLUGINS;                // for callers only
TUVOSHARING_API extern const char* SZK_REDIRECT_URI;           // member of both
TUVOSHARING_API extern const char* SZK_REDIRECT_TYPE;          // member of both
TUVOSHARING_API extern const char* SZK_PROTECT_GROUPS;         // JSON form: group names
TUVOSHARING_API extern const char* SZK_PROTECT_EXTRA_GROUPS;   // document: unresolved names
TUVOSHARING_API extern const char* SZK_PROTECT_GIDS;           // document
TUVOSHARING_API extern const char* SZK_PROTECT_USERS;          // JSON form: user names
TUVOSHARING_API extern const char* SZK_PROTECT_EXTRA_USERS;    // document: unresolved names
TUVOSHARING_API extern const char* SZK_PROTECT_UIDS;           // document
TUVOSHARING_API extern const char* SZK_PROTECT_PASSWORD_SALT;  // document
TUVOSHARING_API extern const char* SZK_PROTECT_PASSWORD_ALGO_MD5;      // text of the MD5 algorithm
TUVOSHARING_API extern const char* SZK_PROTECT_PASSWORD_ALGO_DEFAULT;  // text of salted SHA-1
TUVOSHARING_API extern const char* SZK_PROTECT_PASSWORD_ALGO;          // document
TUVOSHARING_API extern const char* SZK_PROTECT_PASSWORD;               // document
TUVOSHARING_API extern const char* SZK_PROTECT_TITLE;                  // member of both
TUVOSHARING_API extern const char* SZK_PROTECT_TYPE;                   // member of both
TUVOSHARING_API extern const char* SZK_ENABLE_MATCH_IP;                // member of both
TUVOSHARING_API extern const char* SZK_USE_COUNT;                      // column of "entry"
TUVOSHARING_API extern const char* SZK_EXPIRE_TIMES;                   // column of "entry"
TUVOSHARING_API extern const char* SZK_EXPIRE_AT;                      // column of "entry"
TUVOSHARING_API extern const char* SZK_START_AT;                       // column of "entry"
TUVOSHARING_API extern const char* SZK_OWNER_USER;                     // JSON form: owner's name
TUVOSHARING_API extern const char* SZK_OWNER_UID;                      // column of "entry"
TUVOSHARING_API extern const char* SZK_AUTO_GC;                        // column of "entry"
TUVOSHARING_API extern const char* SZK_ENABLED_;                       // column of "entry"
TUVOSHARING_API extern const char* SZK_PROJECT_NAME;                   // column of "entry"
TUVOSHARING_API extern const char* SZK_ZOR_PASSWORD;  // request parameter: account password
TUVOSHARING_API extern const char* SZK_ZOR_USERNAME;  // request parameter: account name
TUVOSHARING_API extern const char* SZK_PASSWORD_;     // request parameter: link password
TUVOSHARING_API extern const char* SZK_SHARING_SID;   // cookie: visitor session identifier
TUVOSHARING_API extern const char* SZK_SHARING_ID;    // request parameter: link hash
TUVOSHARING_API extern const char* SZK_HASH;          // column of "entry"
TUVOSHARING_API extern const char* SZK_ID_;           // primary key of every table
TUVOSHARING_API extern const char* SZK_REDIRECT_REDIRECT_ALWAYS;    // redirect type
TUVOSHARING_API extern const char* SZK_REDIRECT_REDIRECT_URLPARAM;  // redirect type
TUVOSHARING_API extern const char* SZK_REDIRECT_REDIRECT_NONE;      // redirect type
TUVOSHARING_API extern const char* SZK_PROTECT_PROTECT_USER;        // protection type
TUVOSHARING_API extern const char* SZK_PROTECT_PROTECT_PASSWORD;    // protection type
TUVOSHARING_API extern const char* SZK_PROTECT_PROTECT_NONE;        // protection type
TUVOSHARING_API extern const char* SZK_JSCONFIG;                    // for callers only
TUVOSHARING_API extern const char* SZK_ASSISTANT;                   // for callers only
TUVOSHARING_API extern const char* SZK_EXTERNAL_IP_;                // for callers only
TUVOSHARING_API extern const char* SZK_ACTION;                      // for callers only

}  // namespace TUVO::sharing

#endif  // TUVOSHARING_KEYS_H_
