#include "cli/live_database.h"

#include <sys/stat.h>
#include <tuvosharing/keys.h>

#include <filesystem>

namespace cli {

namespace {

namespace fs = std::filesystem;

bool IsSameFile(const std::string& one, const std::string& other) {
  struct stat one_st {};
  struct stat other_st {};
  return stat(one.c_str(), &one_st) == 0 && stat(other.c_str(), &other_st) == 0 &&
         one_st.st_dev == other_st.st_dev && one_st.st_ino == other_st.st_ino;
}

// Whether `folder` is `place` or below it. By the folders themselves, not by their names: these may
// lead through symbolic links, and a folder may be mounted at two places.
bool IsWithin(const fs::path& folder, const std::string& place) {
  std::error_code error;
  fs::path above = fs::canonical(folder, error);
  if (error) {
    return false;  // nothing can be made there either
  }
  while (!IsSameFile(above.string(), place)) {
    const fs::path next = above.parent_path();
    if (next == above) {
      return false;
    }
    above = next;
  }
  return true;
}

}  // namespace

bool BelongsToDatabase(const std::string& path) {
  const fs::path database(TUVO::sharing::SZF_SHARING_DB_PATH);
  const std::string place = database.parent_path().string();
  const fs::path folder = fs::path(path).parent_path();
  if (IsWithin(folder.empty() ? fs::path(".") : folder, place)) {
    return true;
  }
  for (const std::string& name : {database.string(), database.string() + "-wal",
                                  database.string() + "-shm", place + "/autoblock.db"}) {
    if (IsSameFile(path, name)) {
      return true;
    }
  }
  return false;
}

}  // namespace cli
