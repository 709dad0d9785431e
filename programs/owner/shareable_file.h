// Whether an owner may share a file.
#ifndef PROGRAMS_OWNER_SHAREABLE_FILE_H_
#define PROGRAMS_OWNER_SHAREABLE_FILE_H_

#include <string>
#include <vector>

#include "owner/account.h"

namespace owner {

enum class FileAnswer {
  kMay,
  kNotReadable,  // not there, no regular file, not at its path, or the owner may not read it
  kOutside,      // below none of the folders
  kCannotTell,   // the owner's identity cannot be taken, or it took too long (logged)
};

// Looks at `path` with the ids and groups of `owner`, in a child process: the answer is the
// kernel's own, access lists and the like included. `resolved` is the path, without symbolic links
// and "..", at which the very file that was looked at is found from here, and is set with kMay
// alone.
// A process that cannot become somebody else (root is none of its ids) can tell for its own user
// only. A folder that does not exist admits nothing. A file on
// which somebody holds a lease for 2 seconds longer is not readable, and after 5 seconds the child
// is killed: the owner can stop it, and whoever calls is not to wait for that. Makes and reaps a
// child; forbidden while another thread runs.
FileAnswer CheckShareable(const std::string& path, const Account& owner,
                          const std::vector<std::string>& folders, std::string* resolved);

}  // namespace owner

#endif  // PROGRAMS_OWNER_SHAREABLE_FILE_H_
