// The store of visitor sessions on the real schema.
#include <gtest/gtest.h>
#include <internal/session_db_private.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <cerrno>
#include <ctime>
#include <locale>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "log_lines.h"
#include "sqlite_file.h"
#include "statement_time.h"
#include "store_layout.h"
#include "store_records.h"
#include "support/child.h"
#include "support/seccomp_filter.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace {

using TUVO::sharing::db::ObjectDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SessionDBPrivate;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;
using tuvo_test::LegalSession;
using tuvo_test::SqliteFile;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using Lines = std::vector<std::string>;

constexpr char kPath[] = "/tmp/session.db";

class SessionDBTest : public testing::Test {
 protected:
  SessionDBTest() : db_(tuvo_test::NewPath(kPath)), store_(std::make_unique<SessionDB>(db_)) {
    EXPECT_TRUE(db_.IsGood());
    Seen();
  }

  // The last statement, once: what it was is forgotten.
  std::string Seen() {
    std::string query = db_.GetLastQuery();
    db_.Execute("SELECT 'nothing since'");
    return query;
  }

  int Add(const std::string& identifier) {
    Session session = LegalSession(identifier);
    EXPECT_TRUE(store_->Create(session)) << db_.GetLastError();
    return session.get_id();
  }

  // The store takes no session that has timed out.
  void AddRow(const std::string& identifier, std::time_t timeout) {
    ASSERT_TRUE(db_.Execute("INSERT INTO session VALUES (NULL,'" + identifier +
                            "','7','192.0.2.1','" + std::to_string(timeout) + "')"));
  }

  static Lines Identifiers() {
    Lines all;
    for (const auto& row :
         SqliteFile(kPath).Rows("SELECT session_id FROM session ORDER BY session_id")) {
      all.push_back(row[0]);
    }
    return all;
  }

  const std::string nothing_ = "SELECT 'nothing since'";
  SharingDB db_;
  std::unique_ptr<SessionDB> store_;
  SyslogListener listener_;
};

// --- The plain operations ---------------------------------------------------------------------

TEST_F(SessionDBTest, CreateStoresTheSessionAndSetsItsId) {
  Session session = LegalSession("visitor");
  session.set_timeout(2000000000);
  EXPECT_TRUE(store_->Create(session));
  EXPECT_EQ(session.get_id(), 1);
  EXPECT_EQ(Seen(),
            "INSERT INTO session VALUES (NULL,'visitor','4294967295','192.0.2.1','2000000000')");
}

TEST_F(SessionDBTest, ASessionThatTimedOutIsRefused) {
  Session session = LegalSession("visitor");
  session.set_timeout(std::time(nullptr));
  EXPECT_FALSE(store_->Create(session));
  EXPECT_FALSE(store_->Update(session));
  EXPECT_EQ(Seen(), nothing_);
}

TEST_F(SessionDBTest, UpdateWritesTheSessionToItsRow) {
  Session session = LegalSession("visitor");
  ASSERT_TRUE(store_->Create(session));
  session.set_uid(2001);
  session.set_timeout(2000000000);
  EXPECT_TRUE(store_->Update(session));
  EXPECT_EQ(Seen(),
            "UPDATE session SET ip='192.0.2.1',session_id='visitor',timeout='2000000000',"
            "uid='2001' WHERE id=1");
  Session found;
  EXPECT_TRUE(store_->GetById(1, found));
  EXPECT_EQ(Seen(), "SELECT * FROM session WHERE id = 1");
  EXPECT_EQ(found.get_uid(), 2001U);
}

TEST_F(SessionDBTest, DeleteWorksByIdAndByRecord) {
  const int id = Add("one");
  Session two = LegalSession("two");
  ASSERT_TRUE(store_->Create(two));
  EXPECT_TRUE(store_->Delete(id));
  EXPECT_EQ(Seen(), "DELETE FROM session WHERE id=1");
  EXPECT_TRUE(store_->Delete(two));
  EXPECT_EQ(Seen(), "DELETE FROM session WHERE id=2");
  EXPECT_EQ(Identifiers(), Lines{});
}

TEST_F(SessionDBTest, CountAndQueryUseTheStoresConditionOnce) {
  Add("one");
  Add("two");
  AddRow("timed out", 1);
  int count = 0;
  store_->GetCondition().Where("session_id", "two");
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM session WHERE `session_id` = 'two'");
  EXPECT_EQ(count, 1);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  std::vector<Session> sessions;
  store_->GetCondition().OrderBy("id", false);
  EXPECT_TRUE(store_->Query(sessions));
  EXPECT_EQ(Seen(), "SELECT * FROM session ORDER BY id DESC");
  ASSERT_EQ(sessions.size(), 2U) << "one that timed out is left out";
  EXPECT_EQ(sessions[0].get_session_id(), "two");
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
}

