// A visitor leaves a link.
#ifndef PROGRAMS_VISITOR_LOGOUT_H_
#define PROGRAMS_VISITOR_LOGOUT_H_

#include "visitor/answer.h"
#include "visitor/request.h"

namespace visitor {

// Answers a GET or HEAD of a link's logout page: a button, the same for every link. Looking at it
// changes nothing.
Answer LogoutPage(const Request& request);

// Answers a POST to it: ends this browser's access to the link. The session, and with it the
// cookie, stays for other links. Doing it twice, or without ever having been admitted, is no error.
Answer Logout(const Request& request);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_LOGOUT_H_
