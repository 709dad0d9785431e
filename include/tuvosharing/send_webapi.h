// A request to the system's web API, through the platform's tool /usr/tuvo/bin/tuvowebapi.
#ifndef TUVOSHARING_SEND_WEBAPI_H_
#define TUVOSHARING_SEND_WEBAPI_H_

#include <json/value.h>
#include <tuvosharing/export.h>

#include <string>

namespace TUVO::sharing {

// Runs the tool with the arguments "--exec", "api=" and `api`, "version=" and `version` in decimal,
// "method=" and `method`, and one "name=value" for each member of `params`, sorted by name, the
// value as Json::Value::asString gives it. They reach the tool as they are, without a shell and
// without any quoting, each up to its first NUL byte, and other local users may see them while the
// tool starts (in /proc). `params` is an object, or null for none; it may be `reply` or a part of
// it.
//
// `reply` becomes an empty object at first, and then the JSON document that the tool prints; what
// stands behind the document, and the tool's exit status, do not count. Waits for the tool to end.
//
// False, with a line in the system log, when the tool cannot be started, and when its output does
// not begin with a document or nests deeper than the JSON library reads (1000 levels, which take
// half a megabyte of stack); `reply` then holds what was read up to there.
//
// Throws what asString throws (Json::LogicError) for a member of `params` that is an object or a
// list, before anything is started, with an empty object in `reply`; and std::bad_alloc or
// std::length_error for an output beyond what memory holds, after the tool has been waited for.
TUVOSHARING_API bool SendWebapi(Json::Value& reply, const std::string& api, int version,
                                const std::string& method, const Json::Value& params);

}  // namespace TUVO::sharing

#endif  // TUVOSHARING_SEND_WEBAPI_H_
