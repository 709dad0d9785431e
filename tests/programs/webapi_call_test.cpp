#include "webapi/call.h"

#include <gtest/gtest.h>

#include "owner/argument.h"

namespace webapi {
namespace {

using owner::Error;

Json::Value Parsed(const std::string& text) {
  Json::Value value;
  EXPECT_TRUE(owner::ReadJson(text, &value)) << text;
  return value;
}

// The code that reading the request comes to; 0: none.
int CodeOf(const std::string& text, bool texts) {
  Call call;
  const owner::MaybeProblem problem = ReadCall(Parsed(text), texts, &call);
  return problem ? static_cast<int>(problem->error) : 0;
}

int VersionOf(const std::string& json, bool texts) {
  Call call;
  const owner::MaybeProblem problem =
      ReadCall(Parsed(R"({"api":"A","method":"m","version":)" + json + "}"), texts, &call);
  return problem ? -1000 : call.version;
}

TEST(WebapiCall, NamesAreTakenOutOfTheArguments) {
  Call call;
  ASSERT_FALSE(
      ReadCall(Parsed(R"({"api":"A","version":7,"method":"m","id":1,"x":[2]})"), false, &call));
  EXPECT_EQ(call.api, "A");
  EXPECT_EQ(call.version, 7);
  EXPECT_EQ(call.method, "m");
  EXPECT_EQ(call.arguments, Parsed(R"({"id":1,"x":[2]})"));
  EXPECT_FALSE(call.texts);
}

TEST(WebapiCall, TextsStayTexts) {
  Call call;
  ASSERT_FALSE(ReadCall(Parsed(R"({"api":"A","version":"7","method":"m","id":"1"})"), true, &call));
  EXPECT_EQ(call.arguments["id"], "1");
  EXPECT_TRUE(call.texts);
}

TEST(WebapiCall, WithoutArgumentsThereIsAnEmptyObject) {
  Call call;
  ASSERT_FALSE(ReadCall(Parsed(R"({"api":"A","version":1,"method":"m"})"), false, &call));
  EXPECT_EQ(call.arguments, Json::Value(Json::objectValue));
}

TEST(WebapiCall, RequestIsAnObject) {
  for (const char* text : {"[]", "null", "7", "\"api\"", "true"}) {
    EXPECT_EQ(CodeOf(text, false), 101) << text;
  }
}

TEST(WebapiCall, AllThreeNamesAreNeeded) {
  EXPECT_EQ(CodeOf(R"({"version":1,"method":"m"})", false), 101);
  EXPECT_EQ(CodeOf(R"({"api":"A","method":"m"})", false), 101);
  EXPECT_EQ(CodeOf(R"({"api":"A","version":1})", false), 101);
  EXPECT_EQ(CodeOf(R"({"api":1,"version":1,"method":"m"})", false), 101);
  EXPECT_EQ(CodeOf(R"({"api":"A","version":1,"method":null})", false), 101);
}

TEST(WebapiCall, VersionIsAWholeNumber) {
  EXPECT_EQ(VersionOf("1", false), 1);
  EXPECT_EQ(VersionOf("-5", false), -5);
  for (const char* json : {"1.0", "1.5", "\"1\"", "true", "null", "[1]", "{}"}) {
    EXPECT_EQ(VersionOf(json, false), -1000) << json;
  }
}

TEST(WebapiCall, VersionOfATextIsADecimal) {
  EXPECT_EQ(VersionOf("\"1\"", true), 1);
  EXPECT_EQ(VersionOf("\"-3\"", true), -3);
  for (const char* json : {"\"\"", "\"-\"", "\"1 \"", "\"+1\"", "\"1.0\"", "\"x\"", "1"}) {
    EXPECT_EQ(VersionOf(json, true), -1000) << json;
  }
}

TEST(WebapiCall, VersionThatIsNoIntIsNoVersion) {
  EXPECT_EQ(VersionOf("2147483648", false), -1);
  EXPECT_EQ(VersionOf("18446744073709551615", false), -1);
  EXPECT_EQ(VersionOf("\"2147483648\"", true), -1);
  EXPECT_EQ(VersionOf("\"99999999999999999999999999\"", true), -1);
}

}  // namespace
}  // namespace webapi
