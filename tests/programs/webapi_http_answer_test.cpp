#include "webapi/http_answer.h"

#include <gtest/gtest.h>

namespace webapi {
namespace {

std::string Head(int status, HttpMethod method = HttpMethod::kPost) {
  return HeadOf(status, method, 7);
}

bool Has(const std::string& head, const std::string& line) {
  return head.find("\r\n" + line + "\r\n") != std::string::npos;
}

TEST(WebapiHttpAnswer, HeadEndsWithAnEmptyLine) {
  const std::string head = Head(200);
  EXPECT_EQ(head.substr(0, 16), "Status: 200 OK\r\n");
  EXPECT_EQ(head.find("\r\n\r\n"), head.size() - 4);
  EXPECT_TRUE(Has(head, "Content-Length: 7"));
}

TEST(WebapiHttpAnswer, EveryAnswerIsKeptFromOtherSites) {
  for (const int status : {200, 400, 401, 403, 404, 405, 409, 413, 415, 500, 503}) {
    const std::string head = Head(status);
    EXPECT_TRUE(Has(head, "Content-Type: application/json")) << status;
    EXPECT_TRUE(Has(head, "Cache-Control: no-store")) << status;
    EXPECT_TRUE(Has(head, "X-Content-Type-Options: nosniff")) << status;
    EXPECT_TRUE(Has(head, "Cross-Origin-Resource-Policy: same-origin")) << status;
    EXPECT_EQ(head.find("Internal Server Error") != std::string::npos, status == 500) << status;
    EXPECT_EQ(head.find("WWW-Authenticate"), std::string::npos);
    EXPECT_EQ(head.find("Access-Control"), std::string::npos);
  }
}

TEST(WebapiHttpAnswer, MethodNotAllowedTellsWhichAre) {
  EXPECT_TRUE(Has(Head(405, HttpMethod::kGet), "Allow: POST"));
  EXPECT_TRUE(Has(Head(405, HttpMethod::kOther), "Allow: GET, HEAD, POST"));
  EXPECT_EQ(Head(200).find("Allow"), std::string::npos);
}

TEST(WebapiHttpAnswer, BusyTellsWhenToTryAgain) {
  EXPECT_TRUE(Has(Head(503), "Retry-After: 1"));
  EXPECT_EQ(Head(500).find("Retry-After"), std::string::npos);
}

}  // namespace
}  // namespace webapi
