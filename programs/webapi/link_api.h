// TUVO.Sharing.Link: owners' links.
#ifndef PROGRAMS_WEBAPI_LINK_API_H_
#define PROGRAMS_WEBAPI_LINK_API_H_

#include "webapi/registry.h"

namespace webapi {

Api LinkApi();

// The methods. Each does what docs/webapi.md says of it for the account of its turn; an account
// that is no administrator's has only its own links.
owner::MaybeProblem CreateMethod(Turn* turn);
owner::MaybeProblem GetMethod(Turn* turn);
owner::MaybeProblem ListMethod(Turn* turn);
owner::MaybeProblem SetMethod(Turn* turn);
owner::MaybeProblem DeleteMethod(Turn* turn);
owner::MaybeProblem DeleteExpiredMethod(Turn* turn);
owner::MaybeProblem SessionsMethod(Turn* turn);
owner::MaybeProblem SignOutMethod(Turn* turn);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_LINK_API_H_
