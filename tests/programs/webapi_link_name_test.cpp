#include "webapi/link_name.h"

#include <gtest/gtest.h>

#include "owner/argument.h"

namespace webapi {
namespace {

owner::MaybeProblem Read(const std::string& arguments, owner::LinkName* name) {
  Json::Value value;
  EXPECT_TRUE(owner::ReadJson(arguments, &value));
  return ReadLinkName(value, name);
}

void ExpectProblem(const std::string& arguments, owner::Error error, const std::string& field) {
  owner::LinkName name;
  const owner::MaybeProblem problem = Read(arguments, &name);
  ASSERT_TRUE(problem) << arguments;
  EXPECT_EQ(problem->error, error) << arguments;
  EXPECT_EQ(problem->field, field) << arguments;
}

TEST(WebapiLinkName, IdOrHash) {
  owner::LinkName name;
  ASSERT_FALSE(Read(R"({"id":2147483647,"qr":true})", &name));
  EXPECT_EQ(name.id, 2147483647);
  name = owner::LinkName();
  ASSERT_FALSE(Read(R"({"hash":"not of the form of ours"})", &name));
  EXPECT_EQ(name.id, 0);
  EXPECT_EQ(name.hash, "not of the form of ours");
}

TEST(WebapiLinkName, ExactlyOneOfThem) {
  ExpectProblem("{}", owner::Error::kMissingArgument, "id");
  ExpectProblem(R"({"id":1,"hash":"abc"})", owner::Error::kConflict, "hash");
}

TEST(WebapiLinkName, NeitherIsOneThatNoLinkHas) {
  ExpectProblem(R"({"id":0})", owner::Error::kBadValue, "id");
  ExpectProblem(R"({"id":-1})", owner::Error::kBadValue, "id");
  ExpectProblem(R"({"hash":""})", owner::Error::kBadValue, "hash");
}

}  // namespace
}  // namespace webapi
