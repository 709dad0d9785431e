// Keeps what is written to the log beside a database from being lost when the log is begun anew
// while another process is about to fold it back.
//
// SQLite (3.40.1, which Debian 12 has) reads where the log ends, and a moment later how much of it
// has been copied to the database. When a writer begins the log anew in between, the former is of
// the old log and the latter, 0, of the new one: the checkpoint then copies old pages, and notes as
// many of the new log's as copied, whatever will be written there. What is, is in the log and
// nowhere else, and goes away with it: a program on SQLite alone, sixteen processes that open the
// file, write, fold back and close, lost 4 of 135,674 acknowledged writes.
#ifndef PLATFORM_SRC_LOG_RESTART_H_
#define PLATFORM_SRC_LOG_RESTART_H_

#include <sqlite3.h>

namespace tuvo_platform {

// Has checkpoints of this open connection to a file give up when the log is begun anew after they
// have taken their lock: what they would have copied has been copied then, and synced, or the log
// could not have been begun anew. They answer as beside a reader or a writer.
void WatchLogRestarts(sqlite3* sqlite);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_LOG_RESTART_H_
