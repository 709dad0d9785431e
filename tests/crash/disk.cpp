#include "crash/disk.h"

#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <optional>
#include <stdexcept>
#include <utility>

#include "crash/file_calls.h"
#include "db/sqlite_file.h"
#include "db/test_files.h"

namespace tuvo_test {

namespace {

constexpr std::size_t kSector = 512;

// What is recorded now, and how its files are known.
struct Recording {
  std::string path;
  std::vector<DiskEvent> events;
  std::map<ino_t, int> files;  // -1: none of the database's
  std::map<std::string, int> names;
};
Recording recording;

std::optional<std::string> NameOf(const std::string& path) {
  const std::string& database = recording.path;
  if (path.compare(0, database.size(), database) != 0) {
    return std::nullopt;
  }
  const std::string name = path.substr(database.size());
  return name.empty() || name == "-wal" || name == "-journal" ? std::optional(name) : std::nullopt;
}

std::string PathOf(int fd) {
  char path[PATH_MAX];
  const std::string link = "/proc/self/fd/" + std::to_string(fd);
  const ssize_t size = readlink(link.c_str(), path, sizeof path);
  return size < 0 ? "" : std::string(path, static_cast<std::size_t>(size));
}

// The file's number; its making is noted with its first event.
int FileOf(int fd, ino_t inode) {
  const auto known = recording.files.find(inode);
  if (known != recording.files.end()) {
    return known->second;
  }
  const std::optional<std::string> name = NameOf(PathOf(fd));
  const int file = name ? static_cast<int>(recording.files.size()) : -1;
  recording.files[inode] = file;
  if (name) {
    recording.names[*name] = file;
    recording.events.push_back({DiskEvent::kMade, file, 0, "", *name});
  }
  return file;
}

void NoteRemoval(const char* path) {
  const std::optional<std::string> name = path != nullptr ? NameOf(path) : std::nullopt;
  const auto known = name ? recording.names.find(*name) : recording.names.end();
  if (known != recording.names.end()) {
    recording.events.push_back({DiskEvent::kRemoved, known->second, 0, "", *name});
    recording.names.erase(known);
  }
}

std::optional<DiskEvent::Kind> KindOf(FileCall call) {
  switch (call) {
    case FileCall::kWrite:
      return DiskEvent::kWrite;
    case FileCall::kTruncate:
      return DiskEvent::kTruncate;
    case FileCall::kSync:
      return DiskEvent::kSync;
    default:
      return std::nullopt;
  }
}

void Note(const FileAction& action) {
  if (action.call == FileCall::kNames) {
    NoteRemoval(action.path);
    return;
  }
  const std::optional<DiskEvent::Kind> kind = KindOf(action.call);
  struct stat st {};
  if (!kind || fstat(action.fd, &st) != 0) {
    return;
  }
  if (S_ISDIR(st.st_mode)) {
    recording.events.push_back({DiskEvent::kSyncNames, -1, 0, "", ""});
    return;
  }
  const int file = FileOf(action.fd, st.st_ino);
  if (file >= 0) {
    recording.events.push_back(
        {*kind, file, action.offset,
         *kind == DiskEvent::kWrite
             ? std::string(static_cast<const char*>(action.bytes), action.size)
             : "",
         ""});
  }
}

void Put(const std::string& bytes, std::size_t offset, std::string* content) {
  content->resize(std::max(content->size(), offset + bytes.size()));
  content->replace(offset, bytes.size(), bytes);
}

}  // namespace

// What becomes of that which was not synced.
struct Disk::Chance {
  bool everything;       // it is all there
  std::mt19937* random;  // else: if null, nothing of it is

  int Below(int end) const {
    return static_cast<int>((*random)() % static_cast<unsigned int>(end));
  }

  void Write(const DiskEvent& event, std::string* content) const {
    const auto offset = static_cast<std::size_t>(event.offset);
    const int fate = everything ? 1 : random == nullptr ? 0 : Below(3);
    if (fate == 1) {
      Put(event.bytes, offset, content);
    } else if (fate == 2) {
      WriteSome(event.bytes, offset, content);
    }
  }

