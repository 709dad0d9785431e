#include <internal/contained.h>
#include <internal/purge.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/utils.h>

#include <ctime>
#include <string>

namespace TUVO::sharing::db {

bool PurgeTimedOut(BaseDB& db, const char* table, float probability) {
  if (!IsProbabilityHit(probability)) {
    return true;
  }
  // The quotes do no harm to the comparison: the column has integer affinity.
  return Contained([&] {
    return db.Execute(std::string("DELETE FROM ") + table + " WHERE timeout < '" +
                          std::to_string(std::time(nullptr)) + "'",
                      nullptr);
  });
}

}  // namespace TUVO::sharing::db