TEST_F(SessionDBTest, OnlyCountAndQueryUseTheConditionUp) {
  store_->GetCondition().Where("session_id", "two");
  const std::string sql = store_->GetCondition().GetSQL();
  Session session = LegalSession("one");
  EXPECT_TRUE(store_->Create(session));
  EXPECT_TRUE(store_->CreateWithSessionId(session));
  EXPECT_TRUE(store_->Update(session));
  Session found;
  EXPECT_TRUE(store_->GetById(session.get_id(), found));
  EXPECT_TRUE(store_->GetBySessionId(session.get_session_id(), found));
  EXPECT_TRUE(store_->Delete(session.get_id()));
  EXPECT_TRUE(store_->Delete(session));
  EXPECT_TRUE(store_->DeleteBySessionId("one"));
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_TRUE(store_->PurgeExpired(1.0F));
  EXPECT_EQ(store_->GetCondition().GetSQL(), sql);
}

TEST_F(SessionDBTest, ItsEndRunsACheckpoint) {
  store_.reset();
  EXPECT_EQ(db_.GetLastQuery(), "PRAGMA wal_checkpoint;");
}

TEST_F(SessionDBTest, TheStoreHasTheTableOfAllStoresBehindAHandle) {
  tuvo_test::ExpectTablesOfAStore<SessionDB, SessionDBPrivate>(db_);
}

TEST_F(SessionDBTest, TheStoreIsDeletedFromThroughItsBase) {
  SessionDBPrivate store(db_);
  EXPECT_TRUE(static_cast<ObjectDB&>(store).Delete(7));
  EXPECT_EQ(Seen(), "DELETE FROM session WHERE id=7");
}

// --- A fresh identifier -----------------------------------------------------------------------

TEST_F(SessionDBTest, AFreshIdentifierHas32CharactersFitForACookie) {
  std::set<std::string> identifiers;
  for (int i = 0; i < 50; ++i) {
    Session session = LegalSession("");
    ASSERT_TRUE(store_->CreateWithSessionId(session));
    EXPECT_EQ(session.get_session_id().size(), 32U);
    EXPECT_EQ(session.get_session_id().find_first_not_of(TUVO::RANDOM::POOL_URL_FRIENDLY),
              std::string::npos);
    EXPECT_EQ(session.get_id(), i + 1);
    identifiers.insert(session.get_session_id());
  }
  EXPECT_EQ(identifiers.size(), 50U);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// Over 50 identifiers of 32 characters each, of 64 equally likely ones, each is missing with a
// probability below 10^-10.
TEST_F(SessionDBTest, IdentifiersAreDrawnFromTheWholePool) {
  std::set<char> seen;
  for (int i = 0; i < 50; ++i) {
    Session session = LegalSession("");
    ASSERT_TRUE(store_->CreateWithSessionId(session));
    for (const char c : session.get_session_id()) {
      seen.insert(c);
    }
  }
  EXPECT_EQ(seen.size(), std::string(TUVO::RANDOM::POOL_URL_FRIENDLY).size());
}

TEST_F(SessionDBTest, TheIdentifierThatASessionHadIsReplaced) {
  Session session = LegalSession("former");
  EXPECT_TRUE(store_->CreateWithSessionId(session));
  EXPECT_EQ(Identifiers(), Lines{session.get_session_id()});
  EXPECT_NE(session.get_session_id(), "former");
}

// Refuses inserts into "session" as long as fewer than `count` were tried, and keeps what was
// tried. FAIL leaves what the trigger did before.
void RefuseFirst(SharingDB& db, int count) {
  ASSERT_TRUE(db.Execute(
      "CREATE TABLE tried (identifier);"
      "CREATE TRIGGER refusing BEFORE INSERT ON session "
      "WHEN (SELECT COUNT(*) FROM tried) < " +
      std::to_string(count) +
      " BEGIN INSERT INTO tried VALUES (NEW.session_id); SELECT RAISE(FAIL, 'taken'); END;"))
      << db.GetLastError();
}

Lines Tried() {
  Lines tried;
  for (const auto& row : SqliteFile(kPath).Rows("SELECT identifier FROM tried ORDER BY rowid")) {
    tried.push_back(row[0]);
  }
  return tried;
}

TEST_F(SessionDBTest, AnIdentifierGivesUpAfter51AttemptsAndNeverGrows) {
  RefuseFirst(db_, 1000);
  Session session = LegalSession("");
  EXPECT_FALSE(store_->CreateWithSessionId(session));
  const Lines tried = Tried();
  ASSERT_EQ(tried.size(), 51U);
  for (const std::string& identifier : tried) {
    EXPECT_EQ(identifier.size(), 32U);
  }
  EXPECT_EQ(std::set<std::string>(tried.begin(), tried.end()).size(), 51U);
  EXPECT_EQ(session.get_session_id(), tried.back()) << "the last one drawn is kept";
  EXPECT_EQ(session.get_id(), 0);
  EXPECT_EQ(TakeLines(listener_), Lines(51, "object_db:LINE (PID) insert failed\n"));
}

TEST_F(SessionDBTest, TheFirstIdentifierThatIsFreeIsTaken) {
  for (const int refused : {1, 3, 50}) {
    ASSERT_TRUE(db_.Execute("DROP TRIGGER IF EXISTS refusing; DROP TABLE IF EXISTS tried"));
    RefuseFirst(db_, refused);
    Session session = LegalSession("");
    EXPECT_TRUE(store_->CreateWithSessionId(session)) << refused;
    EXPECT_EQ(session.get_session_id().size(), 32U);
    EXPECT_EQ(Tried().size(), static_cast<size_t>(refused));
  }
}

TEST_F(SessionDBTest, AnIllegalSessionIsTriedAsOftenAndNeverStored) {
  Session session = LegalSession("former");
  session.set_ip("");
  EXPECT_FALSE(store_->CreateWithSessionId(session));
  EXPECT_EQ(session.get_session_id().size(), 32U);
  EXPECT_EQ(Seen(), nothing_);
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 102U);
  EXPECT_EQ(lines[101], "object_db:LINE (PID) obj invalid\n");
}

