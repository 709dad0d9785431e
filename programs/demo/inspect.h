// A look at a link from a process of its own.
#ifndef PROGRAMS_DEMO_INSPECT_H_
#define PROGRAMS_DEMO_INSPECT_H_

#include <string>

namespace demo {

// Prints how many uses of the link were counted and how many sessions hold a token for it:
// "uses 3, admitted 2". False when there is no such link or the database cannot be read.
bool ShowLink(const std::string& hash);

// Prints what the library answers when that session opens that link from that address.
void ShowAuthorization(const std::string& hash, const std::string& session_id,
                       const std::string& address);

}  // namespace demo

#endif  // PROGRAMS_DEMO_INSPECT_H_
