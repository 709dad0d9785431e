#include "webapi/handler.h"

#include <syslog.h>

#include <exception>
#include <utility>

#include "common/event_log.h"
#include "owner/argument.h"
#include "webapi/answer.h"
#include "webapi/registry.h"

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::MaybeProblem;

constexpr int kDone = 1;

MaybeProblem CheckFront(const Call& call, const Method& method) {
  if (method.changes && !call.may_change) {
    return Fault(Error::kNeedsPost, "this method changes something and needs a POST");
  }
  if (!call.same_origin) {
    return Fault(Error::kOtherOrigin, "the request comes from another site");
  }
  return call.account ? std::nullopt
                      : Fault(Error::kNoAccount, "there is no account that the system knows");
}

MaybeProblem ReadArguments(const Call& call, const Method& method, Json::Value* arguments) {
  *arguments = call.arguments;
  if (call.texts) {
    if (MaybeProblem problem = owner::ConvertTexts(method.arguments, arguments)) {
      return problem;
    }
  }
  return owner::CheckArguments(*arguments, method.arguments);
}

// What a call has come to, for the answer and for the event log.
struct Outcome {
  const Method* method = nullptr;
  MaybeProblem problem;
  Json::Value data = Json::Value(Json::objectValue);
  std::string links;
  int link = 0;
  bool is_event = true;
};

void LogChange(const Call& call, Outcome* outcome) {
  if (outcome->method == nullptr || !outcome->method->changes || !outcome->is_event) {
    return;
  }
  outcome->is_event = false;  // one line
  common::Event event{};
  event.name = outcome->method->name;
  event.link = outcome->link;
  event.address = call.address;
  event.result = outcome->problem ? static_cast<int>(outcome->problem->error) : kDone;
  if (call.account) {
    event.by = call.account->uid;
  }
  common::LogEvent(event);
}

MaybeProblem Run(const Call& call, Outcome* outcome) {
  if (MaybeProblem problem = FindMethod(call, &outcome->method)) {
    return problem;
  }
  if (MaybeProblem problem = CheckFront(call, *outcome->method)) {
    return problem;
  }
  Json::Value arguments;
  if (MaybeProblem problem = ReadArguments(call, *outcome->method, &arguments)) {
    return problem;
  }
  const std::function<void()> note_change = [&call, outcome] { LogChange(call, outcome); };
  Turn turn{*call.account,  arguments,     call.place,        std::time(nullptr), outcome->data,
            outcome->links, outcome->link, outcome->is_event, note_change};
  return outcome->method->run(&turn);
}

}  // namespace

Answer Handle(const Call& call) {
  Outcome outcome;
  try {
    outcome.problem = Run(call, &outcome);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "handler:%d request failed: %s", __LINE__, error.what());
    outcome.problem = owner::InternalFault();
  }
  LogChange(call, &outcome);
  if (outcome.problem) {
    return {FailureAnswer(*outcome.problem), {}};
  }
  return {SuccessAnswer(std::move(outcome.data)), std::move(outcome.links)};
}

}  // namespace webapi
