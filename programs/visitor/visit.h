// A visitor looks at a link.
#ifndef PROGRAMS_VISITOR_VISIT_H_
#define PROGRAMS_VISITOR_VISIT_H_

#include "visitor/answer.h"
#include "visitor/request.h"

namespace visitor {

// Answers a GET or HEAD of a link: what it shares to whoever is admitted, else the form that admits
// or the notice that nothing does. Never counts a use of the link: programs that fetch every
// address they see, to show a preview or to look for malice, do no harm.
Answer Visit(const Request& request);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_VISIT_H_
