#include "webapi/ownership.h"

#include <tuvosharing/keys.h>
#include <tuvosharing/user_group.h>

namespace webapi {

owner::Scope ScopeOf(const owner::Account& account) {
  return account.administrator ? owner::Scope() : account.uid;
}

owner::MaybeProblem CheckOwner(const owner::Account& account, const Json::Value& arguments) {
  const char* field = TUVO::sharing::SZK_OWNER_USER;
  if (account.administrator || !arguments.isMember(field)) {
    return std::nullopt;
  }
  unsigned int uid = 0;
  if (TUVO::sharing::UserToUID(arguments[field].asString(), uid) && uid == account.uid) {
    return std::nullopt;
  }
  return owner::Fault(owner::Error::kForbidden, "may be another's for administrators only", field);
}

}  // namespace webapi
