// The links' database.
#ifndef PROGRAMS_WEBAPI_DATABASE_H_
#define PROGRAMS_WEBAPI_DATABASE_H_

#include <tuvosharing/base_db.h>

#include "owner/problem.h"

namespace webapi {

// Points `*db` to the process's database; Error::kInternal when it cannot be used.
owner::MaybeProblem OpenDatabase(TUVO::sharing::db::BaseDB** db);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_DATABASE_H_
