// Between a web server and a program: CGI and FastCGI.
#ifndef PROGRAMS_COMMON_GATEWAY_H_
#define PROGRAMS_COMMON_GATEWAY_H_

#include <string_view>
#include <vector>

#include "common/exchange.h"

namespace common {

// A program, apart from how requests come in and answers go out. The functions may throw what the
// standard library throws, which ends the process.
struct Program {
  // The variables of a request that the program, or a library that it uses, reads.
  std::vector<std::string_view> variables;
  // Answers a request whose variables are in the environment and that the next TuvoCgiInit parses.
  // Every TuvoCgi context must be freed on return. False when the answer did not get out.
  bool (*serve)(Exchange& exchange);
  // Answers a request that cannot be served because the process is not what it should be.
  void (*apologize)(Exchange& exchange);
  // Whether the process can serve another request; null: it can. Asked when an answer is out.
  bool (*is_fit)();
};

// Puts in order what was inherited (process_start.h), gives up privileges (privileges.h), and
// serves the one request of a CGI program or, when standard input is a listening socket, one
// FastCGI request after another; nothing is left of one when the next begins. Returns the process's
// exit status: 0 when all was well, as after a SIGTERM, which ends a FastCGI program as soon as no
// request is being served, and after many requests. A FastCGI socket must be a local one: over the
// network anybody on this machine could pose as the web server, whose word for a client's address
// and account is taken.
int RunGateway(const Program& program);

}  // namespace common

#endif  // PROGRAMS_COMMON_GATEWAY_H_
