#include "visitor/service.h"

#include <syslog.h>
#include <tuvoplatform/cgi.h>
#include <tuvosharing/sharing_db.h>

#include <exception>
#include <optional>
#include <string>

#include "visitor/answer.h"
#include "visitor/events.h"
#include "visitor/page_answers.h"
#include "visitor/purge.h"
#include "visitor/request.h"
#include "visitor/session_cookie.h"
#include "visitor/visitor.h"

namespace visitor {

namespace {

constexpr std::string_view kLineEnd = "\r\n";

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

// Status, headers and the empty line; nothing when the cookie cannot be written.
std::optional<std::string> HeadOf(const Answer& answer, TUVOCGI* cgi) {
  std::string head = HeaderLines(answer);
  if (answer.carries_cookie) {
    const std::optional<std::string> cookie = SessionCookieLine(cgi);
    if (!cookie) {
      return std::nullopt;
    }
    head += *cookie;
  }
  return head.append(kLineEnd);
}

// What is written may wait in a buffer: only the end tells whether all of it got out.
bool SendFile(const FilePiece& file, std::string_view head, common::Exchange* exchange) {
  const bool whole = exchange->Write(head) &&
                     exchange->WriteFile(file.fd.get(), file.offset, file.length) &&
                     exchange->Finish();
  LogDownload(file.link, whole);
  return whole;
}

// A visitor who goes away in the middle is no error.
bool Send(const Answer& answer, bool with_body, TUVOCGI* cgi, common::Exchange* exchange) {
  const std::optional<std::string> head = HeadOf(answer, cgi);
  if (!head) {
    return false;
  }
  if (with_body && answer.file) {
    return SendFile(*answer.file, *head, exchange);
  }
  return exchange->Write(*head) && (!with_body || exchange->Write(answer.body));
}

Answer AnswerTo(const Request& request, Context* context) {
  try {
    return context->ok() ? Handle(request, context->get()) : NoticeAnswer(Notice::kBadRequest);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "service:%d request failed: %s", __LINE__, error.what());
    return NoticeAnswer(Notice::kFailure);
  }
}

}  // namespace

std::vector<std::string_view> RequestVariables() {
  return {
      "REQUEST_METHOD",
      "PATH_INFO",
      "QUERY_STRING",
      "CONTENT_TYPE",
      "CONTENT_LENGTH",
      "REMOTE_ADDR",
      "HTTPS",
      "HTTP_COOKIE",
      "HTTP_RANGE",
      "HTTP_IF_RANGE",
      "HTTP_IF_MATCH",
      "HTTP_IF_NONE_MATCH",
      "HTTP_IF_MODIFIED_SINCE",
      "HTTP_IF_UNMODIFIED_SINCE",
      "HTTP_SEC_FETCH_SITE",
  };
}

bool ServeExchange(common::Exchange& exchange) {
  Context context;
  Request request;
  if (context.ok()) {
    request = ReadRequest(context.get());
  }
  const Answer answer = AnswerTo(request, &context);
  const bool sent = Send(answer, request.method != Method::kHead, context.get(), &exchange);
  if (answer.carries_cookie) {
    (void)exchange.Finish();
    PurgeNowAndThen();
  }
  return sent;
}

void Apologize(common::Exchange& exchange) {
  (void)Send(NoticeAnswer(Notice::kFailure), true, nullptr, &exchange);
}

bool IsFit() {
  return TUVO::sharing::db::SharingDB::Instance().IsGood();
}

}  // namespace visitor
