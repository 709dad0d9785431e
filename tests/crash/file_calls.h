// Lets a test see what this program asks the system to do to files and locks, before it is done.
// The program puts functions of its own before those of the C library, for itself and for every
// library in it, SQLite among them.
#ifndef TESTS_CRASH_FILE_CALLS_H_
#define TESTS_CRASH_FILE_CALLS_H_

#include <sys/types.h>

#include <cstddef>

namespace tuvo_test {

enum class FileCall {
  kCreate,    // opening a path that may be made by that
  kWrite,     // to a place in a file
  kAppend,    // to where the file stands
  kTruncate,  // `offset` is the new size
  kSync,
  kLock,   // taking a lock or giving it back
  kNames,  // a name is made, changed or removed; `path` is the one that goes, if one does
  kMode,   // owner or mode
};

// What is about to be done; what does not belong to the call is null, 0 or -1.
struct FileAction {
  FileCall call;
  int fd;
  const char* path;
  const void* bytes;
  std::size_t size;
  off64_t offset;
};

// Calls `watcher` before each of them from now on; nobody when it is null. What the watcher itself
// does is not watched.
void WatchFiles(void (*watcher)(const FileAction& action));

}  // namespace tuvo_test

#endif  // TESTS_CRASH_FILE_CALLS_H_
