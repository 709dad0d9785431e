// Whose links an account may see and change.
#ifndef PROGRAMS_WEBAPI_OWNERSHIP_H_
#define PROGRAMS_WEBAPI_OWNERSHIP_H_

#include <json/value.h>

#include "owner/account.h"
#include "owner/link_store.h"
#include "owner/problem.h"

namespace webapi {

// The account's own links; for administrators everybody's.
owner::Scope ScopeOf(const owner::Account& account);

// Error::kForbidden when the argument `owner_user` names somebody else than the account, which is
// no administrator's. A name that nobody has is refused alike: it is not theirs either.
owner::MaybeProblem CheckOwner(const owner::Account& account, const Json::Value& arguments);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_OWNERSHIP_H_
