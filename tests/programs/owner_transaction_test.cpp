#include "owner/transaction.h"

#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/wait.h>
#include <tuvosharing/sharing_db.h>
#include <unistd.h>

#include <array>
#include <stdexcept>
#include <string>
#include <vector>

#include "support/syslog_listener.h"

namespace owner {
namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr const char* kPath = "/usr/tuvo/etc/private/session/sharing.db";

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
    SharingDB other(kPath);
    ASSERT_TRUE(other.Execute("UPDATE entry SET use_count = use_count + 1"));
  }

  static bool IsLockedForOthers() {
    sqlite3* other = nullptr;
    EXPECT_EQ(sqlite3_open(kPath, &other), SQLITE_OK);
    const int code = sqlite3_exec(other, "BEGIN IMMEDIATE", nullptr, nullptr, nullptr);
    sqlite3_close(other);
    return code == SQLITE_BUSY;
  }

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

TEST_F(OwnerTransaction, SecondRunHasTheFileForItself) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  int runs = 0;
  bool locked = false;
  EXPECT_EQ(InTransaction(db_,
                          [&](EntryDB& links) {
                            Entry read;
                            EXPECT_TRUE(links.GetById(link.get_id(), read));
                            if (++runs == 1) {
                              WriteElsewhere();
                            } else {
                              locked = IsLockedForOthers();
                            }
                            return links.Update(read) ? MaybeProblem() : InternalFault();
                          }),
            std::nullopt);
  EXPECT_EQ(runs, 2);
  EXPECT_TRUE(locked);
}

TEST_F(OwnerTransaction, LockingFirstHasTheFileForItselfAtOnce) {
  bool locked = false;
  EXPECT_EQ(InTransaction(
                db_,
                [&](EntryDB& /*links*/) {
                  locked = IsLockedForOthers();
                  return MaybeProblem();
                },
                Locking::kFirst),
            std::nullopt);
  EXPECT_TRUE(locked);
}

// Holds the file locked for a while, from a process of its own.
class Holder {
 public:
  explicit Holder(int seconds) {
    std::array<int, 2> ends{};
    EXPECT_EQ(pipe(ends.data()), 0);
    child_ = fork();
    if (child_ == 0) {
      const std::string hold =
          "sqlite3 " + std::string(kPath) +
          " 'BEGIN IMMEDIATE' '.shell echo' '.shell exec 1>&- 1>/dev/null; sleep " +
          std::to_string(seconds) + "' COMMIT";
      dup2(ends[1], STDOUT_FILENO);
      execl("/bin/sh", "sh", "-c", hold.c_str(), nullptr);
      _exit(127);
    }
    close(ends[1]);
    char byte = 0;
    EXPECT_EQ(read(ends[0], &byte, 1), 1);
    close(ends[0]);
  }
  ~Holder() { waitpid(child_, nullptr, 0); }
  Holder(const Holder&) = delete;
  Holder& operator=(const Holder&) = delete;

 private:
  pid_t child_ = -1;
};

TEST_F(OwnerTransaction, FileThatIsLockedForAWhileIsWaitedFor) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  const Holder holder(3);
  EXPECT_EQ(InTransaction(db_,
                          [&](EntryDB& links) {
                            Entry read;
                            EXPECT_TRUE(links.GetById(link.get_id(), read));
                            return links.Update(read) ? MaybeProblem() : InternalFault();
                          }),
            std::nullopt);
}

TEST_F(OwnerTransaction, FileThatStaysLockedIsBusy) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  const Holder holder(17);
  const MaybeProblem problem = InTransaction(db_, [&](EntryDB& links) {
    Entry read;
    EXPECT_TRUE(links.GetById(link.get_id(), read));
    return links.Update(read) ? MaybeProblem() : InternalFault();
  });
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kBusy);
}

TEST_F(OwnerTransaction, ConnectionIsFreeAgainAfterAllOfIt) {
  InTransaction(db_, [](EntryDB&) { return Fault(Error::kConflict, "x"); });
  EXPECT_TRUE(db_.Begin());
  EXPECT_TRUE(db_.Commit());
}

