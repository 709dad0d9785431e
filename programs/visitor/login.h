// A visitor opens a link.
#ifndef PROGRAMS_VISITOR_LOGIN_H_
#define PROGRAMS_VISITOR_LOGIN_H_

#include <tuvoplatform/cgi.h>

#include "visitor/answer.h"
#include "visitor/request.h"

namespace visitor {

// Answers a POST to a link: logs the visitor in with what the form brought, which counts one use,
// and sends the browser back to the link with the visitor's cookie; or says why not.
Answer Login(const Request& request, TUVOCGI* cgi);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_LOGIN_H_
