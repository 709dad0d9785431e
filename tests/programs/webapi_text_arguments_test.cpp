#include "webapi/text_arguments.h"

#include <gtest/gtest.h>

#include "webapi/call.h"

namespace webapi {
namespace {

// What the texts come to: an object, or the code of the problem.
Json::Value OfTexts(const std::vector<std::string>& texts) {
  Json::Value request;
  const owner::MaybeProblem problem = ReadTexts(texts, &request);
  return problem ? Json::Value(static_cast<int>(problem->error)) : request;
}

Json::Value OfQuery(std::string_view query) {
  Json::Value request;
  const owner::MaybeProblem problem = ReadQuery(query, &request);
  return problem ? Json::Value(static_cast<int>(problem->error)) : request;
}

Json::Value Object(const std::vector<std::pair<std::string, std::string>>& members) {
  Json::Value object(Json::objectValue);
  for (const auto& [name, value] : members) {
    object[name] = value;
  }
  return object;
}

TEST(WebapiTextArguments, ValueBeginsBehindTheFirstEqualsSign) {
  EXPECT_EQ(OfTexts({"a=1", "b=", "c=x=y=", "d= \n"}),
            Object({{"a", "1"}, {"b", ""}, {"c", "x=y="}, {"d", " \n"}}));
  EXPECT_EQ(OfTexts({}), Object({}));
}

TEST(WebapiTextArguments, TextsThatCannotBeRead) {
  EXPECT_EQ(OfTexts({"a"}), 101);
  EXPECT_EQ(OfTexts({""}), 101);
  EXPECT_EQ(OfTexts({"=x"}), 101);
  EXPECT_EQ(OfTexts({"a=1", "b=2", "a=1"}), 101);
}

TEST(WebapiTextArguments, TextsHaveALimitTogether) {
  const std::string half(kLargestRequest / 2 - 2, 'x');
  EXPECT_EQ(OfTexts({"a=" + half, "b=" + half}), Object({{"a", half}, {"b", half}}));
  EXPECT_EQ(OfTexts({"a=" + half, "b=" + half + "x"}), 110);
  EXPECT_EQ(OfTexts({std::string(kLargestRequest + 1, 'x')}), 110);
}

TEST(WebapiTextArguments, QueryIsDecoded) {
  EXPECT_EQ(OfQuery("a=1&b=&c=x+y%2B%26%3d&%64=%c3%A9"),
            Object({{"a", "1"}, {"b", ""}, {"c", "x y+&="}, {"d", "\xC3\xA9"}}));
  EXPECT_EQ(OfQuery("a=x=y"), Object({{"a", "x=y"}}));
  EXPECT_EQ(OfQuery(""), Object({}));
}

TEST(WebapiTextArguments, EveryByteCanBeEncoded) {
  constexpr char kDigits[] = "0123456789abcdef";
  for (int byte = 0; byte < 256; ++byte) {
    const std::string query = std::string("a=%") + kDigits[byte / 16] + kDigits[byte % 16];
    const std::string expected(1, static_cast<char>(byte));
    EXPECT_EQ(OfQuery(query)["a"].asString(), expected) << query;
  }
}

TEST(WebapiTextArguments, QueriesThatCannotBeRead) {
  for (const char* query :
       {"a",     "=",       "=x",        "&",     "a=1&",  "&a=1",     "a=1&&b=2",
        "a=1&b", "a=1&a=1", "a=1&%61=2", "a=%",   "a=%4",  "a=%4&b=1", "a=%zz",
        "a=%4g", "a=%g4",   "%=1",       "a=%-1", "a=% 1", "%3d"}) {
    EXPECT_EQ(OfQuery(query), 101) << query;
  }
}

TEST(WebapiTextArguments, QueryHasALimit) {
  EXPECT_TRUE(OfQuery("a=" + std::string(kLargestRequest - 2, 'x')).isObject());
  EXPECT_EQ(OfQuery("a=" + std::string(kLargestRequest - 1, 'x')), 110);
}

}  // namespace
}  // namespace webapi
