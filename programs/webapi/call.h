// One request to the web API, whatever front it came through.
#ifndef PROGRAMS_WEBAPI_CALL_H_
#define PROGRAMS_WEBAPI_CALL_H_

#include <json/value.h>

#include <optional>
#include <string>

#include "owner/account.h"
#include "owner/link_address.h"
#include "owner/problem.h"

namespace webapi {

struct Call {
  std::string api;
  int version = 0;
  std::string method;
  Json::Value arguments = Json::Value(Json::objectValue);  // all other members of the request
  bool texts = false;       // the arguments are texts still, to be read by their types
  bool may_change = true;   // came in a way that may change something (a POST)
  bool same_origin = true;  // no page of another site made the browser send this
  std::optional<owner::Account> account;  // who asks; nothing: nobody that the system knows
  std::string address;                    // of the client, for the event log
  owner::ServerPlace place;
};

// The largest request that is taken, in bytes: body, query string, or all arguments of a command.
constexpr size_t kLargestRequest = 262144;

// Fills in api, version and method of `call`, and the rest of `request` as its arguments. `texts`
// says whether the values of `request` are texts. Error::kMalformedRequest when `request` is no
// object, or one of the three is missing or of another type.
owner::MaybeProblem ReadCall(Json::Value request, bool texts, Call* call);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_CALL_H_
