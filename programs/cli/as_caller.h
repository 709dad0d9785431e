// The caller's identity, for the caller's files.
#ifndef PROGRAMS_CLI_AS_CALLER_H_
#define PROGRAMS_CLI_AS_CALLER_H_

#include <sys/types.h>

namespace cli {

// Makes the real ids the effective ones for a scope: files that the caller names are the caller's
// to open, not the system account's, which the program runs as otherwise. Ends the process when an
// id cannot be changed.
class AsCaller {
 public:
  AsCaller();
  // errno is kept.
  ~AsCaller();
  AsCaller(const AsCaller&) = delete;
  AsCaller& operator=(const AsCaller&) = delete;

 private:
  const uid_t uid_;
  const gid_t gid_;
};

}  // namespace cli

#endif  // PROGRAMS_CLI_AS_CALLER_H_
