// The file that a link of the project "file" shares.
#ifndef PROGRAMS_VISITOR_SHARED_FILE_H_
#define PROGRAMS_VISITOR_SHARED_FILE_H_

#include <cstdint>
#include <string>
#include <string_view>

#include "common/unique_fd.h"
#include "visitor/preconditions.h"

namespace visitor {

// An open file and what its headers say.
struct SharedFile {
  common::UniqueFd fd;
  int link = 0;      // the row of the link that shares it
  std::string name;  // without folders
  std::int64_t size = 0;
  Validators validators;
};

enum class OpenResult {
  kOpened,
  kGone,         // nothing there, or no regular file
  kNotReadable,  // it is there, and this program may not, or must not, read it
};

// Opens the regular file at the absolute `path` under the effective ids of the moment. No symbolic
// link is followed, wherever it stands in the path; ".." goes by the path's text. A file that is
// the system identity's own and closed to others (the database of links is one) is never opened,
// whoever asks. `*file` is filled on kOpened alone; errno tells the reason of a failure.
OpenResult OpenShared(const std::string& path, SharedFile* file);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SHARED_FILE_H_
