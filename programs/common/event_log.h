// What happens to links, for whoever looks after the machine.
#ifndef PROGRAMS_COMMON_EVENT_LOG_H_
#define PROGRAMS_COMMON_EVENT_LOG_H_

#include <optional>
#include <string>

namespace common {

// One thing that was done, or refused. Names nothing that opens a link: no hash, no session, no
// secret, no path; and nothing that a stranger types.
struct Event {
  const char* name;            // "login", "refusal", "download", "logout", "create", ...
  int link = 0;                // the link's row number; 0: none
  std::string address;         // where the request came from; empty: not known
  int result = 0;              // 1: done; else the library's or the web API's code
  std::optional<unsigned> by;  // the owner's uid, for a change that an owner makes
};

// Writes one line of priority info to the system log:
// "sharing event=login link=7 address=192.0.2.1 result=-9", then " by=2001" if somebody is named.
// An address that is empty or no address at all (the shell's "local" apart) is written as "-".
void LogEvent(const Event& event);

}  // namespace common

#endif  // PROGRAMS_COMMON_EVENT_LOG_H_
