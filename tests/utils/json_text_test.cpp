#include <gtest/gtest.h>
#include <internal/json_text.h>
#include <pthread.h>

#include <cmath>
#include <functional>
#include <limits>
#include <string>
#include <vector>

namespace {

using TUVO::sharing::JsonToText;
using TUVO::sharing::kDeepestJson;
using TUVO::sharing::TextToJson;

constexpr size_t kSmallStack = 256 * 1024;

bool Parses(const std::string& text) {
  Json::Value value;
  return TextToJson(text, value);
}

std::string Repeated(const std::string& text, int times) {
  std::string all;
  for (int i = 0; i < times; ++i) {
    all += text;
  }
  return all;
}

// `count` arrays in one another; the innermost holds `inner`.
std::string Arrays(int count, const std::string& inner) {
  return Repeated("[", count) + inner + Repeated("]", count);
}

std::string Objects(int count, const std::string& inner) {
  return Repeated("{\"a\":", count) + inner + Repeated("}", count);
}

std::string RoundTrip(const std::string& text) {
  Json::Value value(Json::objectValue);
  value["text"] = text;
  Json::Value back;
  EXPECT_TRUE(TextToJson(JsonToText(value), back));
  return back["text"].asString();
}

void* CallBody(void* body) {
  (*static_cast<const std::function<void()>*>(body))();
  return nullptr;
}

// Runs `body` on a thread with as little stack as the smallest web programs have.
void OnSmallStack(const std::function<void()>& body) {
  pthread_attr_t attributes;
  ASSERT_EQ(pthread_attr_init(&attributes), 0);
  ASSERT_EQ(pthread_attr_setstacksize(&attributes, kSmallStack), 0);
  pthread_t thread{};
  ASSERT_EQ(
      pthread_create(&thread, &attributes, &CallBody, const_cast<std::function<void()>*>(&body)),
      0);
  ASSERT_EQ(pthread_join(thread, nullptr), 0);
  pthread_attr_destroy(&attributes);
}

TEST(JsonToText, IsOneLineWithoutBlanksBetweenTokensAndWithoutALineEnd) {
  Json::Value value;
  Json::Value empty_object(Json::objectValue);
  value["b"] = 1;
  value["a"].append(true);
  value["a"].append(Json::Value());
  value["a"].append("x y");
  value["c"] = empty_object;
  value["d"] = Json::Value(Json::arrayValue);
  EXPECT_EQ(JsonToText(value), R"({"a":[true,null,"x y"],"b":1,"c":{},"d":[]})");
}

TEST(JsonToText, SingleValuesAreDocumentsToo) {
  EXPECT_EQ(JsonToText(Json::Value()), "null");
  EXPECT_EQ(JsonToText(Json::Value("text")), "\"text\"");
  EXPECT_EQ(JsonToText(Json::Value(Json::UInt(4294967295U))), "4294967295");
  EXPECT_EQ(JsonToText(Json::Value(-1)), "-1");
}

TEST(JsonToText, CommentsOfAReadDocumentAreLeftOut) {
  Json::Value value;
  ASSERT_TRUE(TextToJson("// before\n{\"a\": /* inside */ 1 // behind\n}\n", value));
  EXPECT_EQ(JsonToText(value), R"({"a":1})");
}

TEST(JsonToText, ControlCharactersQuotesAndBackslashesAreEscaped) {
  EXPECT_EQ(JsonToText(Json::Value("a\"b\\c\n\r\t\b\f\x01\x1f")),
            R"("a\"b\\c\n\r\t\b\f\u0001\u001f")");
}

TEST(JsonText, EveryByteComesBack) {
  for (int byte = 0; byte < 256; ++byte) {
    const std::string text = std::string("a") + static_cast<char>(byte) + "b";
    EXPECT_EQ(RoundTrip(text), text) << byte;
  }
}

TEST(JsonText, EveryPairOfBytesComesBack) {
  for (int first = 0; first < 256; ++first) {
    std::string text;
    for (int second = 0; second < 256; ++second) {
      text += static_cast<char>(first);
      text += static_cast<char>(second);
    }
    EXPECT_EQ(RoundTrip(text), text) << first;
  }
}

TEST(JsonText, TextsThatAreNotUtf8ComeBackByteForByte) {
  for (const char* text : {"\xff\xfe", "\xc3", "\xc3(", "\xe2\x82", "\xf0\x9f\x98", "\xed\xa0\x80",
                           "\xc0\x80", "\xf8\x88\x80\x80\x80"}) {
    EXPECT_EQ(RoundTrip(text), text);
  }
}

TEST(JsonText, TextsInUtf8ComeBackByteForByte) {
  for (const char* text :
       {"Gr\xc3\xbc\xc3\x9f"
        "e",
        "\xe2\x82\xac", "\xf0\x9f\x98\x80", "\xe2\x80\xa8\xe2\x80\xa9", "\xef\xbb\xbf"}) {
    EXPECT_EQ(RoundTrip(text), text);
  }
}

TEST(JsonText, ANulByteInATextComesBackAndIsNoNulInTheDocument) {
  const std::string text("a\0b\0", 4);
  EXPECT_EQ(RoundTrip(text), text);
  EXPECT_EQ(JsonToText(Json::Value(text)).find('\0'), std::string::npos);
}

TEST(JsonText, MemberNamesComeBackByteForByteToo) {
  const std::string name("\xff\"\\\n\0z", 6);
  Json::Value value(Json::objectValue);
  value[name] = 1;
  Json::Value back;
  ASSERT_TRUE(TextToJson(JsonToText(value), back));
  EXPECT_EQ(back.getMemberNames(), std::vector<std::string>{name});
}

TEST(JsonText, NumbersComeBackAsTheyWere) {
  Json::Value value(Json::arrayValue);
  value.append(Json::Value(Json::Value::maxLargestInt));
  value.append(Json::Value(Json::Value::minLargestInt));
  value.append(Json::Value(Json::Value::maxLargestUInt));
  value.append(0.1);
  value.append(1e300);
  Json::Value back;
  ASSERT_TRUE(TextToJson(JsonToText(value), back));
  EXPECT_EQ(back, value);
}

// They have no form in JSON, but a document that holds one must stay readable.
TEST(JsonText, NumbersThatAreNoneComeBackToo) {
  Json::Value value(Json::arrayValue);
  value.append(std::numeric_limits<double>::infinity());
  value.append(-std::numeric_limits<double>::infinity());
  value.append(std::numeric_limits<double>::quiet_NaN());
  value.append("after");
  Json::Value back;
  ASSERT_TRUE(TextToJson(JsonToText(value), back)) << JsonToText(value);
  EXPECT_EQ(back[0].asDouble(), std::numeric_limits<double>::infinity());
  EXPECT_EQ(back[1].asDouble(), -std::numeric_limits<double>::infinity());
  EXPECT_TRUE(std::isnan(back[2].asDouble()));
  EXPECT_EQ(back[3].asString(), "after");
}

TEST(TextToJson, WhatIsNoDocumentIsRefused) {
  for (const char* text :
       {"", " ", "{", "[", "]", "{]", "{\"a\"}", "{\"a\":}", "[1,]", "{\"a\":1,}", "\"open", "nul",
        "tru", "{'a':1}", "plain text", "{a:1}", "\"\\x\""}) {
    EXPECT_FALSE(Parses(text)) << text;
  }
  EXPECT_FALSE(Parses(std::string("{\"a\":\0}", 7)));
}

TEST(TextToJson, BlanksAndCommentsAreSkipped) {
  Json::Value value;
  ASSERT_TRUE(TextToJson(" /* one */ {\n\t\"a\" : 1 // two\n} ", value));
  EXPECT_EQ(value["a"].asInt(), 1);
}

TEST(TextToJson, CommentsAreKeptWithTheirValues) {
  Json::Value value;
  ASSERT_TRUE(TextToJson("{\"a\": /* x */ 1}", value));
  EXPECT_EQ(value["a"].getComment(Json::commentBefore), "/* x */");
}

// The innermost value counts: so many values may be open in one another.
TEST(TextToJson, AsManyValuesInOneAnotherAsTheBoundAreRead) {
  EXPECT_TRUE(Parses(Arrays(kDeepestJson, "")));
  EXPECT_TRUE(Parses(Arrays(kDeepestJson - 1, "1")));
  EXPECT_TRUE(Parses(Objects(kDeepestJson - 1, "1")));
  EXPECT_TRUE(Parses(Objects(kDeepestJson - 1, "{}")));
  EXPECT_TRUE(Parses(Objects(kDeepestJson - 1, "[]")));
}

TEST(TextToJson, OneMoreIsRefused) {
  EXPECT_FALSE(Parses(Arrays(kDeepestJson + 1, "")));
  EXPECT_FALSE(Parses(Arrays(kDeepestJson, "1")));
  EXPECT_FALSE(Parses(Objects(kDeepestJson, "1")));
  EXPECT_FALSE(Parses(Objects(kDeepestJson, "{}")));
  EXPECT_FALSE(Parses(Objects(kDeepestJson, "[]")));
}

TEST(TextToJson, TheBoundIsOneOfDepthNotOfSize) {
  EXPECT_TRUE(Parses("[" + Repeated("[],", 100000) + "[]]"));
}

TEST(TextToJson, TheDeepestDocumentsFitOnASmallStack) {
  OnSmallStack([] {
    EXPECT_TRUE(Parses(Arrays(kDeepestJson, "")));
    EXPECT_TRUE(Parses(Objects(kDeepestJson - 1, "1")));
    EXPECT_FALSE(Parses(Arrays(kDeepestJson + 1, "")));
    EXPECT_FALSE(Parses(Objects(kDeepestJson + 1, "1")));
  });
}

TEST(TextToJson, AMillionLevelsAreRefusedOnASmallStackWithoutAnyHarm) {
  const std::string arrays = Repeated("[", 1000000);
  const std::string objects = Repeated("{\"a\":", 1000000);
  OnSmallStack([&] {
    EXPECT_FALSE(Parses(arrays));
    EXPECT_FALSE(Parses(objects));
    EXPECT_FALSE(Parses(arrays + "1" + Repeated("]", 1000000)));
  });
}

TEST(TextToJson, TheDeepestDocumentIsWrittenAgainOnASmallStack) {
  OnSmallStack([] {
    const std::string text = Arrays(kDeepestJson, "");
    Json::Value value;
    ASSERT_TRUE(TextToJson(text, value));
    EXPECT_EQ(JsonToText(value), text);
  });
}

TEST(TextToJson, ARefusedDocumentDoesNotSpoilTheNext) {
  EXPECT_FALSE(Parses(Arrays(kDeepestJson + 1, "")));
  EXPECT_TRUE(Parses("{}"));
}

}  // namespace
