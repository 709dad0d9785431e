#include "cli/link_row.h"

#include <gtest/gtest.h>
#include <json/value.h>

#include <string>

namespace cli {
namespace {

LinkRow PlainRow() {
  LinkRow row;
  row.columns = {"hash", "album", "1", "2001", "0", "4102444800", "3", "-1", "1", "{\"app\":{}}"};
  return row;
}

TEST(CliLinkRow, NumbersAreNumbersAndTextsAreTexts) {
  const Json::Value json = JsonOf(PlainRow());
  EXPECT_EQ(json["hash"], "hash");
  EXPECT_EQ(json["owner_uid"], 2001);
  EXPECT_EQ(json["expire_at"], Json::Value(Json::Int64{4102444800}));
  EXPECT_EQ(json["use_count"], -1);
  EXPECT_EQ(json["data"], "{\"app\":{}}");
  EXPECT_EQ(json["owner_user"], "alice");
  EXPECT_EQ(json.size(), kLinkColumnCount + 1);
}

TEST(CliLinkRow, EveryRowComesBackAsItWas) {
  LinkRow row = PlainRow();
  const std::optional<std::string> values[] = {std::nullopt,
                                               "",
                                               "0",
                                               "007",
                                               "+1",
                                               "-0",
                                               "1.5",
                                               "9223372036854775807",
                                               "9223372036854775808",
                                               "x\xff\xfe",
                                               "{\"hex\":\"61\"}",
                                               "'; DROP TABLE entry",
                                               "\u65e5"};
  for (std::size_t column = 0; column < kLinkColumnCount; ++column) {
    for (const std::optional<std::string>& value : values) {
      row.columns[column] = value;
      const std::optional<LinkRow> back = LinkRowOf(JsonOf(row));
      ASSERT_TRUE(back);
      EXPECT_EQ(back->columns, row.columns) << column << " " << value.value_or("NULL");
    }
  }
}

TEST(CliLinkRow, HashOfDigitsStaysAText) {
  LinkRow row = PlainRow();
  row.columns[0] = "123";
  EXPECT_EQ(JsonOf(row)["hash"], "123");
}

TEST(CliLinkRow, ObjectsThatAreNoRowsAreRefused) {
  const Json::Value good = JsonOf(PlainRow());
  ASSERT_TRUE(LinkRowOf(good));
  EXPECT_FALSE(LinkRowOf(Json::Value(Json::arrayValue)));
  EXPECT_FALSE(LinkRowOf(Json::Value(Json::objectValue)));
  for (const char* column : LinkColumns()) {
    Json::Value json = good;
    json.removeMember(column);
    EXPECT_FALSE(LinkRowOf(json)) << column;
    for (const Json::Value& bad :
         {Json::Value(true), Json::Value(1.5), Json::Value(Json::arrayValue),
          Json::Value(Json::objectValue), Json::Value(std::string("a\0b", 3))}) {
      json[column] = bad;
      EXPECT_FALSE(LinkRowOf(json)) << column;
    }
    for (const char* hex : {"6", "zz", "6A", "00"}) {
      Json::Value bytes;
      bytes["hex"] = hex;
      json[column] = bytes;
      EXPECT_FALSE(LinkRowOf(json)) << column << " " << hex;
    }
  }
  Json::Value more = good;
  more["id"] = 7;
  EXPECT_FALSE(LinkRowOf(more));
}

TEST(CliLinkRow, OwnersNameIsForPeople) {
  Json::Value json = JsonOf(PlainRow());
  json.removeMember("owner_user");
  EXPECT_TRUE(LinkRowOf(json));
  json["owner_user"] = 5;
  EXPECT_TRUE(LinkRowOf(json));
}

}  // namespace
}  // namespace cli
