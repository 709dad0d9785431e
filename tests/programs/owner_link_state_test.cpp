#include "owner/link_state.h"

#include <gtest/gtest.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <map>
#include <string>
#include <vector>

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr std::time_t kNow = 1700000000;
constexpr LinkState kAll[] = {LinkState::kDisabled, LinkState::kExpired, LinkState::kUsedUp,
                              LinkState::kNotYet, LinkState::kLive};

Entry Link() {
  Entry link;
  link.set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
  return link;
}

TEST(OwnerLinkState, FreshLinkIsLive) {
  EXPECT_EQ(StateOf(Link(), kNow), LinkState::kLive);
}

TEST(OwnerLinkState, SwitchedOffLinkIsDisabledWhateverElse) {
  EXPECT_EQ(StateOf(Link().set_enabled(false).set_expire_at(1), kNow), LinkState::kDisabled);
}

TEST(OwnerLinkState, LinkIsExpiredFromTheSecondBehindItsEnd) {
  EXPECT_EQ(StateOf(Link().set_expire_at(kNow), kNow), LinkState::kLive);
  EXPECT_EQ(StateOf(Link().set_expire_at(kNow - 1), kNow), LinkState::kExpired);
}

TEST(OwnerLinkState, LinkIsUsedUpWithItsLastUse) {
  EXPECT_EQ(StateOf(Link().set_expire_times(3).set_use_count(2), kNow), LinkState::kLive);
  EXPECT_EQ(StateOf(Link().set_expire_times(3).set_use_count(3), kNow), LinkState::kUsedUp);
}

TEST(OwnerLinkState, CountWithoutALimitUsesNothingUp) {
  EXPECT_EQ(StateOf(Link().set_use_count(9), kNow), LinkState::kLive);
  EXPECT_EQ(StateOf(Link().set_expire_times(-1).set_use_count(9), kNow), LinkState::kLive);
}

TEST(OwnerLinkState, LinkHasBegunInItsFirstSecond) {
  EXPECT_EQ(StateOf(Link().set_start_at(kNow + 1), kNow), LinkState::kNotYet);
  EXPECT_EQ(StateOf(Link().set_start_at(kNow), kNow), LinkState::kLive);
}

TEST(OwnerLinkState, TextsAreReadBack) {
  for (const LinkState state : kAll) {
    EXPECT_EQ(StateOfText(StateText(state)), state);
  }
  EXPECT_EQ(StateText(LinkState::kUsedUp), "used_up");
  EXPECT_EQ(StateText(LinkState::kNotYet), "not_yet");
  EXPECT_EQ(StateOfText("gone"), std::nullopt);
  EXPECT_EQ(StateOfText(""), std::nullopt);
}

class OwnerLinkStateRows : public testing::Test {
 protected:
  void TearDown() override { db_.Execute("DELETE FROM entry"); }

  // The ids of the rows that a state's clause admits.
  std::vector<int> Rows(LinkState state) {
    const EntryDB links(db_);
    links.GetCondition().Where(StateClause(state, kNow));
    std::vector<Entry> found;
    EXPECT_TRUE(links.Query(found));
    std::vector<int> ids;
    for (const Entry& link : found) {
      ids.push_back(link.get_id());
    }
    return ids;
  }

  SharingDB& db_ = SharingDB::Instance();
};

TEST_F(OwnerLinkStateRows, ClauseAdmitsExactlyTheRowsOfTheState) {
  std::map<int, LinkState> expected;
  {
    EntryDB links(db_);
    for (const bool enabled : {true, false}) {
      for (const std::time_t expire : {std::time_t{0}, kNow - 1, kNow, kNow + 1, std::time_t{-5}}) {
        for (const int times : {0, 2, -1}) {
          for (const int count : {0, 2, 3}) {
            for (const std::time_t start :
                 {std::time_t{0}, kNow - 1, kNow, kNow + 1, std::time_t{-5}}) {
              Entry link = Link();
              link.set_enabled(enabled)
                  .set_expire_at(static_cast<long>(expire))
                  .set_expire_times(times)
                  .set_use_count(count)
                  .set_start_at(static_cast<long>(start));
              ASSERT_TRUE(links.CreateWithHash(link));
              expected[link.get_id()] = StateOf(link, kNow);
            }
          }
        }
      }
    }
  }
  size_t total = 0;
  for (const LinkState state : kAll) {
    const std::vector<int> rows = Rows(state);
    EXPECT_FALSE(rows.empty()) << StateText(state);
    total += rows.size();
    for (const int id : rows) {
      EXPECT_EQ(expected[id], state) << id;
    }
  }
  EXPECT_EQ(total, expected.size());
}

