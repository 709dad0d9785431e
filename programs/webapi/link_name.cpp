#include "webapi/link_name.h"

#include <tuvosharing/keys.h>

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::MaybeProblem;
using TUVO::sharing::SZK_HASH;
using TUVO::sharing::SZK_ID_;

}  // namespace

MaybeProblem ReadLinkName(const Json::Value& arguments, owner::LinkName* name) {
  if (arguments.isMember(SZK_ID_)) {
    if (arguments.isMember(SZK_HASH)) {
      return Fault(Error::kConflict, "must not be given along with the id", SZK_HASH);
    }
    name->id = arguments[SZK_ID_].asInt();
    return name->id > 0 ? std::nullopt : Fault(Error::kBadValue, "must be at least 1", SZK_ID_);
  }
  if (!arguments.isMember(SZK_HASH)) {
    return Fault(Error::kMissingArgument, "is needed, or the hash", SZK_ID_);
  }
  name->hash = arguments[SZK_HASH].asString();
  return name->hash.empty() ? Fault(Error::kBadValue, "must not be empty", SZK_HASH) : std::nullopt;
}

}  // namespace webapi
