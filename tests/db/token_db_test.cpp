// The store of access tokens on the real schema.
#include <gtest/gtest.h>
#include <internal/token_db_private.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <climits>
#include <ctime>
#include <locale>
#include <memory>
#include <string>
#include <vector>

#include "log_lines.h"
#include "sqlite_file.h"
#include "statement_time.h"
#include "store_layout.h"
#include "store_records.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::ObjectDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::db::TokenDBPrivate;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;
using tuvo_test::LegalEntry;
using tuvo_test::LegalSession;
using tuvo_test::LegalToken;
using tuvo_test::SqliteFile;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using Lines = std::vector<std::string>;

constexpr char kPath[] = "/tmp/token.db";

// Two links and two sessions, with row ids 1 and 2 each.
class TokenDBTest : public testing::Test {
 protected:
  TokenDBTest() : db_(tuvo_test::NewPath(kPath)), store_(std::make_unique<TokenDB>(db_)) {
    EXPECT_TRUE(db_.IsGood());
    for (const char* name : {"one", "two"}) {
      entries_.push_back(LegalEntry(name));
      EXPECT_TRUE(EntryDB(db_).Create(entries_.back()));
      sessions_.push_back(LegalSession(name));
      EXPECT_TRUE(SessionDB(db_).Create(sessions_.back()));
    }
    Seen();
  }

  // The last statement, once: what it was is forgotten.
  std::string Seen() {
    std::string query = db_.GetLastQuery();
    db_.Execute("SELECT 'nothing since'");
    return query;
  }

  int Add(int entry_id, int session_id) {
    Token token = LegalToken(entry_id, session_id);
    EXPECT_TRUE(store_->Create(token)) << db_.GetLastError();
    return token.get_id();
  }

  // The store takes no token that has timed out.
  void AddRow(std::time_t timeout) {
    ASSERT_TRUE(
        db_.Execute("INSERT INTO token VALUES (NULL,'1','1','" + std::to_string(timeout) + "')"));
  }

  // "entry/session" of each token, by id.
  static Lines Pairs() {
    Lines all;
    for (const auto& row :
         SqliteFile(kPath).Rows("SELECT entry_id || '/' || session_id FROM token ORDER BY id")) {
      all.push_back(row[0]);
    }
    return all;
  }

  const std::string nothing_ = "SELECT 'nothing since'";
  SharingDB db_;
  std::unique_ptr<TokenDB> store_;
  std::vector<Entry> entries_;
  std::vector<Session> sessions_;
  SyslogListener listener_;
};

// --- The plain operations ---------------------------------------------------------------------

TEST_F(TokenDBTest, CreateStoresTheTokenAndSetsItsId) {
  Token token = LegalToken(2, 1);
  token.set_timeout(2000000000);
  EXPECT_TRUE(store_->Create(token));
  EXPECT_EQ(token.get_id(), 1);
  EXPECT_EQ(Seen(), "INSERT INTO token VALUES (NULL,'2','1','2000000000')");
}

TEST_F(TokenDBTest, ATokenThatTimedOutOrBelongsToNothingIsRefused) {
  Token late = LegalToken(1, 1);
  late.set_timeout(std::time(nullptr));
  EXPECT_FALSE(store_->Create(late));
  Token linkless = LegalToken(0, 1);
  EXPECT_FALSE(store_->Create(linkless));
  Token sessionless = LegalToken(1, 0);
  EXPECT_FALSE(store_->Create(sessionless));
  EXPECT_EQ(Seen(), nothing_);
}

TEST_F(TokenDBTest, ATokenOfALinkThatDoesNotExistIsRefusedByTheDatabase) {
  Token token = LegalToken(99, 1);
  EXPECT_FALSE(store_->Create(token));
  EXPECT_EQ(db_.GetLastError(), "FOREIGN KEY constraint failed");
  EXPECT_EQ(TakeLines(listener_), Lines{"object_db:LINE (PID) insert failed\n"});
}

TEST_F(TokenDBTest, UpdateWritesTheTokenToItsRow) {
  Token token = LegalToken(1, 2);
  ASSERT_TRUE(store_->Create(token));
  token.set_timeout(2000000000);
  EXPECT_TRUE(store_->Update(token));
  EXPECT_EQ(Seen(), "UPDATE token SET entry_id='1',session_id='2',timeout='2000000000' WHERE id=1");
  Token found;
  EXPECT_TRUE(store_->GetById(1, found));
  EXPECT_EQ(Seen(), "SELECT * FROM token WHERE id = 1");
  EXPECT_EQ(found.get_timeout(), 2000000000);
}

