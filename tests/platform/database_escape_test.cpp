#include <gtest/gtest.h>
#include <tuvoplatform/database.h>

#include <random>
#include <string>

#include "platform/database_handles.h"
#include "platform/temp_folder.h"

namespace {

using tuvo_test::Connect;
using tuvo_test::Db;

// What lies behind and in the buffer before the call.
constexpr char kUntouched = '#';

struct Escaped {
  int code;
  std::string buffer;  // `size` bytes and 2 that are not the function's
};

Escaped Escape(const std::string& text, unsigned int size) {
  Escaped escaped{0, std::string(size + 2, kUntouched)};
  escaped.code = TUVODBEscapeStringEX2(nullptr, escaped.buffer.data(), size, text.data(),
                                       static_cast<unsigned int>(text.size()));
  return escaped;
}

TEST(DatabaseEscape, DoublesEverySingleQuote) {
  EXPECT_STREQ("it''s", Escape("it's", 64).buffer.c_str());
  EXPECT_STREQ("''''", Escape("''", 64).buffer.c_str());
  EXPECT_STREQ("plain", Escape("plain", 64).buffer.c_str());
}

TEST(DatabaseEscape, ReturnsTheBytesWrittenWithoutTheZero) {
  EXPECT_EQ(5, Escape("it's", 64).code);
  EXPECT_EQ(0, Escape("", 64).code);
}

TEST(DatabaseEscape, EndsWithAZeroWhenThereIsRoomForIt) {
  const Escaped escaped = Escape("it's", 6);
  EXPECT_EQ(5, escaped.code);
  EXPECT_EQ(std::string("it''s\0##", 8), escaped.buffer);
}

TEST(DatabaseEscape, ResultThatFillsTheBufferExactlyHasNoZero) {
  const Escaped quotes = Escape("'''", 6);
  EXPECT_EQ(6, quotes.code);
  EXPECT_EQ("''''''##", quotes.buffer);

  const Escaped plain = Escape("abc", 3);
  EXPECT_EQ(3, plain.code);
  EXPECT_EQ("abc##", plain.buffer);
}

TEST(DatabaseEscape, EmptyTextFitsABufferOfNoSize) {
  const Escaped escaped = Escape("", 0);
  EXPECT_EQ(0, escaped.code);
  EXPECT_EQ("##", escaped.buffer);
}

TEST(DatabaseEscape, FailsWhenTheBufferIsTooSmallAndStaysWithinIt) {
  for (unsigned int size = 0; size < 6; ++size) {
    const Escaped escaped = Escape("a''b", size);
    EXPECT_EQ(-1, escaped.code) << size;
    EXPECT_EQ("##", escaped.buffer.substr(size)) << size;
  }
  EXPECT_EQ(6, Escape("a''b", 6).code);
}

TEST(DatabaseEscape, FailsWithoutBufferOrText) {
  char buffer[8];
  EXPECT_EQ(-1, TUVODBEscapeStringEX2(nullptr, nullptr, 8, "a", 1));
  EXPECT_EQ(-1, TUVODBEscapeStringEX2(nullptr, buffer, sizeof buffer, nullptr, 1));
}

TEST(DatabaseEscape, LeavesAllOtherBytesAlone) {
  const std::string text("\\ \" \n \x01 \xff ; -- % \0 end", 23);
  EXPECT_EQ(text, Escape(text, 64).buffer.substr(0, text.size()));
}

TEST(DatabaseEscape, TakesTheLengthAndNotTheZero) {
  char buffer[8];
  EXPECT_EQ(2, TUVODBEscapeStringEX2(nullptr, buffer, sizeof buffer, "abcdef", 2));
  EXPECT_STREQ("ab", buffer);
}

TEST(DatabaseEscape, TextsComeBackUnchangedThroughALiteral) {
  const tuvo_test::TempFolder folder;
  const Db db = Connect(folder / "test.db");
  ASSERT_NE(nullptr, db);
  std::mt19937 random(1);
  std::uniform_int_distribution<int> length(0, 40);
  std::uniform_int_distribution<int> byte(1, 127);
  for (int round = 0; round < 500; ++round) {
    std::string text;
    for (int i = length(random); i > 0; --i) {
      text.push_back(i % 3 == 0 ? '\'' : static_cast<char>(byte(random)));
    }
    const Escaped escaped = Escape(text, static_cast<unsigned int>(2 * text.size()));
    ASSERT_GE(escaped.code, 0);
    const std::string literal = escaped.buffer.substr(0, static_cast<size_t>(escaped.code));
    EXPECT_EQ(text, tuvo_test::Value(db, "SELECT '" + literal + "' AS value"));
  }
}

}  // namespace
