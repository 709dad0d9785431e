// Clean-up of what has expired.
#ifndef PROGRAMS_VISITOR_PURGE_H_
#define PROGRAMS_VISITOR_PURGE_H_

namespace visitor {

// Deletes expired sessions, tokens and links, in one call of a hundred for each of them: every
// login adds rows, so every login takes its part in removing them. To be called when the visitor
// no longer waits. Failures are logged by the library and harmless.
void PurgeNowAndThen();

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_PURGE_H_
