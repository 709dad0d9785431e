#include "cli/check_files.h"

#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstring>

namespace cli {

namespace {

constexpr uid_t kRootUid = 0;
constexpr uid_t kSystemUid = 1;
constexpr gid_t kSystemGid = 1;

void Add(const std::string& path, const std::string& reason, Findings* findings) {
  findings->push_back({"file", path, reason});
}

std::string ModeText(mode_t mode) {
  std::array<char, 16> text{};
  (void)std::snprintf(text.data(), text.size(), "%04o", static_cast<unsigned int>(mode) & 07777U);
  return text.data();
}

// SQLite makes the companions with the owner and mode of the file itself: anybody else's would lock
// the system account out.
void CheckFile(const std::string& path, const struct stat& st, Findings* findings) {
  if (!S_ISREG(st.st_mode)) {
    Add(path, "is no regular file", findings);
    return;
  }
  if (st.st_uid != kSystemUid || st.st_gid != kSystemGid) {
    Add(path,
        "belongs to " + std::to_string(st.st_uid) + ":" + std::to_string(st.st_gid) +
            ", not to 1:1",
        findings);
  }
  if ((st.st_mode & static_cast<mode_t>(S_IRWXO)) != 0 ||
      (st.st_mode & static_cast<mode_t>(S_IRUSR | S_IWUSR)) != (S_IRUSR | S_IWUSR)) {
    Add(path, "has the mode " + ModeText(st.st_mode) + ", not 0660", findings);
  }
}

void CheckFolder(const std::string& path, bool is_systems, Findings* findings) {
  struct stat st {};
  if (lstat(path.c_str(), &st) != 0) {
    Add(path, std::strerror(errno), findings);
    return;
  }
  if (!S_ISDIR(st.st_mode)) {
    Add(path, "is no folder", findings);
    return;
  }
  if (st.st_uid != kSystemUid && (is_systems || st.st_uid != kRootUid)) {
    Add(path, "belongs to " + std::to_string(st.st_uid) + ", not to the system account", findings);
  }
  const bool groups = st.st_gid != kSystemGid && st.st_gid != kRootUid &&
                      (st.st_mode & static_cast<mode_t>(S_IWGRP)) != 0;
  if (groups || (st.st_mode & static_cast<mode_t>(S_IWOTH)) != 0) {
    Add(path, "has the mode " + ModeText(st.st_mode) + ": others may write", findings);
  }
}

std::string FolderOf(const std::string& path) {
  return path.substr(0, path.rfind('/'));
}

}  // namespace

bool CheckFiles(const std::string& database, Findings* findings) {
  const std::string folder = FolderOf(database);
  CheckFolder(FolderOf(folder), false, findings);
  CheckFolder(folder, true, findings);
  struct stat st {};
  if (lstat(database.c_str(), &st) != 0) {
    Add(database, std::strerror(errno), findings);
    return false;
  }
  CheckFile(database, st, findings);
  for (const char* companion : {"-wal", "-shm"}) {
    const std::string path = database + companion;
    struct stat companion_st {};
    if (lstat(path.c_str(), &companion_st) == 0) {
      CheckFile(path, companion_st, findings);
    }
  }
  if (!S_ISREG(st.st_mode)) {
    return false;
  }
  if (eaccess(database.c_str(), R_OK | W_OK) != 0) {
    Add(database, "the system account may not read and write it", findings);
    return false;
  }
  return true;
}

}  // namespace cli
