// The web API behind both of its fronts.
#ifndef PROGRAMS_WEBAPI_HANDLER_H_
#define PROGRAMS_WEBAPI_HANDLER_H_

#include "webapi/answer.h"
#include "webapi/call.h"

namespace webapi {

// The answer to `call`. Checks, in this order: API, version, method; that a change came in a way in
// which changes may come, and not from another site; the account; the arguments. Only then the
// database is looked at. A call of a method that changes something leaves one line in the event
// log, whatever became of it, unless it was only to count; that of a change that was made says so
// even when the answer cannot be made up any more. What a method throws is
// Error::kInternal, and logged; lack of memory while the answer is made up is thrown on.
Answer Handle(const Call& call);

}  // namespace webapi

#endif  // PROGRAMS_WEBAPI_HANDLER_H_
