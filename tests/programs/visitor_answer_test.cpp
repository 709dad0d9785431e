#include "visitor/answer.h"

#include <gtest/gtest.h>

#include <stdexcept>

namespace visitor {
namespace {

TEST(VisitorAnswer, HeadersComeAsCgiHasThem) {
  Answer answer;
  answer.status = 403;
  answer.body = "12345";
  AddHeader(&answer, "X-One", "1");
  EXPECT_EQ(HeaderLines(answer),
            "Status: 403 Forbidden\r\n"
            "X-One: 1\r\n"
            "Content-Length: 5\r\n"
            "Cache-Control: no-store\r\n"
            "Referrer-Policy: no-referrer\r\n"
            "X-Robots-Tag: noindex\r\n"
            "X-Content-Type-Options: nosniff\r\n");
}

TEST(VisitorAnswer, LengthOfAPieceOfAFile) {
  Answer answer;
  answer.status = 206;
  answer.file = FilePiece{common::UniqueFd(), 7, 5000000000};
  EXPECT_NE(HeaderLines(answer).find("\r\nContent-Length: 5000000000\r\n"), std::string::npos);
}

TEST(VisitorAnswer, NotModifiedHasNoLength) {
  Answer answer;
  answer.status = 304;
  EXPECT_EQ(HeaderLines(answer).find("Content-Length"), std::string::npos);
}

TEST(VisitorAnswer, ValueThatCouldEndItsHeaderIsRefused) {
  Answer answer;
  for (const char* value : {"a\r\nb", "a\nb", "a\rb", "a\x01", "\x7f"}) {
    EXPECT_THROW(AddHeader(&answer, "X", value), std::invalid_argument);
  }
  EXPECT_THROW(AddHeader(&answer, "X", std::string_view("\0", 1)), std::invalid_argument);
  EXPECT_TRUE(answer.headers.empty());
}

}  // namespace
}  // namespace visitor
