// What the program takes from a request, credentials aside.
#ifndef PROGRAMS_VISITOR_REQUEST_H_
#define PROGRAMS_VISITOR_REQUEST_H_

#include <tuvoplatform/cgi.h>

#include <string>

#include "visitor/preconditions.h"
#include "visitor/route.h"

namespace visitor {

enum class Method { kGet, kHead, kPost, kOther };

struct Request {
  Method method = Method::kOther;
  Route route;
  std::string session_id;       // from the cookie; empty when there is none or it is none of ours
  bool asks_redirect = false;   // has the parameter kRedirectParameter
  bool from_elsewhere = false;  // a page of another site made the browser send this
  std::string range;
  ConditionHeaders conditions;
};

// Reads the environment, and the parsed request of `cgi`, whose cookies it loads.
Request ReadRequest(TUVOCGI* cgi);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_REQUEST_H_
