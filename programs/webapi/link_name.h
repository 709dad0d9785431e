// By which a request names a link.
#ifndef PROGRAMS_WEBAPI_LINK_NAME_H_
#define PROGRAMS_WEBAPI_LINK_NAME_H_

#include <json/value.h>

#include "owner/link_store.h"
#include "owner/problem.h"

namespace webapi {

// Reads the argument `id` or `hash`, of which there must be exactly one. A hash is not held to the
// form that new ones have: other programs' links have to be found, too.
owner::MaybeProblem ReadLinkName(const Json::Value& arguments, owner::LinkName* name);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_LINK_NAME_H_
