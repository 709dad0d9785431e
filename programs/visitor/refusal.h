// What a visitor is told when the library refuses.
#ifndef PROGRAMS_VISITOR_REFUSAL_H_
#define PROGRAMS_VISITOR_REFUSAL_H_

#include <string_view>

#include "visitor/notices.h"

namespace visitor {

// The answer to one result code: the link's form again with a complaint on top, or a notice.
struct Refusal {
  std::string_view complaint;  // for the form, whose status is 403; empty: the notice
  Notice notice = Notice::kFailure;
};

// The answer to a login's refusal (a result of TuvoSharingLogin other than 1).
Refusal RefusedLogin(int code);

// The answer to a visit's refusal (a result of TuvoSharingIsAuthorized other than 1). The library
// says -7 also of a link that does not exist: a form is for a link that is open (link.h).
Refusal RefusedVisit(int code);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_REFUSAL_H_
