#include "owner/argument.h"

#include <gtest/gtest.h>

#include <string>

namespace owner {
namespace {

const std::vector<Argument> kKnown = {{"text", Kind::kText, true},
                                      {"number", Kind::kInteger},
                                      {"flag", Kind::kBoolean},
                                      {"names", Kind::kTextList},
                                      {"tree", Kind::kObject}};

Json::Value Given(const std::string& json) {
  Json::Value value;
  EXPECT_TRUE(ReadJson(json, &value)) << json;
  return value;
}

Problem ProblemOf(const Json::Value& arguments) {
  const MaybeProblem problem = CheckArguments(arguments, kKnown);
  return problem ? *problem : Problem{static_cast<Error>(0), "", ""};
}

Json::Value Nested(int levels) {
  Json::Value value(Json::objectValue);
  for (int i = 1; i < levels; ++i) {
    Json::Value outer(Json::objectValue);
    outer["in"] = value;
    value = outer;
  }
  return value;
}

TEST(OwnerArgument, EveryKindIsAccepted) {
  EXPECT_EQ(CheckArguments(Given(R"({"text":"a","number":-5,"flag":true,"names":["x"],
                                    "tree":{"a":[1]}})"),
                           kKnown),
            std::nullopt);
}

TEST(OwnerArgument, UnknownOneIsRefusedByName) {
  const Problem problem = ProblemOf(Given(R"({"text":"a","colour":1})"));
  EXPECT_EQ(problem.error, Error::kUnknownArgument);
  EXPECT_EQ(problem.field, "colour");
}

TEST(OwnerArgument, UnknownOneThatCannotBeShownIsNotNamed) {
  Json::Value arguments = Given(R"({"text":"a"})");
  arguments["a\nb"] = 1;
  EXPECT_EQ(ProblemOf(arguments).field, "");
  arguments.removeMember("a\nb");
  arguments[std::string(65, 'x')] = 1;
  EXPECT_EQ(ProblemOf(arguments).field, "");
}

TEST(OwnerArgument, NeededOneMustBeThere) {
  const Problem problem = ProblemOf(Given(R"({"number":1})"));
  EXPECT_EQ(problem.error, Error::kMissingArgument);
  EXPECT_EQ(problem.field, "text");
}

TEST(OwnerArgument, OtherTypesAreRefused) {
  for (const char* json :
       {R"({"text":1})", R"({"text":null})", R"({"text":"a","number":"1"})",
        R"({"text":"a","number":1.5})", R"({"text":"a","number":1.0})",
        R"({"text":"a","number":true})", R"({"text":"a","number":null})",
        R"({"text":"a","flag":1})", R"({"text":"a","flag":"true"})", R"({"text":"a","names":"x"})",
        R"({"text":"a","names":[1]})", R"({"text":"a","names":{"a":"x"}})",
        R"({"text":"a","tree":[]})", R"({"text":"a","tree":null})"}) {
    EXPECT_EQ(ProblemOf(Given(json)).error, Error::kWrongType) << json;
  }
}

TEST(OwnerArgument, NumbersFitIntoThirtyTwoBits) {
  EXPECT_EQ(CheckArguments(Given(R"({"text":"a","number":2147483647})"), kKnown), std::nullopt);
  EXPECT_EQ(CheckArguments(Given(R"({"text":"a","number":-2147483648})"), kKnown), std::nullopt);
  EXPECT_EQ(ProblemOf(Given(R"({"text":"a","number":2147483648})")).error, Error::kBadValue);
  EXPECT_EQ(ProblemOf(Given(R"({"text":"a","number":-2147483649})")).error, Error::kBadValue);
  EXPECT_EQ(ProblemOf(Given(R"({"text":"a","number":18446744073709551615})")).error,
            Error::kBadValue);
}

TEST(OwnerArgument, TextsAreUtf8WithoutZeroBytes) {
  Json::Value arguments;
  arguments["text"] = "a\xFF";
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
  arguments["text"] = std::string("a\0b", 3);
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
}

TEST(OwnerArgument, TextsOfAListAreUtf8WithoutZeroBytes) {
  Json::Value arguments = Given(R"({"text":"a","names":["ok"]})");
  arguments["names"].append("\xFF");
  EXPECT_EQ(ProblemOf(arguments).field, "names");
  arguments["names"][1] = std::string("\0", 1);
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
}

TEST(OwnerArgument, TextsAndNamesWithinObjectsAreUtf8) {
  Json::Value arguments = Given(R"({"text":"a","tree":{"a":["b"]}})");
  arguments["tree"]["a"][0] = "\xFF";
  EXPECT_EQ(ProblemOf(arguments).field, "tree");
  arguments["tree"] = Json::objectValue;
  arguments["tree"]["\xFF"] = 1;
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
}

TEST(OwnerArgument, ObjectsAreNotNestedTooDeeply) {
  Json::Value arguments = Given(R"({"text":"a"})");
  arguments["tree"] = Nested(kDeepestObject);
  EXPECT_EQ(CheckArguments(arguments, kKnown), std::nullopt);
  arguments["tree"] = Nested(kDeepestObject + 1);
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
}

TEST(OwnerArgument, TextsAreConvertedByTheirArgumentsKind) {
  Json::Value arguments = Given(
      R"({"text":"1","number":"-7","flag":"true","names":"[\"x\"]","tree":"{\"a\":1}","other":"2"})");
  EXPECT_EQ(ConvertTexts(kKnown, &arguments), std::nullopt);
  EXPECT_EQ(arguments, Given(R"({"text":"1","number":-7,"flag":true,"names":["x"],"tree":{"a":1},
                                "other":"2"})"));
}

TEST(OwnerArgument, BooleansHaveFourTexts) {
  for (const auto& [text, value] :
       {std::pair<const char*, bool>{"true", true}, {"1", true}, {"false", false}, {"0", false}}) {
    Json::Value arguments;
    arguments["flag"] = text;
    EXPECT_EQ(ConvertTexts(kKnown, &arguments), std::nullopt);
    EXPECT_EQ(arguments["flag"], Json::Value(value)) << text;
  }
}

TEST(OwnerArgument, TextThatIsNotOfTheKindIsRefused) {
  for (const auto& [name, text] : {std::pair<const char*, const char*>{"number", ""},
                                   {"number", "1x"},
                                   {"number", " 1"},
                                   {"number", "+1"},
                                   {"number", "0x1"},
                                   {"flag", "yes"},
                                   {"flag", ""},
                                   {"names", "x"},
                                   {"tree", "{"},
                                   {"tree", "{}x"}}) {
    Json::Value arguments;
    arguments[name] = text;
    const MaybeProblem problem = ConvertTexts(kKnown, &arguments);
    ASSERT_TRUE(problem) << name << "=" << text;
    EXPECT_EQ(problem->error, Error::kWrongType);
    EXPECT_EQ(problem->field, name);
  }
}

TEST(OwnerArgument, NumberOfAnyLengthStaysANumber) {
  Json::Value arguments;
  arguments["text"] = "a";
  arguments["number"] = std::string(40, '9');
  EXPECT_EQ(ConvertTexts(kKnown, &arguments), std::nullopt);
  EXPECT_EQ(ProblemOf(arguments).error, Error::kBadValue);
}

TEST(OwnerArgument, OnlyStrictJsonIsRead) {
  Json::Value value;
  for (const char* text : {"", "{", "{} {}", "{} x", "/* */{}", "{\"a\":1,\"a\":2}", "{a:1}",
                           "{'a':1}", "[1,]", "[NaN]", "[Infinity]", "nul"}) {
    EXPECT_FALSE(ReadJson(text, &value)) << text;
  }
}

TEST(OwnerArgument, JsonThatIsTooDeepIsRefusedWithoutAnException) {
  Json::Value value;
  EXPECT_FALSE(ReadJson(std::string(200000, '['), &value));
}

TEST(OwnerArgument, ObjectAtTheLimitCanBeReadInsideArguments) {
  std::string text = WriteJson(Nested(kDeepestObject));
  text = R"({"text":"a","tree":)" + text + "}";
  Json::Value value;
  ASSERT_TRUE(ReadJson(text, &value));
  EXPECT_EQ(CheckArguments(value, kKnown), std::nullopt);
}

TEST(OwnerArgument, JsonIsWrittenAsOneLineOfUtf8) {
  EXPECT_EQ(WriteJson(Given("{ \"b\": [1, \"\xC3\xA9\\n\"] }")), "{\"b\":[1,\"\xC3\xA9\\n\"]}");
}

}  // namespace
}  // namespace owner
