#include "cli/damage.h"

#include <gtest/gtest.h>
#include <tuvosharing/result.h>
#include <tuvosharing/sharing_db.h>

#include "cli/link_row.h"

namespace cli {
namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;

// What is said of a good row, when `assignment` has changed it.
std::string DamageBy(const std::string& assignment) {
  SharingDB& db = SharingDB::Instance();
  EXPECT_TRUE(db.Execute("DELETE FROM entry"));
  EXPECT_TRUE(
      db.Execute("INSERT INTO entry VALUES (7, 'abc', 'album', 1, 2001, 0, 0, 0, 0, 1, "
                 "'{\"app\":{},\"protect_type\":\"none\"}')"));
  EXPECT_TRUE(db.Execute("UPDATE entry SET " + assignment));
  Result result;
  Row row;
  EXPECT_TRUE(db.Execute("SELECT " + LinkRowSelection() + " FROM entry", result));
  EXPECT_TRUE(result.NextRow(row));
  EXPECT_TRUE(db.Execute("DELETE FROM entry"));
  return DamageOf(row).value_or("");
}

TEST(CliDamage, LinkHasNone) {
  EXPECT_EQ(DamageBy("enabled = 0"), "");
}

TEST(CliDamage, ColumnAtFaultIsNamed) {
  EXPECT_EQ(DamageBy("hash = ''"), "hash");
  EXPECT_EQ(DamageBy("project_name = ''"), "project_name");
  EXPECT_EQ(DamageBy("owner_uid = 4294967295"), "owner_uid");
  EXPECT_EQ(DamageBy("data = 'x'"), "data");
  EXPECT_EQ(DamageBy("data = '{\"app\":{},\"protect_type\":\"user\"}'"), "protection");
}

// The platform reads as far as the zero: the row loads, as another one.
TEST(CliDamage, ZeroByteIsDamage) {
  EXPECT_EQ(DamageBy("hash = 'abc' || char(0) || 'x'"), "hash");
  EXPECT_EQ(DamageBy("project_name = CAST(x'610062' AS TEXT)"), "project_name");
  EXPECT_EQ(DamageBy("data = data || char(0)"), "data");
}

TEST(CliDamage, NumberOfTheRowIsNotLookedAt) {
  EXPECT_EQ(DamageBy("id = 3000000000"), "");
  EXPECT_EQ(DamageBy("id = -5"), "");
}

}  // namespace
}  // namespace cli
