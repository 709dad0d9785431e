// The database as the commands use it.
#ifndef PROGRAMS_CLI_DATABASE_H_
#define PROGRAMS_CLI_DATABASE_H_

#include <tuvosharing/base_db.h>
#include <tuvosharing/result.h>
#include <tuvosharing/sharing_db.h>

#include <string>

namespace cli {

// The one of this process. Throws Failure when it cannot be used.
TUVO::sharing::db::SharingDB& Database();

// Runs a statement and returns its rows. Throws Failure.
TUVO::sharing::db::Result Query(TUVO::sharing::db::BaseDB& db, const std::string& sql);

// The number that a statement returns in its column "value". Throws Failure.
long long Number(TUVO::sharing::db::BaseDB& db, const std::string& sql);

}  // namespace cli

#endif  // PROGRAMS_CLI_DATABASE_H_
