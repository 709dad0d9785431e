// The place of the database, which no file that the caller names may take.
#ifndef PROGRAMS_CLI_LIVE_DATABASE_H_
#define PROGRAMS_CLI_LIVE_DATABASE_H_

#include <string>

namespace cli {

// Whether `path` leads into the folder of the database that is in use, or is another name of one of
// its files. A copy put there would take the database away from under those who have it open: they
// would go on writing to a file that has no name any more.
bool BelongsToDatabase(const std::string& path);

}  // namespace cli

#endif  // PROGRAMS_CLI_LIVE_DATABASE_H_