  void WriteSome(const std::string& bytes, std::size_t offset, std::string* content) const {
    for (std::size_t at = 0; at < bytes.size(); at += kSector) {
      std::string sector = bytes.substr(at, kSector);
      const int fate = Below(8);
      if (fate == 0) {
        std::generate(sector.begin(), sector.end(), [&] { return static_cast<char>(Below(256)); });
      }
      if (fate < 5) {
        Put(sector, offset + at, content);
      }
    }
  }

  bool Happens() const { return everything || (random != nullptr && Below(2) == 0); }
};

void Disk::Record(const std::string& path) {
  recording = Recording();
  recording.path = path;
  WatchFiles(Note);
}

Disk Disk::Recorded() {
  WatchFiles(nullptr);
  Disk disk;
  disk.events_ = std::exchange(recording.events, {});
  return disk;
}

std::size_t Disk::Now() {
  return recording.events.size();
}

std::size_t Disk::LastSync(std::size_t end, int file) const {
  for (std::size_t i = end; i > 0; --i) {
    if (events_[i - 1].kind == DiskEvent::kSync && events_[i - 1].file == file) {
      return i;
    }
  }
  return 0;
}

std::map<std::string, int> Disk::Names(std::size_t end, Chance* chance) const {
  std::map<std::string, int> names;
  std::map<std::string, std::vector<int>> later;  // what each could be as well; -1: nothing
  for (std::size_t i = 0; i < end; ++i) {
    const DiskEvent& event = events_[i];
    if (event.kind == DiskEvent::kMade || event.kind == DiskEvent::kRemoved) {
      later[event.name].push_back(event.kind == DiskEvent::kMade ? event.file : -1);
    } else if (event.kind == DiskEvent::kSyncNames) {
      for (const auto& [name, files] : later) {
        names[name] = files.back();
      }
      later.clear();
    }
  }
  for (const auto& [name, files] : later) {
    const auto count = static_cast<int>(files.size());
    const int chosen = chance->everything          ? count
                       : chance->random == nullptr ? 0
                                                   : chance->Below(count + 1);
    if (chosen > 0) {
      names[name] = files[static_cast<std::size_t>(chosen - 1)];
    }
  }
  return names;
}

Files Disk::Make(std::size_t end, Chance* chance) const {
  Files files;
  const Chance certain{true, nullptr};
  for (const auto& [name, file] : Names(end, chance)) {
    if (file < 0) {
      continue;
    }
    std::string& content = files[name];
    const std::size_t synced = LastSync(end, file);
    for (std::size_t i = 0; i < end; ++i) {
      const DiskEvent& event = events_[i];
      if (event.file != file) {
        continue;
      }
      const Chance& fate = i < synced ? certain : *chance;
      if (event.kind == DiskEvent::kWrite) {
        fate.Write(event, &content);
      } else if (event.kind == DiskEvent::kTruncate && fate.Happens()) {
        content.resize(static_cast<std::size_t>(event.offset));
      }
    }
  }
  return files;
}

Files Disk::AfterDeath(std::size_t end) const {
  Chance everything{true, nullptr};
  return Make(end, &everything);
}

Files Disk::Certain(std::size_t end) const {
  Chance nothing{false, nullptr};
  return Make(end, &nothing);
}

Files Disk::AfterPowerLoss(std::size_t end, std::mt19937& random) const {
  Chance anything{false, &random};
  return Make(end, &anything);
}

Disk Disk::WithoutSyncs() const {
  Disk disk;
  for (const DiskEvent& event : events_) {
    if (event.kind != DiskEvent::kSync && event.kind != DiskEvent::kSyncNames) {
      disk.events_.push_back(event);
    }
  }
  return disk;
}

void Lay(const Files& files, const std::string& path) {
  NewPath(path);
  for (const auto& [name, content] : files) {
    WriteFile(path + name, content);
    if (chown((path + name).c_str(), 1, 1) != 0) {
      throw std::runtime_error("chown");
    }
  }
}

Files Read(const std::string& path) {
  Files files;
  for (const char* name : {"", "-wal", "-journal"}) {
    if (Exists(path + name)) {
      files[name] = ReadFile(path + name);
    }
  }
  return files;
}

}  // namespace tuvo_test
