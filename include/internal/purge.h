// The purge that sessions and tokens share.
#ifndef INTERNAL_PURGE_H_
#define INTERNAL_PURGE_H_

namespace TUVO::sharing::db {

class BaseDB;

// With the given probability deletes the rows of `table` whose timeout lies before the current
// second. True when it did nothing.
bool PurgeTimedOut(BaseDB& db, const char* table, float probability);

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_PURGE_H_
