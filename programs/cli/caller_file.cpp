#include "cli/caller_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstdlib>

#include "cli/as_caller.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/line_reader.h"
#include "cli/live_database.h"

namespace cli {

namespace {

Failure TakenFailure(const std::string& path) {
  return {ExitStatus::kTaken, path + ": is there already; --force replaces a file"};
}

// Where `path` leads now must be empty, or a file that may go.
void CheckPlace(const std::string& path, bool replace) {
  if (BelongsToDatabase(path)) {
    throw Failure(ExitStatus::kUsage, path + ": is a place of the database in use");
  }
  struct stat st {};
  if (lstat(path.c_str(), &st) != 0) {
    if (errno == ENOENT) {
      return;
    }
    throw SystemFailure(path);
  }
  if (!replace) {
    throw TakenFailure(path);
  }
  if (!S_ISREG(st.st_mode)) {
    throw Failure(ExitStatus::kUsage, path + ": is no regular file");
  }
}

std::string FolderOf(const std::string& path) {
  const std::size_t slash = path.rfind('/');
  return slash == std::string::npos ? "." : path.substr(0, slash + 1);
}

// Where the file system cannot rename without replacing, a second name does the same.
bool NameAnew(const std::string& from, const std::string& to) {
  if (renameat2(AT_FDCWD, from.c_str(), AT_FDCWD, to.c_str(), RENAME_NOREPLACE) == 0) {
    return true;
  }
  return (errno == EINVAL || errno == ENOSYS) && link(from.c_str(), to.c_str()) == 0 &&
         unlink(from.c_str()) == 0;
}

// A named pipe makes its opener wait for the other end.
int OpenForReading(const std::string& path) {
  for (;;) {
    StopIfInterrupted();
    const int fd = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NOCTTY);
    if (fd >= 0 || errno != EINTR) {
      return fd;
    }
  }
}

// The name of the new file is to outlive a crash as well.
void SyncFolder(const std::string& path) {
  const common::UniqueFd folder(open(FolderOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (folder.get() >= 0) {
    (void)fsync(folder.get());  // some file systems have no such thing
  }
}

}  // namespace

common::UniqueFd OpenCallersFile(const std::string& path) {
  const AsCaller as_caller;
  common::UniqueFd fd(OpenForReading(path));
  if (fd.get() < 0) {
    throw SystemFailure(path);
  }
  return fd;
}

std::string ReadCallersFile(const std::string& path, std::size_t most) {
  const common::UniqueFd fd = OpenCallersFile(path);
  return ReadAll(fd.get(), most);
}

NewFile::NewFile(const std::string& path, bool replace)
    : path_(path), temporary_(path + ".XXXXXX"), replace_(replace) {
  const AsCaller as_caller;
  CheckPlace(path, replace);
  fd_ = common::UniqueFd(mkostemp(temporary_.data(), O_CLOEXEC));
  if (fd_.get() < 0) {
    throw SystemFailure(path);
  }
}

NewFile::~NewFile() {
  if (!temporary_.empty()) {
    const AsCaller as_caller;
    (void)unlink(temporary_.c_str());
  }
}

void NewFile::Keep() {
  if (fsync(fd_.get()) != 0) {
    throw SystemFailure(path_);
  }
  const AsCaller as_caller;
  CheckPlace(path_, replace_);
  const bool done =
      replace_ ? rename(temporary_.c_str(), path_.c_str()) == 0 : NameAnew(temporary_, path_);
  if (!done) {
    throw errno == EEXIST ? TakenFailure(path_) : SystemFailure(path_);
  }
  temporary_.clear();
  SyncFolder(path_);
}

}  // namespace cli
