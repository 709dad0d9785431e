#include "owner/transaction.h"

#include <gtest/gtest.h>
#include <tuvosharing/sharing_db.h>

#include <stdexcept>

#include "support/child.h"

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

Entry Link(const std::string& hash) {
  Entry link;
  link.set_hash(hash).set_project_name("album").set_owner_uid(2001).set_app(Json::objectValue);
  return link;
}

class OwnerTransaction : public testing::Test {
 protected:
  void TearDown() override { db_.Execute("DELETE FROM entry"); }

  int Count() {
    int count = -1;
    EXPECT_TRUE(EntryDB(db_).Count(count));
    return count;
  }

  // Another program: its own connection, its own write.
  void WriteElsewhere() {
    SharingDB other(TUVO_SHARING_DB);
    ASSERT_TRUE(other.Execute("UPDATE entry SET use_count = use_count + 1"));
  }

  static constexpr const char* TUVO_SHARING_DB = "/usr/tuvo/etc/private/session/sharing.db";
  SharingDB& db_ = SharingDB::Instance();
};

TEST_F(OwnerTransaction, KeepsWhatWasDoneWell) {
  EXPECT_EQ(InTransaction(db_,
                          [](EntryDB& links) {
                            Entry link = Link("aaa");
                            return links.Create(link) ? MaybeProblem() : InternalFault();
                          }),
            std::nullopt);
  EXPECT_EQ(Count(), 1);
}

TEST_F(OwnerTransaction, TakesBackWhatEndedInAProblemAndReturnsIt) {
  const MaybeProblem problem = InTransaction(db_, [](EntryDB& links) {
    Entry link = Link("aaa");
    EXPECT_TRUE(links.Create(link));
    return Fault(Error::kHashTaken, "text", "hash");
  });
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kHashTaken);
  EXPECT_EQ(problem->field, "hash");
  EXPECT_EQ(Count(), 0);
}

TEST_F(OwnerTransaction, TakesBackWhatEndedInAnException) {
  EXPECT_THROW(InTransaction(db_,
                             [](EntryDB& links) -> MaybeProblem {
                               Entry link = Link("aaa");
                               EXPECT_TRUE(links.Create(link));
                               throw std::runtime_error("x");
                             }),
               std::runtime_error);
  EXPECT_EQ(Count(), 0);
  EXPECT_TRUE(db_.Begin());
  EXPECT_TRUE(db_.Commit());
}

TEST_F(OwnerTransaction, RunsAgainWhenAnotherProgramWroteInBetween) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  int runs = 0;
  EXPECT_EQ(InTransaction(db_,
                          [&](EntryDB& links) {
                            Entry read;
                            EXPECT_TRUE(links.GetById(link.get_id(), read));
                            if (++runs == 1) {
                              WriteElsewhere();
                            }
                            read.set_protect_title("new");
                            return links.Update(read) ? MaybeProblem() : InternalFault();
                          }),
            std::nullopt);
  EXPECT_EQ(runs, 2);
  Entry after;
  ASSERT_TRUE(EntryDB(db_).GetById(link.get_id(), after));
  EXPECT_EQ(after.get_use_count(), 1);  // the other's
  EXPECT_EQ(after.get_protect_title(), "new");
}

TEST_F(OwnerTransaction, GivesUpWhenEveryAttemptMeetsAnotherProgram) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  int runs = 0;
  const MaybeProblem problem = InTransaction(db_, [&](EntryDB& links) {
    ++runs;
    Entry read;
    EXPECT_TRUE(links.GetById(link.get_id(), read));
    WriteElsewhere();
    return links.Update(read) ? MaybeProblem() : InternalFault();
  });
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kBusy);
  EXPECT_EQ(runs, kMostAttempts);
}

TEST_F(OwnerTransaction, ConnectionIsFreeAgainAfterAllOfIt) {
  InTransaction(db_, [](EntryDB&) { return Fault(Error::kConflict, "x"); });
  EXPECT_TRUE(db_.Begin());
  EXPECT_TRUE(db_.Commit());
}

TEST_F(OwnerTransaction, ConnectionThatIsNotGoodFailsInside) {
  SharingDB bad("/usr/tuvo/nosuchfolder/x.db");
  const MaybeProblem problem = InTransaction(bad, [](EntryDB&) { return MaybeProblem(); });
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kInternal);
}

}  // namespace
}  // namespace owner
