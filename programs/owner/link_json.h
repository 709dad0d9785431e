// The JSON object by which links are shown.
#ifndef PROGRAMS_OWNER_LINK_JSON_H_
#define PROGRAMS_OWNER_LINK_JSON_H_

#include <json/value.h>
#include <tuvosharing/entry.h>

#include <ctime>

namespace owner {

// The object that docs/webapi.md describes; `now` decides its state. Holds neither the password in
// any form nor the private data. Texts that are not UTF-8, of rows that other programs wrote, have
// their stray bytes replaced by U+FFFD, so that the whole stays readable JSON.
Json::Value LinkJson(const TUVO::sharing::record::Entry& link, std::time_t now);

}  // namespace owner

#endif  // PROGRAMS_OWNER_LINK_JSON_H_