TEST_F(TokenDBTest, DeleteWorksByIdAndByRecord) {
  const int id = Add(1, 1);
  Token second = LegalToken(2, 2);
  ASSERT_TRUE(store_->Create(second));
  EXPECT_TRUE(store_->Delete(id));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE id=1");
  EXPECT_EQ(Pairs(), Lines{"2/2"});
  EXPECT_TRUE(store_->Delete(second));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE id=2");
  EXPECT_EQ(Pairs(), Lines{});
}

TEST_F(TokenDBTest, CountAndQueryUseTheStoresConditionOnce) {
  Add(1, 1);
  Add(1, 2);
  Add(2, 1);
  AddRow(1);
  int count = 0;
  store_->GetCondition().Where("entry_id", "1");
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM token WHERE `entry_id` = '1'");
  EXPECT_EQ(count, 3) << "one that timed out is counted";
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  std::vector<Token> tokens;
  store_->GetCondition().Where("entry_id", "1");
  EXPECT_TRUE(store_->Query(tokens));
  EXPECT_EQ(tokens.size(), 2U) << "but left out";
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
}

TEST_F(TokenDBTest, OnlyCountAndQueryUseTheConditionUp) {
  store_->GetCondition().Where("entry_id", "1");
  const std::string sql = store_->GetCondition().GetSQL();
  Token token = LegalToken(1, 1);
  EXPECT_TRUE(store_->Create(token));
  EXPECT_TRUE(store_->Update(token));
  Token found;
  EXPECT_TRUE(store_->GetById(token.get_id(), found));
  EXPECT_TRUE(store_->GetBySessionEntry(sessions_[0], entries_[0], found));
  EXPECT_TRUE(store_->Delete(token.get_id()));
  EXPECT_TRUE(store_->Delete(token));
  EXPECT_TRUE(store_->PurgeByEntry(entries_[0]));
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_TRUE(store_->PurgeExpired(1.0F));
  EXPECT_EQ(store_->GetCondition().GetSQL(), sql);
}

TEST_F(TokenDBTest, ItsEndRunsACheckpoint) {
  store_.reset();
  EXPECT_EQ(db_.GetLastQuery(), "PRAGMA wal_checkpoint;");
}

TEST_F(TokenDBTest, TheStoreHasTheTableOfAllStoresBehindAHandle) {
  tuvo_test::ExpectTablesOfAStore<TokenDB, TokenDBPrivate>(db_);
}

TEST_F(TokenDBTest, TheStoreIsDeletedFromThroughItsBase) {
  TokenDBPrivate store(db_);
  EXPECT_TRUE(static_cast<ObjectDB&>(store).Delete(7));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE id=7");
}

// --- By session and link ----------------------------------------------------------------------

TEST_F(TokenDBTest, GetBySessionEntryFindsTheTokenOfThePair) {
  Add(1, 1);
  const int id = Add(2, 1);
  Add(1, 2);
  Token token;
  EXPECT_TRUE(store_->GetBySessionEntry(sessions_[0], entries_[1], token));
  EXPECT_EQ(token.get_id(), id);
  EXPECT_EQ(token.get_entry_id(), 2);
  EXPECT_EQ(token.get_session_id(), 1);
}

TEST_F(TokenDBTest, TheStatementHasBothIdsBare) {
  Session session;
  session.set_id(12);
  Entry entry;
  entry.set_id(34);
  Token token;
  EXPECT_FALSE(store_->GetBySessionEntry(session, entry, token));
  EXPECT_EQ(Seen(), "SELECT * FROM token WHERE session_id = 12 AND entry_id = 34");
  session.set_id(-5);
  entry.set_id(INT_MIN);
  EXPECT_FALSE(store_->GetBySessionEntry(session, entry, token));
  EXPECT_EQ(Seen(), "SELECT * FROM token WHERE session_id = -5 AND entry_id = -2147483648");
}

