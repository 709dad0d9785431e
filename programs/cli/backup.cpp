// tuvosharing backup
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <tuvoplatform/database.h>
#include <tuvosharing/keys.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <memory>

#include "cli/caller_file.h"
#include "cli/commands.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/progress.h"
#include "common/stream.h"

namespace cli {

namespace {

struct CloseDb {
  void operator()(TUVODB* db) const { TUVODBClose(db); }
};
using Db = std::unique_ptr<TUVODB, CloseDb>;

std::string FolderOf(const std::string& path) {
  return path.substr(0, path.rfind('/'));
}

// A folder beside the database that nobody else can look into, gone with what is in it at the end.
// The copy is made there by the system account: what it reads with, it must also own, and the
// caller's folder is not its to write to.
class CopyPlace {
 public:
  explicit CopyPlace(const std::string& beside) : folder_(FolderOf(beside) + "/backup.XXXXXX") {
    if (mkdtemp(folder_.data()) == nullptr) {
      throw SystemFailure(FolderOf(beside));
    }
  }
  ~CopyPlace() {
    (void)unlink(Path().c_str());
    (void)rmdir(folder_.c_str());
  }
  CopyPlace(const CopyPlace&) = delete;
  CopyPlace& operator=(const CopyPlace&) = delete;

  std::string Path() const { return folder_ + "/copy.db"; }

 private:
  std::string folder_;
};

// What a backup leaves free beside the database for those who go on writing to it, and the rest
// of that below which it gives up: to have no backup is better than to have no room for links.
constexpr std::uintmax_t kLeftForOthers = std::uintmax_t{16} << 20;
constexpr std::uintmax_t kLeast = kLeftForOthers / 2;

std::uintmax_t SizeOf(const std::string& path) {
  struct stat st {};
  return stat(path.c_str(), &st) == 0 ? static_cast<std::uintmax_t>(st.st_size) : 0;
}

bool HasRoom(const std::string& folder, std::uintmax_t bytes) {
  struct statvfs room {};
  return statvfs(folder.c_str(), &room) == 0 &&
         static_cast<std::uintmax_t>(room.f_bavail) * room.f_frsize >= bytes;
}

void RequireRoom(const std::string& folder, std::uintmax_t bytes) {
  if (!HasRoom(folder, bytes)) {
    throw Failure(ExitStatus::kFailed,
                  folder + ": has too little room for a copy beside the database");
  }
}

// What is told while pages are copied.
struct Copying {
  Progress progress{"pages copied", 0};
  std::string folder;
};

// Another answer than 0 ends the copying.
int ShowProgress(void* context, unsigned int left, unsigned int total) {
  auto* copying = static_cast<Copying*>(context);
  copying->progress.SetTotal(total);
  copying->progress.Show(total - left);
  return NotedSignal() != 0 || !HasRoom(copying->folder, kLeast) ? 1 : 0;
}

void CopyDatabase(const std::string& from, const std::string& to) {
  struct stat st {};
  if (stat(from.c_str(), &st) != 0) {  // connecting would create one
    throw SystemFailure("the database cannot be read");
  }
  const Db db(TUVODBConnect("", "", "", from.c_str()));
  Copying copying;
  copying.folder = FolderOf(from);
  // The write-ahead log may hold as many pages that are not yet in the file.
  RequireRoom(copying.folder, SizeOf(from) + SizeOf(from + "-wal") + kLeftForOthers);
  if (!db || TUVODBBackup(db.get(), to.c_str(), ShowProgress, &copying) != 0) {
    StopIfInterrupted();
    RequireRoom(copying.folder, kLeast);
    throw Failure(ExitStatus::kFailed,
                  std::string("the database cannot be copied: ") + TUVODBErrorGet(db.get()));
  }
}

void HandOver(const std::string& copy, int to) {
  const common::UniqueFd from(open(copy.c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW));
  struct stat st {};
  if (from.get() < 0 || fstat(from.get(), &st) != 0) {
    throw SystemFailure("the copy cannot be written");
  }
  constexpr std::int64_t kPiece = 1 << 20;
  Progress progress("bytes written", st.st_size);
  for (std::int64_t done = 0; done < st.st_size; done += kPiece) {
    StopIfInterrupted();
    RequireRoom(FolderOf(copy), kLeast);
    progress.Show(done);
    if (!common::CopyAll(from.get(), done, std::min(kPiece, st.st_size - done), to)) {
      throw SystemFailure("the copy cannot be written");
    }
  }
}

}  // namespace

ExitStatus Backup(const BackupOptions& options) {
  if (options.file == "-") {
    throw Failure(ExitStatus::kUsage, "backup: a database needs a file; ./- would be one");
  }
  NewFile file(options.file, options.force);
  const CopyPlace place(TUVO::sharing::SZF_SHARING_DB_PATH);
  CopyDatabase(TUVO::sharing::SZF_SHARING_DB_PATH, place.Path());
  HandOver(place.Path(), file.fd());
  StopIfInterrupted();
  file.Keep();
  return ExitStatus::kDone;
}

}  // namespace cli
