// Answers that go out over HTTP.
#ifndef PROGRAMS_WEBAPI_HTTP_ANSWER_H_
#define PROGRAMS_WEBAPI_HTTP_ANSWER_H_

#include <string>
#include <string_view>

#include "webapi/http_request.h"

namespace webapi {

// The head of an answer as CGI has it, the empty line included. Whatever a page of another site
// makes of the address – a script, a picture, a frame, a style – its browser keeps the answer from
// it, and nothing of it is stored anywhere.
std::string HeadOf(int status, HttpMethod method, size_t length);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_HTTP_ANSWER_H_
