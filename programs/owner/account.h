// Who asks.
#ifndef PROGRAMS_OWNER_ACCOUNT_H_
#define PROGRAMS_OWNER_ACCOUNT_H_

#include <optional>
#include <string>

namespace owner {

struct Account {
  unsigned int uid = 0;
  std::string name;
  // Sees and changes everybody's links: root, the system account, and members of the group
  // "administrators".
  bool administrator = false;
};

// Nothing when the system does not know the account, or cannot tell its groups.
std::optional<Account> AccountOfName(const std::string& name);
std::optional<Account> AccountOfUid(unsigned int uid);

}  // namespace owner

#endif  // PROGRAMS_OWNER_ACCOUNT_H_
