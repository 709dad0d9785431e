#include "webapi/database.h"

#include <syslog.h>
#include <tuvosharing/sharing_db.h>

namespace webapi {

owner::MaybeProblem OpenDatabase(TUVO::sharing::db::BaseDB** db) {
  TUVO::sharing::db::SharingDB& links = TUVO::sharing::db::SharingDB::Instance();
  if (!links.IsGood()) {
    syslog(LOG_ERR, "database:%d the database of links cannot be used", __LINE__);
    return owner::InternalFault();
  }
  *db = &links;
  return std::nullopt;
}

}  // namespace webapi
