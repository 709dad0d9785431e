// What the system log says of a statement that failed.
#ifndef PROGRAMS_OWNER_DATABASE_LOG_H_
#define PROGRAMS_OWNER_DATABASE_LOG_H_

#include <string>

namespace owner {

// Writes one line with the reason, a connection's last error, for a problem that sends people to
// the system log: statements that are run by themselves leave none there.
void LogDatabaseFault(const std::string& reason);

}  // namespace owner

#endif  // PROGRAMS_OWNER_DATABASE_LOG_H_
