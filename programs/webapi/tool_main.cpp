// tuvowebapi: the web API on the command line, for the user who runs it.
#include <syslog.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <string>
#include <vector>

#include "common/arguments.h"
#include "common/core_dump.h"
#include "common/environment.h"
#include "common/privileges.h"
#include "common/process_start.h"
#include "common/stream.h"
#include "owner/argument.h"
#include "webapi/answer.h"
#include "webapi/caller_limits.h"
#include "webapi/handler.h"
#include "webapi/text_arguments.h"

namespace {

using owner::MaybeProblem;

constexpr const char* kName = "tuvowebapi";
constexpr const char* kExec = "--exec";
constexpr const char* kHelp = "--help";
constexpr const char* kLocal = "local";

constexpr const char* kUsage =
    "Usage: tuvowebapi --exec api=API version=VERSION method=METHOD [NAME=VALUE]...\n"
    "       tuvowebapi --help\n"
    "\n"
    "Sends a request to the web API for the user who runs this command, and prints the\n"
    "answer, one line of JSON. The exit status is 0 when the request was done, else 1.\n"
    "\n"
    "  tuvowebapi --exec api=TUVO.API.Info version=1 method=query\n"
    "  tuvowebapi --exec api=TUVO.Sharing.Link version=1 method=get id=7\n";

MaybeProblem ReadCommandLine(const std::vector<std::string>& arguments, webapi::Call* call) {
  if (arguments.empty() || arguments.front() != kExec) {
    return owner::Fault(owner::Error::kMalformedRequest, "--exec is expected; see --help");
  }
  Json::Value request;
  if (MaybeProblem problem =
          webapi::ReadTexts({arguments.begin() + 1, arguments.end()}, &request)) {
    return problem;
  }
  return webapi::ReadCall(request, true, call);
}

webapi::Answer AnswerTo(const std::vector<std::string>& arguments, uid_t caller) {
  webapi::Call call;
  if (const MaybeProblem problem = ReadCommandLine(arguments, &call)) {
    return {webapi::FailureAnswer(*problem), {}};
  }
  call.account = owner::AccountOfUid(caller);
  call.address = kLocal;
  return webapi::Handle(call);
}

bool Print(std::string_view text) {
  return common::WriteAll(STDOUT_FILENO, text);
}

bool Apologize() {
  return Print(std::string(webapi::kNoMemoryAnswer) + "\n");
}

// Started set-user-id root, nothing of the caller's environment may reach the libraries: neither
// the time zone, in which times are read and written, nor folders and locales.
int Run(const std::vector<std::string>& arguments, uid_t caller) {
  common::RequestEnvironment environment({});
  environment.Become(nullptr);
  const webapi::Answer answer = AnswerTo(arguments, caller);
  const bool printed = Print(webapi::TextOf(answer) + "\n");
  return printed && webapi::IsSuccess(answer.document) ? EXIT_SUCCESS : EXIT_FAILURE;
}

// The identity first: from then on the caller can neither stop the program nor look into it. The
// log is opened before anything is done that has to stand there.
bool Prepare() {
  if (!common::DropPrivileges() || !common::HideFromCaller() || !webapi::TakeDescriptors()) {
    return false;
  }
  common::ForbidCore();
  openlog(kName, LOG_PID | LOG_NDELAY, LOG_USER);
  return true;
}

}  // namespace

int main(int argc, char* argv[]) {
  if (!common::StartProcess()) {
    return EXIT_FAILURE;
  }
  // By its name and not by what the caller says that it is.
  openlog(kName, LOG_PID, LOG_USER);
  const uid_t caller = getuid();
  webapi::OutliveCallersSignals();
  webapi::LiftLimits();
  (void)std::signal(SIGPIPE, SIG_IGN);
  const bool prepared = Prepare();
  try {
    const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
    common::WipeArguments(argc, argv);
    if (arguments.size() == 1 && arguments.front() == kHelp) {
      return Print(kUsage) ? EXIT_SUCCESS : EXIT_FAILURE;
    }
    if (prepared) {
      return Run(arguments, caller);
    }
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "tool_main:%d %s", __LINE__, error.what());
  }
  (void)Apologize();
  return EXIT_FAILURE;
}
