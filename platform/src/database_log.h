// Keeping the write-ahead log beside a database short.
#ifndef PLATFORM_SRC_DATABASE_LOG_H_
#define PLATFORM_SRC_DATABASE_LOG_H_

struct sqlite3;

namespace tuvo_platform {

// From now on every commit of the connection that leaves a long log behind folds it back into the
// file; a very long one by force, so that it begins anew however many others read and write. A
// commit never fails for that.
void KeepLogShort(sqlite3* sqlite);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_DATABASE_LOG_H_
