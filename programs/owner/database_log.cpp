#include "owner/database_log.h"

#include <syslog.h>

namespace owner {

void LogDatabaseFault(const std::string& reason) {
  syslog(LOG_ERR, "database_log:%d the database failed: %s", __LINE__, reason.c_str());
}

}  // namespace owner