TEST_F(SessionDBTest, WithoutARandomSourceNothingWeakerIsStored) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(tuvo_test::RunInChild([] {
              SharingDB db(kPath);
              SessionDB store(db);
              Session session = LegalSession("before");
              EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kGetrandom, EPERM}}));
              EXPECT_FALSE(store.CreateWithSessionId(session));
              EXPECT_EQ(session.get_session_id(), "");
              EXPECT_EQ(session.get_id(), 0);
              return 0;
            }),
            0);
  EXPECT_EQ(Identifiers(), Lines{});
}

// --- Look-ups and deletes ---------------------------------------------------------------------

TEST_F(SessionDBTest, GetBySessionIdFindsTheSession) {
  Add("other");
  const int id = Add("visitor");
  Session session;
  EXPECT_TRUE(store_->GetBySessionId("visitor", session));
  EXPECT_EQ(Seen(), "SELECT * FROM session WHERE session_id = 'visitor'");
  EXPECT_EQ(session.get_id(), id);
}

TEST_F(SessionDBTest, GetBySessionIdOfNoSessionFailsAndLeavesTheRecord) {
  Session session = LegalSession("kept");
  session.set_id(7);
  EXPECT_FALSE(store_->GetBySessionId("missing", session));
  EXPECT_FALSE(store_->GetBySessionId("", session));
  EXPECT_EQ(session.get_session_id(), "kept");
  EXPECT_EQ(session.get_id(), 7);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(SessionDBTest, AnIdentifierWithAQuoteFindsNothingAndBreaksNothing) {
  Add("visitor");
  Session session;
  EXPECT_FALSE(store_->GetBySessionId("x' OR '1'='1", session));
  EXPECT_EQ(Seen(), "SELECT * FROM session WHERE session_id = 'x'' OR ''1''=''1'");
  EXPECT_TRUE(store_->DeleteBySessionId("x' OR '1'='1"));
  EXPECT_EQ(Seen(), "DELETE FROM session WHERE session_id = 'x'' OR ''1''=''1'");
  EXPECT_EQ(db_.GetLastError(), "");
  EXPECT_EQ(Identifiers(), Lines{"visitor"});
}

TEST_F(SessionDBTest, GetBySessionIdOfOneThatTimedOutFailsAndFillsTheRecord) {
  AddRow("late", 5);
  Session session;
  EXPECT_FALSE(store_->GetBySessionId("late", session));
  EXPECT_EQ(session.get_id(), 1);
  EXPECT_EQ(session.get_timeout(), 5);
}

TEST_F(SessionDBTest, AFailedGetBySessionIdLeavesTheRecord) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token; DROP TABLE session"));
  Session session = LegalSession("kept");
  EXPECT_FALSE(store_->GetBySessionId("kept", session));
  EXPECT_EQ(session.get_session_id(), "kept");
}

