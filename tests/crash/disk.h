// A disk that loses its power. Records what this process writes to a database and when it asks for
// that to be on the disk, and makes the files that can be found after the power came back.
#ifndef TESTS_CRASH_DISK_H_
#define TESTS_CRASH_DISK_H_

#include <sys/types.h>

#include <cstddef>
#include <map>
#include <random>
#include <string>
#include <vector>

namespace tuvo_test {

// One change of the files, in the order in which the process made them.
struct DiskEvent {
  enum Kind { kWrite, kTruncate, kSync, kMade, kRemoved, kSyncNames };
  Kind kind;
  int file;           // of those that there ever were
  off64_t offset;     // kTruncate: the new size
  std::string bytes;  // kWrite
  std::string name;   // kMade, kRemoved: behind the database's path, so "" is the database itself
};

// The files by what stands behind the database's path in their names: "", "-wal", "-journal". The
// index of the log in memory ("-shm") never reaches the disk.
using Files = std::map<std::string, std::string>;

class Disk {
 public:
  // Records what happens to the files of the database at `path`; nothing of it must be there.
  static void Record(const std::string& path);
  // Ends the recording, and returns it.
  static Disk Recorded();

  // How many events there have been so far; between Record and Recorded.
  static std::size_t Now();

  std::size_t Size() const { return events_.size(); }

  // What a process leaves that dies behind `end` events, the machine going on.
  Files AfterDeath(std::size_t end) const;

  // What is on the disk for certain: of each file what had been written when it was last synced,
  // and of the names what they were when their folder was.
  Files Certain(std::size_t end) const;

  // The same and, of what came after, anything: each write whole, not at all, or for some sectors
  // of it, others holding garbage; each name as at any moment since.
  Files AfterPowerLoss(std::size_t end, std::mt19937& random) const;

  // The disk as if nobody had ever asked for anything to be on it.
  Disk WithoutSyncs() const;

 private:
  struct Chance;
  Files Make(std::size_t end, Chance* chance) const;
  std::size_t LastSync(std::size_t end, int file) const;
  std::map<std::string, int> Names(std::size_t end, Chance* chance) const;

  std::vector<DiskEvent> events_;
};

// Lays the files out as those of the database at `path`, the system account's, in place of what is
// there.
void Lay(const Files& files, const std::string& path);

// The files of the database at `path` as they are now.
Files Read(const std::string& path);

}  // namespace tuvo_test

#endif  // TESTS_CRASH_DISK_H_
