#include "common/gateway.h"

#include <fcgiapp.h>
#include <sys/socket.h>
#include <syslog.h>
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <utility>

#include "common/cgi_exchange.h"
#include "common/core_dump.h"
#include "common/environment.h"
#include "common/fastcgi_exchange.h"
#include "common/privileges.h"
#include "common/process_start.h"
#include "common/stop_signal.h"

namespace common {

namespace {

constexpr int kListeningFd = STDIN_FILENO;  // as FastCGI has it

// Then the process ends and the web server starts another: whatever a library, or a module that PAM
// loads, may leave behind with each request has an end.
constexpr int kRequestsOfAProcess = 10000;

size_t ReadBody(void* context, char* data, size_t length) {
  return static_cast<Exchange*>(context)->Read(data, length);
}

bool ServeOne(const Program& program, bool able, Exchange* exchange) {
  TuvoCgiNextRequest(ReadBody, exchange);
  if (able) {
    return program.serve(*exchange);
  }
  program.apologize(*exchange);
  return false;
}

int ServeCgi(const Program& program, bool able, const char* const* variables) {
  RequestEnvironment environment(program.variables);
  environment.Become(variables);
  CgiExchange exchange;
  return ServeOne(program, able, &exchange) ? EXIT_SUCCESS : EXIT_FAILURE;
}

bool IsLocalSocket(int fd) {
  sockaddr_storage address{};
  socklen_t size = sizeof address;
  return getsockname(fd, reinterpret_cast<sockaddr*>(&address), &size) == 0 &&
         address.ss_family == AF_UNIX;
}

// Whether the process may go on to the next request.
bool ServeAccepted(const Program& program, bool able, RequestEnvironment* environment,
                   FCGX_Request* request) {
  FastCgiExchange exchange(request);
  environment->Become(request->envp);
  (void)ServeOne(program, able, &exchange);  // a visitor who leaves is nothing to end for
  (void)exchange.Finish();
  TuvoCgiNextRequest(nullptr, nullptr);  // the former visitor's texts need not wait for another
  environment->Become(nullptr);
  return able && (program.is_fit == nullptr || program.is_fit());
}

int AcceptFailed() {
  if (StopSignalCame()) {
    return EXIT_SUCCESS;
  }
  syslog(LOG_ERR, "gateway:%d no request can be accepted: %s", __LINE__, std::strerror(errno));
  return EXIT_FAILURE;
}

int ServeFastCgi(const Program& program, bool able) {
  if (!IsLocalSocket(kListeningFd)) {
    syslog(LOG_AUTH | LOG_CRIT, "gateway:%d the FastCGI socket is no local one", __LINE__);
    return EXIT_FAILURE;
  }
  RequestEnvironment environment(program.variables);
  EndByStopSignal(kListeningFd);
  FCGX_Request request;
  if (FCGX_Init() != 0 || FCGX_InitRequest(&request, kListeningFd, 0) != 0) {
    syslog(LOG_ERR, "gateway:%d FastCGI cannot be begun", __LINE__);
    return EXIT_FAILURE;
  }
  for (int served = 0; served < kRequestsOfAProcess; ++served) {
    if (FCGX_Accept_r(&request) != 0) {
      return AcceptFailed();
    }
    if (!ServeAccepted(program, able, &environment, &request)) {
      return EXIT_FAILURE;
    }
  }
  return EXIT_SUCCESS;
}

}  // namespace

int RunGateway(const Program& program) {
  if (!StartProcess()) {
    return EXIT_FAILURE;
  }
  const bool able = DropPrivileges();
  ForbidCore();
  (void)std::signal(SIGPIPE, SIG_IGN);
  // Out of sight before the protocol's library, asked anything, looks for settings of its own.
  char** const variables = std::exchange(environ, nullptr);
  try {
    return FCGX_IsCGI() != 0 ? ServeCgi(program, able, variables) : ServeFastCgi(program, able);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "gateway:%d %s", __LINE__, error.what());
  }
  return EXIT_FAILURE;
}

}  // namespace common
