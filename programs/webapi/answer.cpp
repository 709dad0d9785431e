#include "webapi/answer.h"

#include <utility>

#include "owner/argument.h"

namespace webapi {

namespace {

using owner::Error;

constexpr int kOk = 200;

int StatusOf(Error error) {
  switch (error) {
    case Error::kInternal:
      return 500;
    case Error::kNoAccount:
      return 401;
    case Error::kForbidden:
    case Error::kOtherOrigin:
    case Error::kFileNotAllowed:
      return 403;
    case Error::kNoSuchApi:
    case Error::kNoSuchMethod:
    case Error::kNoSuchLink:
      return 404;
    case Error::kNeedsPost:
      return 405;
    case Error::kHashTaken:
      return 409;
    case Error::kTooLarge:
      return 413;
    case Error::kNeedsJson:
      return 415;
    case Error::kBusy:
      return 503;
    default:
      return 400;
  }
}

}  // namespace

std::string TextOf(const Answer& answer) {
  if (answer.links.empty()) {
    return owner::WriteJson(answer.document);
  }
  const std::string others = owner::WriteJson(answer.document["data"]).substr(1);
  std::string text = R"({"data":{"links":)";
  text.reserve(text.size() + answer.links.size() + others.size() + 16);
  text.append(answer.links).append(others == "}" ? "" : ",").append(others);
  return text.append(R"(,"success":true})");
}

Json::Value SuccessAnswer(Json::Value data) {
  Json::Value answer(Json::objectValue);
  answer["success"] = true;
  answer["data"] = std::move(data);
  return answer;
}

Json::Value FailureAnswer(const owner::Problem& problem) {
  Json::Value error(Json::objectValue);
  error["code"] = static_cast<int>(problem.error);
  error["message"] = problem.message;
  if (!problem.field.empty()) {
    error["field"] = problem.field;
  }
  Json::Value answer(Json::objectValue);
  answer["success"] = false;
  answer["error"] = error;
  return answer;
}

bool IsSuccess(const Json::Value& answer) {
  return answer["success"].asBool();
}

int StatusOf(const Json::Value& answer) {
  return IsSuccess(answer) ? kOk : StatusOf(static_cast<Error>(answer["error"]["code"].asInt()));
}

}  // namespace webapi
