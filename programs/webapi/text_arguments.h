// Requests written as texts: on a command line, or in a query string.
#ifndef PROGRAMS_WEBAPI_TEXT_ARGUMENTS_H_
#define PROGRAMS_WEBAPI_TEXT_ARGUMENTS_H_

#include <json/value.h>

#include <string>
#include <string_view>
#include <vector>

#include "owner/problem.h"

namespace webapi {

// Reads "name=value" each into an object of texts; values may hold any further "=". A text without
// "=", an empty name, and a name that comes twice are Error::kMalformedRequest, and more bytes than
// kLargestRequest Error::kTooLarge; `request` is then unspecified.
owner::MaybeProblem ReadTexts(const std::vector<std::string>& texts, Json::Value* request);

// The same for a query string, percent-encoded as forms are; the empty one is an empty object.
// A percent sign without two hexadecimal digits is Error::kMalformedRequest.
owner::MaybeProblem ReadQuery(std::string_view query, Json::Value* request);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_TEXT_ARGUMENTS_H_
