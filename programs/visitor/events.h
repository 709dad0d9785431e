// What visitors do, for the system log.
#ifndef PROGRAMS_VISITOR_EVENTS_H_
#define PROGRAMS_VISITOR_EVENTS_H_

#include <string>

namespace visitor {

// The result of a form that came from another site: no code of the library, but the one that the
// web API has for the same.
inline constexpr int kFromAnotherSite = 109;

// Somebody tried to open the link; `code` is TuvoSharingLogin's. One whose address is locked out
// was refused rather than tried.
void LogLogin(const std::string& hash, int code);

// Somebody was refused who claimed to be admitted (`code` is TuvoSharingIsAuthorized's), or a form
// was (kFromAnotherSite).
void LogRefusal(const std::string& hash, int code);

// The answer with the link's file ended: sent whole, or broken off.
void LogDownload(int link, bool whole);

// A visitor's access to the link was to end, and did or did not.
void LogLogout(const std::string& hash, bool ended);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_EVENTS_H_
