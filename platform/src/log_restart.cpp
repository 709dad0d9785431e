#include "log_restart.h"

#include <array>

namespace tuvo_platform {

namespace {

// Places in the index of the log, and its locks, as SQLite's documentation of the file format has
// them.
constexpr int kIndexPage = 32768;
constexpr std::size_t kSalts = 32;
constexpr int kWriteLock = 0;
constexpr int kCheckpointLock = 1;
constexpr int kFirstReadLock = 3;

// Others when the log has been begun anew.
using Salts = std::array<unsigned char, 8>;

// What the checkpoint of this thread has seen: it begins and ends within one call.
struct Checkpoint {
  sqlite3_file* file;  // null: there is none
  Salts salts;
};
thread_local Checkpoint checkpoint{};

const sqlite3_io_methods* system_methods;

bool ReadSalts(sqlite3_file* file, Salts* salts) {
  void volatile* index = nullptr;
  if (system_methods->xShmMap(file, 0, kIndexPage, 0, &index) != SQLITE_OK || index == nullptr) {
    return false;
  }
  const auto* bytes = static_cast<unsigned char volatile*>(index) + kSalts;
  for (std::size_t i = 0; i < salts->size(); ++i) {
    (*salts)[i] = bytes[i];
  }
  return true;
}

// From here on the checkpoint will read the log's end.
void Look(sqlite3_file* file) {
  checkpoint.file = ReadSalts(file, &checkpoint.salts) ? file : nullptr;
}

// The log is begun anew by who holds the first read lock, and so not while it is held alone.
bool IsBegunAnew(sqlite3_file* file) {
  Salts salts{};
  return ReadSalts(file, &salts) && salts != checkpoint.salts;
}

int Lock(sqlite3_file* file, int first, int count, int flags) {
  const int code = system_methods->xShmLock(file, first, count, flags);
  if (code != SQLITE_OK || count != 1) {
    return code;
  }
  const bool taken = flags == (SQLITE_SHM_LOCK | SQLITE_SHM_EXCLUSIVE);
  const bool within = checkpoint.file == file;
  if (first == kCheckpointLock) {
    checkpoint.file = nullptr;
    if (taken) {
      Look(file);
    }
  } else if (first == kWriteLock && taken && within) {
    Look(file);  // of a checkpoint that keeps writers away; it has waited for them
  } else if (first == kFirstReadLock && taken && within && IsBegunAnew(file)) {
    system_methods->xShmLock(file, first, count, SQLITE_SHM_UNLOCK | SQLITE_SHM_EXCLUSIVE);
    return SQLITE_BUSY;
  }
  return code;
}

// The system's, with Lock in place of its own. SQLite has the same for every file on a disk.
const sqlite3_io_methods& Methods(const sqlite3_io_methods* of_file) {
  static const sqlite3_io_methods methods = [&] {
    system_methods = of_file;
    sqlite3_io_methods own = *of_file;
    own.xShmLock = Lock;
    return own;
  }();
  return methods;
}

}  // namespace

void WatchLogRestarts(sqlite3* sqlite) {
  sqlite3_file* file = nullptr;
  if (sqlite3_file_control(sqlite, "main", SQLITE_FCNTL_FILE_POINTER, static_cast<void*>(&file)) !=
          SQLITE_OK ||
      file == nullptr || file->pMethods == nullptr || file->pMethods->iVersion < 2) {
    return;
  }
  const sqlite3_io_methods& methods = Methods(file->pMethods);
  if (file->pMethods == system_methods) {
    file->pMethods = &methods;
  }
}

}  // namespace tuvo_platform