TEST_F(TokenDBTest, APairWithoutATokenIsNotFoundAndLeavesTheRecord) {
  Add(1, 1);
  Token token = LegalToken(8, 9);
  token.set_id(7);
  EXPECT_FALSE(store_->GetBySessionEntry(sessions_[1], entries_[0], token));
  EXPECT_EQ(token.get_id(), 7);
  EXPECT_EQ(token.get_entry_id(), 8);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(TokenDBTest, RecordsThatWereNeverStoredAreLookedUpAsZeroAndFindNothing) {
  Add(1, 1);
  Token token;
  EXPECT_FALSE(store_->GetBySessionEntry(Session(), Entry(), token));
  EXPECT_EQ(Seen(), "SELECT * FROM token WHERE session_id = 0 AND entry_id = 0");
}

TEST_F(TokenDBTest, OfTwoTokensOfAPairTheFirstCounts) {
  const int first = Add(1, 1);
  Add(1, 1);
  Token token;
  EXPECT_TRUE(store_->GetBySessionEntry(sessions_[0], entries_[0], token));
  EXPECT_EQ(token.get_id(), first);
}

TEST_F(TokenDBTest, ATokenThatTimedOutIsNotFoundButFillsTheRecord) {
  AddRow(5);
  Token token;
  EXPECT_FALSE(store_->GetBySessionEntry(sessions_[0], entries_[0], token));
  EXPECT_EQ(token.get_id(), 1);
  EXPECT_EQ(token.get_timeout(), 5);
}

TEST_F(TokenDBTest, AFailedGetBySessionEntryLeavesTheRecord) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token"));
  Token token = LegalToken(8, 9);
  EXPECT_FALSE(store_->GetBySessionEntry(sessions_[0], entries_[0], token));
  EXPECT_EQ(token.get_entry_id(), 8);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(TokenDBTest, PurgeByEntryDeletesTheTokensOfThatLinkAndNothingElse) {
  Add(1, 1);
  Add(2, 1);
  Add(1, 2);
  EXPECT_TRUE(store_->PurgeByEntry(entries_[0]));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE entry_id = 1");
  EXPECT_EQ(Pairs(), Lines{"2/1"});
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT COUNT(*) FROM entry"), "2");
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT COUNT(*) FROM session"), "2");
}

TEST_F(TokenDBTest, PurgeByEntryOfALinkWithoutTokensSucceeds) {
  EXPECT_TRUE(store_->PurgeByEntry(entries_[0]));
  EXPECT_TRUE(store_->PurgeByEntry(Entry()));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE entry_id = 0");
}

TEST_F(TokenDBTest, AFailedPurgeByEntryAnswersFalseInSilence) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token"));
  EXPECT_FALSE(store_->PurgeByEntry(entries_[0]));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// --- The purge by time ------------------------------------------------------------------------

TEST_F(TokenDBTest, ThePurgeDeletesWhatTimedOutBeforeThisSecond) {
  std::time_t second = 0;
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    second = now;
    ASSERT_TRUE(db_.Execute("DELETE FROM token"));
    for (const std::time_t timeout : {now - 1, std::time_t{1}, std::time_t{-1}, now, now + 1}) {
      AddRow(timeout);
    }
    EXPECT_TRUE(store_->PurgeExpired(1.0F));
  });
  SqliteFile file(kPath);
  EXPECT_EQ(file.Value("SELECT COUNT(*) FROM token"), "2");
  EXPECT_EQ(file.Value("SELECT MIN(timeout) FROM token"), std::to_string(second));
}

// The token itself counts as timed out in that second.
TEST_F(TokenDBTest, ATokenOfThisVerySecondIsRefusedButNotPurged) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM token"));
    AddRow(now);
    EXPECT_TRUE(store_->PurgeExpired(1.0F));
    Token token;
    EXPECT_FALSE(store_->GetBySessionEntry(sessions_[0], entries_[0], token));
    EXPECT_EQ(token.get_session_id(), 1);
  });
}

TEST_F(TokenDBTest, ThePurgesStatementQuotesTheTime) {
  tuvo_test::ExpectStatementOfNow([&] { return store_->PurgeExpired(1.0F); },
                                  [&] { return db_.GetLastQuery(); },
                                  "DELETE FROM token WHERE timeout < 'NOW'");
}

TEST_F(TokenDBTest, ASkippedPurgeRunsNothingAndSucceeds) {
  AddRow(1);
  Seen();
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_EQ(Seen(), nothing_);
  EXPECT_EQ(Pairs(), Lines{"1/1"});
}

TEST_F(TokenDBTest, APurgeWithAProbabilityBetweenRunsAtSomeCalls) {
  int runs = 0;
  for (int i = 0; i < 200; ++i) {
    EXPECT_TRUE(store_->PurgeExpired(0.5F));
    runs += Seen() != nothing_ ? 1 : 0;
  }
  EXPECT_GT(runs, 30);
  EXPECT_LT(runs, 170);
}

TEST_F(TokenDBTest, APurgeThatFailsAnswersFalseInSilence) {
  ASSERT_TRUE(db_.Execute("DROP TABLE token"));
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

TEST_F(TokenDBTest, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  Session session;
  session.set_id(1234567);
  Entry entry;
  entry.set_id(7654321);
  Token token;
  EXPECT_FALSE(store_->GetBySessionEntry(session, entry, token));
  EXPECT_EQ(Seen(), "SELECT * FROM token WHERE session_id = 1234567 AND entry_id = 7654321");
  EXPECT_TRUE(store_->PurgeByEntry(entry));
  EXPECT_EQ(Seen(), "DELETE FROM token WHERE entry_id = 7654321");
  Token stored = LegalToken(1, 1);
  EXPECT_TRUE(store_->Create(stored));
  EXPECT_TRUE(store_->GetById(stored.get_id(), token));
  EXPECT_EQ(token.get_timeout(), stored.get_timeout());
  std::locale::global(former);
}

}  // namespace
