// A link in an answer.
#ifndef PROGRAMS_WEBAPI_LINK_ANSWER_H_
#define PROGRAMS_WEBAPI_LINK_ANSWER_H_

#include <tuvosharing/entry.h>

#include "webapi/registry.h"

namespace webapi {

// Answers with the members `link`, `url` and `url_type`.
void AnswerLink(const TUVO::sharing::record::Entry& link, Turn* turn);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_LINK_ANSWER_H_
