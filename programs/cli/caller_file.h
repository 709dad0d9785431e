// Files that the caller names, opened and made as the caller.
#ifndef PROGRAMS_CLI_CALLER_FILE_H_
#define PROGRAMS_CLI_CALLER_FILE_H_

#include <cstddef>
#include <string>

#include "common/unique_fd.h"

namespace cli {

// Opens the file for reading; throws Failure, and Interruption when a signal came meanwhile.
common::UniqueFd OpenCallersFile(const std::string& path);

// The file's content; throws Failure when there is more than `most` bytes of it.
std::string ReadCallersFile(const std::string& path, std::size_t most);

// A new file, mode 0600, that appears under its name when it is whole.
class NewFile {
 public:
  // A file that is at `path` already is a Failure, unless `replace` and it is a regular file; a
  // place of the database in use (live_database.h) always is.
  NewFile(const std::string& path, bool replace);
  // Removes what was not kept.
  ~NewFile();
  NewFile(const NewFile&) = delete;
  NewFile& operator=(const NewFile&) = delete;

  int fd() const { return fd_.get(); }

  // Sees that the content is on the disk, and then puts the file into its place. Throws Failure,
  // also when somebody else has put a file there meanwhile.
  void Keep();

 private:
  std::string path_;
  std::string temporary_;
  bool replace_;
  common::UniqueFd fd_;
};

}  // namespace cli

#endif  // PROGRAMS_CLI_CALLER_FILE_H_
