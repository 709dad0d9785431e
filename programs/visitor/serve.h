// What an admitted visitor gets.
#ifndef PROGRAMS_VISITOR_SERVE_H_
#define PROGRAMS_VISITOR_SERVE_H_

#include <tuvosharing/entry.h>

#include "visitor/answer.h"
#include "visitor/request.h"

namespace visitor {

// The answer to a GET or HEAD of a visitor who may open `entry`: the redirect that the link's
// settings ask for, the file of a link of the project "file", or the page that says that another
// application serves the link.
Answer Serve(const Request& request, const TUVO::sharing::record::Entry& entry);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SERVE_H_
