// entry.cgi: the web API over HTTP, as a CGI or FastCGI program.
#include <syslog.h>
#include <tuvosharing/sharing_db.h>

#include <exception>

#include "common/exchange.h"
#include "common/gateway.h"
#include "webapi/answer.h"
#include "webapi/handler.h"
#include "webapi/http_answer.h"
#include "webapi/http_request.h"

namespace {

constexpr int kInternalStatus = 500;

bool Send(common::Exchange& exchange, int status, std::string_view body) {
  const webapi::HttpMethod method = webapi::RequestMethod();
  return exchange.Write(webapi::HeadOf(status, method, body.size())) &&
         (method == webapi::HttpMethod::kHead || exchange.Write(body)) && exchange.Finish();
}

webapi::Answer AnswerTo(common::Exchange& exchange) {
  webapi::Call call;
  if (const owner::MaybeProblem problem = webapi::ReadHttpCall(exchange, &call)) {
    return {webapi::FailureAnswer(*problem), {}};
  }
  return webapi::Handle(call);
}

void Apologize(common::Exchange& exchange) {
  (void)Send(exchange, kInternalStatus, webapi::kNoMemoryAnswer);
}

bool Serve(common::Exchange& exchange) {
  int status = kInternalStatus;
  std::string body;
  try {
    const webapi::Answer answer = AnswerTo(exchange);
    status = webapi::StatusOf(answer.document);
    body = webapi::TextOf(answer);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "entry_main:%d request failed: %s", __LINE__, error.what());
    Apologize(exchange);
    return false;
  }
  return Send(exchange, status, body);
}

// A database that could not be opened stays so for the life of the process.
bool IsFit() {
  return TUVO::sharing::db::SharingDB::Instance().IsGood();
}

}  // namespace

int main() {
  openlog("entry.cgi", LOG_PID, LOG_USER);
  common::Program program;
  program.variables = {webapi::kRequestVariables.begin(), webapi::kRequestVariables.end()};
  program.serve = Serve;
  program.apologize = Apologize;
  program.is_fit = IsFit;
  return common::RunGateway(program);
}