TEST_F(OwnerLinkStateRows, RowWithoutValuesIsOfTheStateThatItLoadsWith) {
  Entry link = Link();
  ASSERT_TRUE(EntryDB(db_).CreateWithHash(link));
  ASSERT_TRUE(
      db_.Execute("UPDATE entry SET enabled = NULL, expire_at = NULL, start_at = NULL, "
                  "expire_times = NULL, use_count = NULL"));
  EXPECT_EQ(Rows(LinkState::kLive), std::vector<int>{link.get_id()});
  for (const LinkState other :
       {LinkState::kDisabled, LinkState::kExpired, LinkState::kUsedUp, LinkState::kNotYet}) {
    EXPECT_TRUE(Rows(other).empty()) << StateText(other);
  }
}

// Whatever other programs put into the columns, the condition is of one mind with the record.
class OwnerLinkStateOddRows : public OwnerLinkStateRows {
 protected:
  // Rows with each of the values in the column, and with 5 in `other` if one is named.
  void Fill(const std::string& column, const std::string& other) {
    for (const char* value : {"NULL",
                              "''",
                              "'soon'",
                              "'5x'",
                              "' 7'",
                              "'-3x'",
                              "'+4x'",
                              "'- 4'",
                              "1.5",
                              "1e300",
                              "-1e300",
                              "x'3578'",
                              "x''",
                              "x'00'",
                              "CAST(x'31003132' AS TEXT)",
                              "'0x10'",
                              "'1e3x'",
                              "2147483647",
                              "2147483648",
                              "3000000000",
                              "-3000000000",
                              "9223372036854775807",
                              "'99999999999999999999999x'",
                              "'-99999999999999999999999x'",
                              "'1700000005x'",
                              "1700000005.5",
                              "1699999999.5",
                              "0",
                              "1",
                              "2",
                              "'1 '",
                              "'true'"}) {
      ASSERT_TRUE(db_.Execute("INSERT INTO entry (hash, project_name, owner_uid, data, " + column +
                              (other.empty() ? "" : ", " + other) +
                              ") VALUES (hex(randomblob(8)), 'album', 2001, '" +
                              R"({"app":{},"private_data":{},"protect_type":"none"})" + "', " +
                              value + (other.empty() ? "" : ", 5") + ")"))
          << value;
    }
  }
};

TEST_F(OwnerLinkStateOddRows, ClausesReadColumnsAsTheRecordsDo) {
  Fill("enabled", "");
  Fill("start_at", "");
  Fill("expire_at", "");
  Fill("use_count", "expire_times");
  Fill("expire_times", "use_count");
  std::map<int, LinkState> expected;
  std::vector<int> ended;
  {
    const EntryDB links(db_);
    std::vector<Entry> all;
    ASSERT_TRUE(links.Query(all));
    for (const Entry& link : all) {
      expected[link.get_id()] = StateOf(link, kNow);
      if (StateOf(Entry(link).set_enabled(true), kNow) == LinkState::kExpired ||
          StateOf(Entry(link).set_enabled(true), kNow) == LinkState::kUsedUp) {
        ended.push_back(link.get_id());
      }
    }
  }
  ASSERT_EQ(expected.size(), 5U * 32U);
  for (const LinkState state : kAll) {
    const std::vector<int> rows = Rows(state);
    EXPECT_FALSE(rows.empty()) << StateText(state);
    for (const auto& [id, its_state] : expected) {
      EXPECT_EQ(std::count(rows.begin(), rows.end(), id), its_state == state ? 1 : 0)
          << id << " is " << StateText(its_state) << ", and not " << StateText(state);
    }
  }
  const EntryDB links(db_);
  links.GetCondition().Where(EndedClause(kNow));
  std::vector<Entry> found;
  ASSERT_TRUE(links.Query(found));
  std::vector<int> ids;
  for (const Entry& link : found) {
    ids.push_back(link.get_id());
  }
  EXPECT_EQ(ids, ended);
}

}  // namespace
}  // namespace owner
