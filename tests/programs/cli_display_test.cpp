#include "cli/display.h"

#include <gtest/gtest.h>
#include <json/reader.h>
#include <json/value.h>

#include <clocale>
#include <memory>
#include <string>

namespace cli {
namespace {

class CliDisplay : public testing::Test {
 protected:
  CliDisplay() { EXPECT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr); }
};

TEST_F(CliDisplay, PlainTextStaysAsItIs) {
  for (const char* text :
       {"", "abc", "Gr\u00f6\u00dfe", "\u65e5\u672c\u8a9e", "\U0001f600", "~ \\x1b"}) {
    EXPECT_EQ(Harmless(text), text);
  }
}

TEST_F(CliDisplay, ControlCharactersAreWrittenOut) {
  EXPECT_EQ(Harmless("a\x1b[31mb"), "a\\x1b[31mb");
  EXPECT_EQ(Harmless("a\nb\tc\r"), "a\\nb\\tc\\x0d");
  EXPECT_EQ(Harmless(std::string("a\0b", 3)), "a\\x00b");
  EXPECT_EQ(Harmless("\x7f"), "\\x7f");
  EXPECT_EQ(Harmless("\u0080\u009b\u009f"), "\\x80\\x9b\\x9f");
  EXPECT_EQ(Harmless("\u00a0"), "\u00a0");
}

TEST_F(CliDisplay, CharactersThatSteerOthersAreWrittenOut) {
  EXPECT_EQ(Harmless("\u202e\u2066\u200f\u061c"), "\\u202e\\u2066\\u200f\\u061c");
  EXPECT_EQ(Harmless("\u2028\u2029\ufeff\u200b\u00ad"), "\\u2028\\u2029\\ufeff\\u200b\\xad");
  EXPECT_EQ(Harmless("\U000e0041"), "\\ue0041");
  EXPECT_EQ(Harmless("\u0600\u06dd\u08e2\U000110bd\U0001d173"),
            "\\u0600\\u06dd\\u08e2\\u110bd\\u1d173");
}

TEST_F(CliDisplay, BytesThatAreNoTextAreReplaced) {
  EXPECT_EQ(Harmless("a\xff"
                     "b\xc3"),
            "a\ufffdb\ufffd");
  EXPECT_EQ(Harmless("\xed\xa0\x80"), "\ufffd\ufffd\ufffd");
}

TEST_F(CliDisplay, JsonStaysJsonOfTheSameValue) {
  const std::string json = "{\"a\":\"\u009b\u202e\U000e0041\x7f ok \u00e9\"}";
  const std::string harmless = HarmlessJson(json);
  EXPECT_EQ(harmless, "{\"a\":\"\\u009b\\u202e\\udb40\\udc41\\u007f ok \u00e9\"}");
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  Json::Value before;
  Json::Value after;
  ASSERT_TRUE(reader->parse(json.data(), json.data() + json.size(), &before, nullptr));
  ASSERT_TRUE(reader->parse(harmless.data(), harmless.data() + harmless.size(), &after, nullptr));
  EXPECT_EQ(before, after);
}

TEST_F(CliDisplay, WidthCountsColumns) {
  EXPECT_EQ(DisplayWidth(""), 0U);
  EXPECT_EQ(DisplayWidth("abc"), 3U);
  EXPECT_EQ(DisplayWidth("Gr\u00f6\u00dfe"), 5U);
  EXPECT_EQ(DisplayWidth("\u65e5\u672c"), 4U);
  EXPECT_EQ(DisplayWidth("e\u0301"), 1U);
  EXPECT_EQ(DisplayWidth("\U0001f600"), 2U);
}

TEST_F(CliDisplay, CutTextFits) {
  EXPECT_EQ(Cut("abcdef", 6), "abcdef");
  EXPECT_EQ(Cut("abcdef", 5), "abcd\u2026");
  EXPECT_EQ(Cut("abcdef", 1), "\u2026");
  EXPECT_EQ(Cut("", 3), "");
}

TEST_F(CliDisplay, WideCharactersAreCutWhole) {
  EXPECT_EQ(Cut("\u65e5\u672c\u8a9e", 6), "\u65e5\u672c\u8a9e");
  EXPECT_EQ(Cut("\u65e5\u672c\u8a9e", 5), "\u65e5\u672c\u2026");
  EXPECT_EQ(Cut("\u65e5\u672c\u8a9e", 4), "\u65e5\u2026");
}

}  // namespace
}  // namespace cli
