#include "owner/visitors.h"

#include <gtest/gtest.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;

constexpr unsigned int kNobody = 4294967295U;

class OwnerVisitors : public testing::Test {
 protected:
  void SetUp() override { link_ = MakeLink(); }
  void TearDown() override {
    db_.Execute("DELETE FROM entry");
    db_.Execute("DELETE FROM session");
  }

  Entry MakeLink() {
    Entry link;
    link.set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
    EXPECT_TRUE(EntryDB(db_).CreateWithHash(link));
    return link;
  }

  void Admit(const Entry& link, const std::string& ip, unsigned int uid, long seconds) {
    Session session;
    session.set_ip(ip).set_uid(uid);
    session.set_timeout(static_cast<long>(now_) + 100000);
    ASSERT_TRUE(SessionDB(db_).CreateWithSessionId(session));
    Token token;
    token.set_entry_id(link.get_id());
    token.set_session_id(session.get_id());
    token.set_timeout(static_cast<long>(now_) + 100000);
    ASSERT_TRUE(TokenDB(db_).Create(token));
    ASSERT_TRUE(db_.Execute("UPDATE token SET timeout = " + std::to_string(now_ + seconds) +
                            " WHERE id = " + std::to_string(token.get_id())));
  }

  std::vector<Visitor> List(int most = 10) {
    std::vector<Visitor> visitors;
    EXPECT_EQ(ListVisitors(db_, link_, most, now_, &visitors, &total_), std::nullopt);
    return visitors;
  }

  SharingDB& db_ = SharingDB::Instance();
  std::time_t now_ = std::time(nullptr);
  Entry link_;
  int total_ = -1;
};

TEST_F(OwnerVisitors, LinkThatNobodyOpenedHasNone) {
  EXPECT_TRUE(List().empty());
  EXPECT_EQ(total_, 0);
}

TEST_F(OwnerVisitors, StrangerHasAnAddressAndNoName) {
  Admit(link_, "192.0.2.7", kNobody, 500);
  const std::vector<Visitor> visitors = List();
  ASSERT_EQ(visitors.size(), 1U);
  EXPECT_EQ(visitors[0].ip, "192.0.2.7");
  EXPECT_EQ(visitors[0].user, "");
  EXPECT_EQ(visitors[0].expires_at, now_ + 500);
}

TEST_F(OwnerVisitors, AccountIsNamed) {
  link_.set_protect_type(Entry::PROTECT_USER);
  Admit(link_, "192.0.2.7", 2002, 500);
  EXPECT_EQ(List().at(0).user, "bob");
}

TEST_F(OwnerVisitors, AccountProvedAtAnotherLinkIsNotNamed) {
  Admit(link_, "192.0.2.7", 2002, 500);
  EXPECT_EQ(List().at(0).user, "");
  link_.set_protect_type(Entry::PROTECT_PASSWORD);
  EXPECT_EQ(List().at(0).user, "");
}

TEST_F(OwnerVisitors, AccountThatIsGoneHasNoName) {
  link_.set_protect_type(Entry::PROTECT_USER);
  Admit(link_, "192.0.2.7", 4711, 500);
  EXPECT_EQ(List().at(0).user, "");
}

TEST_F(OwnerVisitors, ThoseOfOtherLinksAreLeftOut) {
  Admit(MakeLink(), "192.0.2.7", kNobody, 500);
  EXPECT_TRUE(List().empty());
  EXPECT_EQ(total_, 0);
}

TEST_F(OwnerVisitors, ExpiredOnesAreLeftOut) {
  Admit(link_, "192.0.2.7", kNobody, -1);
  EXPECT_TRUE(List().empty());
  EXPECT_EQ(total_, 0);
}

TEST_F(OwnerVisitors, ThoseThatEndLastComeFirst) {
  Admit(link_, "192.0.2.1", kNobody, 100);
  Admit(link_, "192.0.2.2", kNobody, 300);
  Admit(link_, "192.0.2.3", kNobody, 200);
  const std::vector<Visitor> visitors = List();
  ASSERT_EQ(visitors.size(), 3U);
  EXPECT_EQ(visitors[0].ip, "192.0.2.2");
  EXPECT_EQ(visitors[1].ip, "192.0.2.3");
  EXPECT_EQ(visitors[2].ip, "192.0.2.1");
}

TEST_F(OwnerVisitors, ListIsBoundedAndTheTotalIsNot) {
  for (int i = 1; i <= 5; ++i) {
    Admit(link_, "192.0.2." + std::to_string(i), kNobody, 100 + i);
  }
  EXPECT_EQ(List(3).size(), 3U);
  EXPECT_EQ(total_, 5);
}

TEST_F(OwnerVisitors, SigningOutEndsTheAdmissionsOfThatLinkAlone) {
  const Entry other = MakeLink();
  Admit(link_, "192.0.2.1", kNobody, 500);
  Admit(link_, "192.0.2.2", 2002, 500);
  Admit(link_, "192.0.2.3", kNobody, -500);
  Admit(other, "192.0.2.1", kNobody, 500);
  Entry found;
  int count = -1;
  EXPECT_EQ(SignOutVisitors(db_, {link_.get_id(), ""}, 2001U, now_, &found, &count), std::nullopt);
  EXPECT_EQ(found.get_hash(), link_.get_hash());
  EXPECT_EQ(count, 2);
  EXPECT_TRUE(List().empty());
  int left = 0;
  ASSERT_TRUE(TokenDB(db_).Count(left));
  EXPECT_EQ(left, 1);  // the expired one is gone too
}

TEST_F(OwnerVisitors, NobodySignsOutTheVisitorsOfSomebodyElsesLink) {
  Admit(link_, "192.0.2.1", kNobody, 500);
  Entry found;
  int count = -1;
  const MaybeProblem problem =
      SignOutVisitors(db_, {link_.get_id(), ""}, 2002U, now_, &found, &count);
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kNoSuchLink);
  EXPECT_EQ(List().size(), 1U);
}

TEST_F(OwnerVisitors, SigningOutThatFailsHalfWayEndsNobodysAdmission) {
  Admit(link_, "192.0.2.1", kNobody, 500);
  Admit(link_, "192.0.2.2", kNobody, 400);
  ASSERT_TRUE(
      db_.Execute("CREATE TEMP TRIGGER fail BEFORE DELETE ON token WHEN "
                  "OLD.timeout = " +
                  std::to_string(now_ + 400) + " BEGIN SELECT RAISE(ABORT, 'no'); END"));
  Entry found;
  int count = -1;
  const MaybeProblem problem =
      SignOutVisitors(db_, {link_.get_id(), ""}, std::nullopt, now_, &found, &count);
  ASSERT_TRUE(db_.Execute("DROP TRIGGER fail"));
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kInternal);
  EXPECT_EQ(List().size(), 2U);
}

}  // namespace
}  // namespace owner
