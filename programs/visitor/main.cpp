// sharing.cgi: serves one request of a visitor to a sharing link, as a CGI program.
#include <syslog.h>
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <exception>

#include "visitor/answer.h"
#include "visitor/environment.h"
#include "visitor/page_answers.h"
#include "visitor/privileges.h"
#include "visitor/purge.h"
#include "visitor/request.h"
#include "visitor/session_cookie.h"
#include "visitor/stream.h"
#include "visitor/visitor.h"

namespace {

using visitor::Answer;

// A request's context, freed at the end.
class Context {
 public:
  Context() : ok_(TuvoCgiInit("", &cgi_) == 1) {}
  ~Context() { TuvoCgiFree(&cgi_); }
  Context(const Context&) = delete;
  Context& operator=(const Context&) = delete;

  bool ok() const { return ok_; }
  TUVOCGI* get() { return &cgi_; }

 private:
  TUVOCGI cgi_{};
  bool ok_;
};

bool SendHeaders(const Answer& answer, TUVOCGI* cgi) {
  return visitor::WriteAll(STDOUT_FILENO, visitor::HeaderLines(answer)) &&
         (!answer.carries_cookie || visitor::WriteSessionCookie(cgi, stdout)) &&
         visitor::WriteAll(STDOUT_FILENO, "\r\n");
}

// A visitor who goes away in the middle is nothing to report.
bool Send(const Answer& answer, bool with_body, TUVOCGI* cgi) {
  if (!SendHeaders(answer, cgi)) {
    return false;
  }
  if (!with_body) {
    return true;
  }
  if (answer.file) {
    return visitor::CopyAll(answer.file->fd.get(), answer.file->offset, answer.file->length,
                            STDOUT_FILENO);
  }
  return visitor::WriteAll(STDOUT_FILENO, answer.body);
}

Answer AnswerTo(const visitor::Request& request, Context* context) {
  try {
    return context->ok() ? visitor::Handle(request, context->get())
                         : visitor::NoticeAnswer(visitor::Notice::kBadRequest);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "main:%d request failed: %s", __LINE__, error.what());
    return visitor::NoticeAnswer(visitor::Notice::kFailure);
  }
}

// The web server takes the end of this program's output for the end of the answer, and ends the
// program then (SIGTERM): the visitor no longer waits, and the purge is not cut short.
void PurgeBehindTheAnswer() {
  (void)std::signal(SIGTERM, SIG_IGN);
  (void)std::fclose(stdout);
  visitor::PurgeNowAndThen();
}

int ServeRequest() {
  Context context;
  visitor::Request request;
  if (context.ok()) {
    request = visitor::ReadRequest(context.get());
  }
  const Answer answer = AnswerTo(request, &context);
  const bool sent = Send(answer, request.method != visitor::Method::kHead, context.get());
  if (answer.carries_cookie) {
    PurgeBehindTheAnswer();
  }
  return sent ? 0 : 1;
}

int Run() {
  if (!visitor::KeepOnlyRequestVariables()) {
    Send(visitor::NoticeAnswer(visitor::Notice::kFailure), true, nullptr);
    return 1;
  }
  return ServeRequest();
}

}  // namespace

int main() {
  const bool dropped = visitor::DropPrivileges();
  (void)std::signal(SIGPIPE, SIG_IGN);
  try {
    if (dropped) {
      return Run();
    }
    Send(visitor::NoticeAnswer(visitor::Notice::kFailure), true, nullptr);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "main:%d %s", __LINE__, error.what());
  }
  return 1;
}
