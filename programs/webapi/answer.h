// Answers as docs/webapi.md has them.
#ifndef PROGRAMS_WEBAPI_ANSWER_H_
#define PROGRAMS_WEBAPI_ANSWER_H_

#include <json/value.h>

#include <string>

#include "owner/problem.h"

namespace webapi {

struct Answer {
  Json::Value document;  // one that SuccessAnswer or FailureAnswer made
  std::string links;     // member "links" of its data, written already; empty: there is none
};

// The answer as it goes out, without a line feed.
std::string TextOf(const Answer& answer);

// {"success": true, "data": …}
Json::Value SuccessAnswer(Json::Value data);

// {"success": false, "error": {"code": …, "message": …, "field": …}}; without a field when it is
// none that is at fault.
Json::Value FailureAnswer(const owner::Problem& problem);

bool IsSuccess(const Json::Value& answer);

// The HTTP status of an answer that one of the two functions made.
int StatusOf(const Json::Value& answer);

// What is said when there is no memory for anything else.
constexpr char kNoMemoryAnswer[] =
    R"({"error":{"code":100,"message":"failed; the system log says why"},"success":false})";

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_ANSWER_H_