TEST_F(SessionDBTest, DeleteBySessionIdDeletesThatSession) {
  Add("one");
  Add("two");
  EXPECT_TRUE(store_->DeleteBySessionId("one"));
  EXPECT_EQ(Seen(), "DELETE FROM session WHERE session_id = 'one'");
  EXPECT_EQ(Identifiers(), Lines{"two"});
}

TEST_F(SessionDBTest, DeleteBySessionIdOfAnUnknownOneSucceeds) {
  EXPECT_TRUE(store_->DeleteBySessionId("missing"));
}

TEST_F(SessionDBTest, DeleteBySessionIdDeletesNoTokenItself) {
  const int id = Add("one");
  ASSERT_TRUE(db_.Execute("PRAGMA foreign_keys = OFF"));
  Token token = tuvo_test::LegalToken(5, id);
  ASSERT_TRUE(TokenDB(db_).Create(token));
  EXPECT_TRUE(store_->DeleteBySessionId("one"));
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT COUNT(*) FROM token"), "1");
}

TEST_F(SessionDBTest, AFailedDeleteBySessionIdAnswersFalseInSilence) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token; DROP TABLE session"));
  EXPECT_FALSE(store_->DeleteBySessionId("one"));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// --- The purge --------------------------------------------------------------------------------

TEST_F(SessionDBTest, ThePurgeDeletesWhatTimedOutBeforeThisSecond) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM session"));
    AddRow("goes: a second ago", now - 1);
    AddRow("goes: long ago", 1);
    AddRow("goes: negative", -1);
    AddRow("stays: now", now);
    AddRow("stays: later", now + 1);
    EXPECT_TRUE(store_->PurgeExpired(1.0F));
  });
  EXPECT_EQ(Identifiers(), (Lines{"stays: later", "stays: now"}));
}

// The session itself counts as timed out in that second.
TEST_F(SessionDBTest, ASessionOfThisVerySecondIsRefusedButNotPurged) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM session"));
    AddRow("now", now);
    EXPECT_TRUE(store_->PurgeExpired(1.0F));
    Session session;
    EXPECT_FALSE(store_->GetBySessionId("now", session));
    EXPECT_EQ(session.get_session_id(), "now");
  });
}

TEST_F(SessionDBTest, ThePurgesStatementQuotesTheTime) {
  tuvo_test::ExpectStatementOfNow([&] { return store_->PurgeExpired(1.0F); },
                                  [&] { return db_.GetLastQuery(); },
                                  "DELETE FROM session WHERE timeout < 'NOW'");
}

TEST_F(SessionDBTest, ASkippedPurgeRunsNothingAndSucceeds) {
  AddRow("late", 1);
  Seen();
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_EQ(Seen(), nothing_);
  EXPECT_EQ(Identifiers(), Lines{"late"});
}

TEST_F(SessionDBTest, APurgeWithAProbabilityBetweenRunsAtSomeCalls) {
  int runs = 0;
  for (int i = 0; i < 200; ++i) {
    EXPECT_TRUE(store_->PurgeExpired(0.5F));
    runs += Seen() != nothing_ ? 1 : 0;
  }
  EXPECT_GT(runs, 30);
  EXPECT_LT(runs, 170);
}

TEST_F(SessionDBTest, APurgeThatFailsAnswersFalseInSilence) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token; DROP TABLE session"));
  EXPECT_FALSE(store_->PurgeExpired(1.0F));
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// Groups digits, as a program with a local taste might.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST_F(SessionDBTest, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  tuvo_test::ExpectStatementOfNow([&] { return store_->PurgeExpired(1.0F); },
                                  [&] { return db_.GetLastQuery(); },
                                  "DELETE FROM session WHERE timeout < 'NOW'");
  Session session = LegalSession("visitor");
  session.set_uid(1234567);
  EXPECT_TRUE(store_->Create(session));
  Session found;
  EXPECT_TRUE(store_->GetBySessionId("visitor", found));
  EXPECT_EQ(found.get_uid(), 1234567U);
  EXPECT_EQ(found.get_timeout(), session.get_timeout());
  std::locale::global(former);
}

}  // namespace
