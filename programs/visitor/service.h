// The visitor's program as the gateway runs it: from a request's variables and body to the bytes of
// its answer.
#ifndef PROGRAMS_VISITOR_SERVICE_H_
#define PROGRAMS_VISITOR_SERVICE_H_

#include <string_view>
#include <vector>

#include "common/exchange.h"

namespace visitor {

// The variables of a request that something here, or in the libraries, reads.
std::vector<std::string_view> RequestVariables();

// Answers the request that is in the environment, and does what is to be done behind the answer.
// False when the answer did not get out whole.
bool ServeExchange(common::Exchange& exchange);

// Answers that nothing can be served.
void Apologize(common::Exchange& exchange);

// Whether this process can go on: it cannot when the database of links was not to be had, which a
// new process may find mended.
bool IsFit();

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_SERVICE_H_
