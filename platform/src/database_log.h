// Keeping the write-ahead log beside a database short.
#ifndef PLATFORM_SRC_DATABASE_LOG_H_
#define PLATFORM_SRC_DATABASE_LOG_H_

namespace tuvo_platform {

struct Connection;

// From now on the connection knows how long its commits leave the log.
void WatchLog(Connection* connection);

// Folds a long log back into the file; a very long one by force, so that it begins anew however
// many others read and write. For behind a statement: a commit that did this itself, as SQLite
// would have it, would answer that it failed when this does.
void KeepLogShort(Connection* connection);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_DATABASE_LOG_H_
