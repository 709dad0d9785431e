// The temporary switch of the process's effective ids.
//
//   IF_RUN_AS(1, 1) {
//     ... runs with effective uid 1 and gid 1 ...
//   } else {
//     ... the switch failed and was logged ...
//   }
//
// Only effective ids change; real and saved ids stay, so that the process can always return. The
// ids are put back at the end of the statement, whichever branch was taken and however it is left.
#ifndef INTERNAL_RUN_AS_H_
#define INTERNAL_RUN_AS_H_

#include <internal/log.h>
#include <sys/types.h>

#include <string_view>

// The identity under which every file and database operation runs.
constexpr uid_t kSystemUid = 1;
constexpr gid_t kSystemGid = 1;

// The odd names keep the guard out of everybody's way in the scope that the macro opens.
// NOLINTBEGIN(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)
namespace _________ {

class __ {
 public:
  // Remembers the effective ids of this moment, and what the log lines name.
  __(std::string_view source, int line, const char* name);
  __(const __&) = delete;
  __& operator=(const __&) = delete;
  // Puts the remembered ids back. A failure is logged (authorisation facility, critical); errno is
  // left as it was.
  ~__();

  // Takes the effective ids `uid` and `gid`; nothing is called when they are in force already. To
  // be called while the remembered ids are those in force: they are not asked for again.
  // A failure is logged (authorisation facility, error), and may leave root or one of the two ids
  // in force until the destructor.
  bool SwitchTo(uid_t uid, gid_t gid) const;

 private:
  uid_t saved_uid_;
  gid_t saved_gid_;
  std::string_view source_;
  int line_;
  const char* name_;
};

}  // namespace _________

#define IF_RUN_AS(uid, gid)                                                    \
  if (const _________::__ run_as_guard(SHARING_SOURCE, __LINE__, "IF_RUN_AS"); \
      run_as_guard.SwitchTo((uid), (gid)))
// NOLINTEND(bugprone-reserved-identifier,cert-dcl37-c,cert-dcl51-cpp)

#endif  // INTERNAL_RUN_AS_H_
