// The visitor's program, apart from how requests come in and answers go out.
#ifndef PROGRAMS_VISITOR_VISITOR_H_
#define PROGRAMS_VISITOR_VISITOR_H_

#include <tuvoplatform/cgi.h>

#include "visitor/answer.h"
#include "visitor/request.h"

namespace visitor {

// Answers one request. `cgi` is the context that it was read from. May throw what the standard
// library throws.
Answer Handle(const Request& request, TUVOCGI* cgi);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_VISITOR_H_
