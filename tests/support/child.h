// Runs a piece of a test in a process of its own: with other ids, other limits, or a fresh
// process-wide state.
#ifndef TESTS_SUPPORT_CHILD_H_
#define TESTS_SUPPORT_CHILD_H_

#include <sys/types.h>

#include <functional>
#include <string>

namespace tuvo_test {

// Real, effective and saved ids of a process.
struct Ids {
  uid_t ruid, euid, suid;
  gid_t rgid, egid, sgid;
};

// The starting identities that matter to the identity switch.
constexpr Ids kRoot{0, 0, 0, 0, 0, 0};
constexpr Ids kSavedRoot{65534, 65534, 0, 65534, 65534, 0};
constexpr Ids kSystem{1, 1, 1, 1, 1, 1};
constexpr Ids kNobody{65534, 65534, 65534, 65534, 65534, 65534};

// The ids of this process now.
Ids CurrentIds();
bool operator==(const Ids& a, const Ids& b);
std::string ToText(const Ids& ids);

// Forks, runs `body` in the child and returns the child's exit status: what `body` returned (0 to
// 255), or 256 plus the signal that ended it. An exception in `body` ends the child with 254, a
// failed gtest expectation in it with 253 (its message goes to standard error).
int RunInChild(const std::function<int()>& body);

// The same after dropping supplementary groups and taking `ids`. 252: the ids could not be taken.
int RunInChildAs(const Ids& ids, const std::function<int()>& body);

// The id of the process that one of the two ran last: it stands in what that process logged.
pid_t LastChild();

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_CHILD_H_
