#include "webapi/answer.h"

#include <gtest/gtest.h>

#include "owner/argument.h"

namespace webapi {
namespace {

using owner::Error;
using owner::Problem;

TEST(WebapiAnswer, SuccessHasItsData) {
  Json::Value data(Json::objectValue);
  data["total"] = 3;
  EXPECT_EQ(owner::WriteJson(SuccessAnswer(data)), R"({"data":{"total":3},"success":true})");
}

TEST(WebapiAnswer, FailureHasItsField) {
  EXPECT_EQ(owner::WriteJson(FailureAnswer({Error::kBadValue, "must be at least 0", "use_count"})),
            R"({"error":{"code":203,"field":"use_count","message":"must be at least 0"},)"
            R"("success":false})");
}

TEST(WebapiAnswer, FailureOfNoFieldHasNone) {
  EXPECT_EQ(owner::WriteJson(FailureAnswer({Error::kNoSuchLink, "there is no such link", ""})),
            R"({"error":{"code":205,"message":"there is no such link"},"success":false})");
}

TEST(WebapiAnswer, EveryCodeHasItsStatus) {
  const struct {
    Error error;
    int status;
  } rows[] = {{Error::kInternal, 500},
              {Error::kMalformedRequest, 400},
              {Error::kNoSuchApi, 404},
              {Error::kNoSuchMethod, 404},
              {Error::kNoSuchVersion, 400},
              {Error::kNoAccount, 401},
              {Error::kForbidden, 403},
              {Error::kNeedsPost, 405},
              {Error::kNeedsJson, 415},
              {Error::kOtherOrigin, 403},
              {Error::kTooLarge, 413},
              {Error::kUnknownArgument, 400},
              {Error::kMissingArgument, 400},
              {Error::kWrongType, 400},
              {Error::kBadValue, 400},
              {Error::kHashTaken, 409},
              {Error::kNoSuchLink, 404},
              {Error::kFileNotAllowed, 403},
              {Error::kBusy, 503},
              {Error::kConflict, 400}};
  for (const auto& row : rows) {
    EXPECT_EQ(StatusOf(FailureAnswer({row.error, "text", ""})), row.status)
        << static_cast<int>(row.error);
  }
  EXPECT_EQ(StatusOf(SuccessAnswer(Json::Value(Json::objectValue))), 200);
}

TEST(WebapiAnswer, OneForNoMemoryIsLikeTheOthers) {
  EXPECT_EQ(kNoMemoryAnswer, owner::WriteJson(FailureAnswer(*owner::InternalFault())));
}

}  // namespace
}  // namespace webapi