// The connection keeps its last error however much goes well behind it.
TEST_F(OwnerTransaction, LockedFileOfFormerTimesDecidesNothing) {
  {
    SharingDB other(kPath);
    ASSERT_TRUE(db_.Begin());
    ASSERT_TRUE(db_.Execute("SELECT * FROM token"));
    ASSERT_TRUE(other.Execute("INSERT INTO token VALUES (NULL, NULL, NULL, 1)"));
    EXPECT_FALSE(db_.Execute("DELETE FROM token"));  // stale
    ASSERT_TRUE(db_.Execute("ROLLBACK"));
    ASSERT_TRUE(db_.Execute("DELETE FROM token"));
  }
  ASSERT_NE(db_.GetLastError().find("locked"), std::string::npos);
  for (const Locking locking : {Locking::kWhenWriting, Locking::kFirst}) {
    int runs = 0;
    const MaybeProblem problem = InTransaction(
        db_,
        [&runs](EntryDB&) {
          ++runs;
          return InternalFault();
        },
        locking);
    ASSERT_TRUE(problem);
    EXPECT_EQ(problem->error, Error::kInternal);
    EXPECT_EQ(runs, 1);
  }
}

TEST_F(OwnerTransaction, FileThatIsLockedOnceMoreIsLockedAllTheSame) {
  Entry link = Link("aaa");
  ASSERT_TRUE(EntryDB(db_).Create(link));
  for (int round = 0; round < 2; ++round) {
    int runs = 0;
    EXPECT_EQ(InTransaction(db_,
                            [&](EntryDB& links) {
                              Entry read;
                              EXPECT_TRUE(links.GetById(link.get_id(), read));
                              if (++runs == 1) {
                                WriteElsewhere();
                              }
                              return links.Update(read) ? MaybeProblem() : InternalFault();
                            }),
              std::nullopt);
    EXPECT_EQ(runs, 2);
    // As the first of the two attempts has left it.
    ASSERT_TRUE(db_.Begin());
    ASSERT_TRUE(db_.Execute("SELECT * FROM token"));
    WriteElsewhere();
    EXPECT_FALSE(db_.Execute("DELETE FROM token"));
    ASSERT_TRUE(db_.Execute("ROLLBACK"));
    ASSERT_NE(db_.GetLastError().find("locked"), std::string::npos);
  }
}

TEST_F(OwnerTransaction, FailureOfAStatementIsLogged) {
  tuvo_test::SyslogListener listener;
  InTransaction(db_, [](EntryDB&) { return InternalFault(); });  // no statement's
  InTransaction(db_, [](EntryDB&) { return Fault(Error::kConflict, "x"); });
  InTransaction(db_, [this](EntryDB&) {
    return db_.Execute("SELECT missing FROM entry") ? MaybeProblem() : InternalFault();
  });
  const std::vector<std::string> lines = listener.TakeTexts();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_NE(lines[0].find("the database failed: no such column: missing"), std::string::npos)
      << lines[0];
}

TEST_F(OwnerTransaction, ReasonOfATransactionThatSqliteHasTakenBackIsLogged) {
  tuvo_test::SyslogListener listener;
  InTransaction(db_, [this](EntryDB&) {
    // What a full disk does as well.
    EXPECT_TRUE(db_.Execute("INSERT INTO entry (hash) VALUES ('taken')"));
    return db_.Execute("INSERT OR ROLLBACK INTO entry (hash) VALUES ('taken')") ? MaybeProblem()
                                                                                : InternalFault();
  });
  const std::vector<std::string> lines = listener.TakeTexts();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_NE(lines[0].find("UNIQUE constraint failed: entry.hash"), std::string::npos) << lines[0];
}

TEST_F(OwnerTransaction, ConnectionThatIsNotGoodFailsInside) {
  SharingDB bad("/usr/tuvo/nosuchfolder/x.db");
  const MaybeProblem problem = InTransaction(bad, [](EntryDB&) { return MaybeProblem(); });
  ASSERT_TRUE(problem);
  EXPECT_EQ(problem->error, Error::kInternal);
}

}  // namespace
}  // namespace owner
