// The store of links on the real schema.
#include <gtest/gtest.h>
#include <internal/entry_db_private.h>
#include <json/value.h>
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

using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::EntryDBPrivate;
using TUVO::sharing::db::ObjectDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
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

constexpr char kPath[] = "/tmp/entry.db";
constexpr unsigned int kAnyOwner = 4294967295U;
constexpr char kExpired[] =
    " ((expire_at != 0 AND expire_at < NOW) OR (expire_times != 0 AND use_count >= expire_times))";

class EntryDBTest : public testing::Test {
 protected:
  EntryDBTest() : db_(tuvo_test::NewPath(kPath)), store_(std::make_unique<EntryDB>(db_)) {
    EXPECT_TRUE(db_.IsGood());
    Seen();
  }

  // The last statement, once: what it was is forgotten.
  std::string Seen() {
    std::string query = db_.GetLastQuery();
    db_.Execute("SELECT 'nothing since'");
    return query;
  }

  // Stores a link and returns its id.
  int Add(Entry entry) {
    EXPECT_TRUE(store_->Create(entry)) << db_.GetLastError();
    return entry.get_id();
  }

  // The hashes that are stored, in order.
  static Lines Hashes() {
    Lines hashes;
    for (const auto& row : SqliteFile(kPath).Rows("SELECT hash FROM entry ORDER BY hash")) {
      hashes.push_back(row[0]);
    }
    return hashes;
  }

  const std::string nothing_ = "SELECT 'nothing since'";
  SharingDB db_;
  std::unique_ptr<EntryDB> store_;
  SyslogListener listener_;
};

// --- The plain operations ---------------------------------------------------------------------

TEST_F(EntryDBTest, CreateStoresTheLinkAndSetsItsId) {
  Entry entry = LegalEntry("Ab3dE5fG7");
  EXPECT_TRUE(store_->Create(entry));
  EXPECT_EQ(entry.get_id(), 1);
  std::string wanted = "INSERT INTO entry VALUES (NULL";
  for (const std::string& value : entry.GetFieldList()) {
    wanted += ",'" + value + "'";
  }
  EXPECT_EQ(Seen(), wanted + ")");
}

TEST_F(EntryDBTest, CreateWithoutAHashIsRefused) {
  Entry entry = LegalEntry("");
  EXPECT_FALSE(store_->Create(entry));
  EXPECT_EQ(entry.get_id(), 0);
  EXPECT_EQ(Seen(), nothing_);
}

TEST_F(EntryDBTest, ATakenHashIsRefused) {
  Add(LegalEntry("taken"));
  Entry entry = LegalEntry("taken");
  EXPECT_FALSE(store_->Create(entry));
  EXPECT_EQ(TakeLines(listener_), Lines{"object_db:LINE (PID) insert failed\n"});
}

TEST_F(EntryDBTest, UpdateWritesTheLinkToItsRow) {
  Entry entry = LegalEntry("one");
  ASSERT_TRUE(store_->Create(entry));
  entry.set_use_count(5).set_enabled(false);
  EXPECT_TRUE(store_->Update(entry));
  Entry found;
  EXPECT_TRUE(store_->GetById(entry.get_id(), found));
  EXPECT_EQ(found.get_use_count(), 5);
  EXPECT_FALSE(found.get_enabled());
}

TEST_F(EntryDBTest, DeleteWorksByIdAndByRecord) {
  const int id = Add(LegalEntry("one"));
  Entry two = LegalEntry("two");
  ASSERT_TRUE(store_->Create(two));
  EXPECT_TRUE(store_->Delete(id));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE id=1");
  EXPECT_EQ(Hashes(), Lines{"two"});
  EXPECT_TRUE(store_->Delete(two));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE id=2");
  EXPECT_EQ(Hashes(), Lines{});
  EXPECT_TRUE(store_->Delete(two));
}

TEST_F(EntryDBTest, GetByIdLoadsTheLink) {
  const int id = Add(LegalEntry("one"));
  Entry entry;
  EXPECT_TRUE(store_->GetById(id, entry));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE id = 1");
  EXPECT_EQ(entry.get_hash(), "one");
  EXPECT_FALSE(store_->GetById(99, entry));
}

TEST_F(EntryDBTest, CountAndQueryUseTheStoresConditionOnce) {
  Add(LegalEntry("one"));
  Add(LegalEntry("two").set_owner_uid(7));
  int count = 0;
  store_->GetCondition().Where("owner_uid", "7");
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM entry WHERE `owner_uid` = '7'");
  EXPECT_EQ(count, 1);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  std::vector<Entry> entries;
  store_->GetCondition().Where("owner_uid", "7");
  EXPECT_TRUE(store_->Query(entries));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE `owner_uid` = '7'");
  ASSERT_EQ(entries.size(), 1U);
  EXPECT_EQ(entries[0].get_hash(), "two");
  EXPECT_TRUE(store_->Query(entries));
  EXPECT_EQ(entries.size(), 2U);
}

TEST_F(EntryDBTest, OnlyCountAndQueryUseTheConditionUp) {
  store_->GetCondition().Where("owner_uid", "7");
  const std::string sql = store_->GetCondition().GetSQL();
  Entry entry = LegalEntry("one");
  EXPECT_TRUE(store_->Create(entry));
  EXPECT_TRUE(store_->CreateWithHash(entry));
  EXPECT_TRUE(store_->Update(entry));
  Entry found;
  EXPECT_TRUE(store_->GetById(entry.get_id(), found));
  EXPECT_TRUE(store_->GetByHash(entry.get_hash(), found));
  EXPECT_TRUE(store_->GetByToken(LegalToken(entry.get_id(), 1), found));
  EXPECT_TRUE(store_->Delete(entry.get_id()));
  EXPECT_TRUE(store_->Delete(entry));
  EXPECT_TRUE(store_->DeleteByOwnerUid(1026));
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_TRUE(store_->PurgeExpired(1.0F));
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(1026, "photo"));
  EXPECT_EQ(store_->GetCondition().GetSQL(), sql);
}

TEST_F(EntryDBTest, AQueryLeavesRowsOutThatLoadAsIllegal) {
  Add(LegalEntry("one"));
  ASSERT_TRUE(
      db_.Execute("INSERT INTO entry (hash, project_name, owner_uid, data) VALUES "
                  "('no json', 'photo', 7, 'no json'), ('no app', 'photo', 7, '{}')"));
  std::vector<Entry> entries;
  EXPECT_TRUE(store_->Query(entries));
  ASSERT_EQ(entries.size(), 1U);
  EXPECT_EQ(entries[0].get_hash(), "one");
}

TEST_F(EntryDBTest, ItsEndRunsACheckpoint) {
  store_.reset();
  EXPECT_EQ(db_.GetLastQuery(), "PRAGMA wal_checkpoint;");
}

TEST_F(EntryDBTest, TheStoreHasTheTableOfAllStoresBehindAHandle) {
  tuvo_test::ExpectTablesOfAStore<EntryDB, EntryDBPrivate>(db_);
}

TEST_F(EntryDBTest, TheStoreIsDeletedFromThroughItsBase) {
  EntryDBPrivate store(db_);
  EXPECT_TRUE(static_cast<ObjectDB&>(store).Delete(7));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE id=7");
}

// --- A fresh hash -----------------------------------------------------------------------------

TEST_F(EntryDBTest, AFreshHashHasNineLettersAndDigits) {
  std::set<std::string> hashes;
  for (int i = 0; i < 50; ++i) {
    Entry entry = LegalEntry("");
    ASSERT_TRUE(store_->CreateWithHash(entry));
    EXPECT_EQ(entry.get_hash().size(), 9U);
    EXPECT_EQ(entry.get_hash().find_first_not_of(TUVO::RANDOM::POOL_ALPHA_NUMERIC),
              std::string::npos);
    EXPECT_EQ(entry.get_id(), i + 1);
    hashes.insert(entry.get_hash());
  }
  EXPECT_EQ(hashes.size(), 50U);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(EntryDBTest, TheHashThatALinkHadIsReplaced) {
  Entry entry = LegalEntry("former");
  EXPECT_TRUE(store_->CreateWithHash(entry));
  EXPECT_NE(entry.get_hash(), "former");
  EXPECT_EQ(Hashes(), Lines{entry.get_hash()});
}

// Refuses inserts into "entry" as long as fewer than `count` were tried, and keeps what was tried.
// FAIL leaves what the trigger did before.
void RefuseFirst(SharingDB& db, int count) {
  ASSERT_TRUE(
      db.Execute("CREATE TABLE tried (hash);"
                 "CREATE TRIGGER refusing BEFORE INSERT ON entry "
                 "WHEN (SELECT COUNT(*) FROM tried) < " +
                 std::to_string(count) +
                 " BEGIN INSERT INTO tried VALUES (NEW.hash); SELECT RAISE(FAIL, 'taken'); END;"))
      << db.GetLastError();
}

Lines Tried() {
  Lines tried;
  for (const auto& row : SqliteFile(kPath).Rows("SELECT hash FROM tried ORDER BY rowid")) {
    tried.push_back(row[0]);
  }
  return tried;
}

TEST_F(EntryDBTest, AHashGivesUpAfter51AttemptsAndGrowsAfterEveryThird) {
  RefuseFirst(db_, 1000);
  Entry entry = LegalEntry("");
  EXPECT_FALSE(store_->CreateWithHash(entry));
  const Lines tried = Tried();
  ASSERT_EQ(tried.size(), 51U);
  for (size_t i = 0; i < tried.size(); ++i) {
    EXPECT_EQ(tried[i].size(), 9 + i / 3) << "attempt " << i + 1;
  }
  EXPECT_EQ(tried.back().size(), 25U);
  EXPECT_EQ(entry.get_hash(), tried.back()) << "the last one drawn is kept";
  EXPECT_EQ(entry.get_id(), 0);
  EXPECT_EQ(std::set<std::string>(tried.begin(), tried.end()).size(), 51U);
  EXPECT_EQ(TakeLines(listener_), Lines(51, "object_db:LINE (PID) insert failed\n"));
}

TEST_F(EntryDBTest, TheFirstHashThatIsFreeIsTaken) {
  for (const int refused : {1, 2, 3, 50}) {
    ASSERT_TRUE(db_.Execute("DROP TRIGGER IF EXISTS refusing; DROP TABLE IF EXISTS tried"));
    RefuseFirst(db_, refused);
    Entry entry = LegalEntry("");
    EXPECT_TRUE(store_->CreateWithHash(entry)) << refused;
    EXPECT_EQ(entry.get_hash().size(), static_cast<size_t>(9 + refused / 3));
    EXPECT_NE(entry.get_id(), 0);
    EXPECT_EQ(Tried().size(), static_cast<size_t>(refused));
  }
}

TEST_F(EntryDBTest, EveryCallBeginsWithNineCharacters) {
  RefuseFirst(db_, 10);
  Entry entry = LegalEntry("");
  EXPECT_TRUE(store_->CreateWithHash(entry));
  Entry next = LegalEntry("");
  EXPECT_TRUE(store_->CreateWithHash(next));
  EXPECT_EQ(next.get_hash().size(), 9U);
}

TEST_F(EntryDBTest, AnIllegalLinkIsTriedAsOftenAndNeverStored) {
  Entry entry = LegalEntry("").set_project_name("");
  EXPECT_FALSE(store_->CreateWithHash(entry));
  EXPECT_EQ(entry.get_hash().size(), 25U);
  EXPECT_EQ(Seen(), nothing_);
  const Lines lines = TakeLines(listener_);
  ASSERT_EQ(lines.size(), 102U);
  EXPECT_EQ(lines[101], "object_db:LINE (PID) obj invalid\n");
}

TEST_F(EntryDBTest, WithoutARandomSourceNothingWeakerIsStored) {
  if (!tuvo_test::CanRefuseCalls()) {
    GTEST_SKIP() << "this system has no system call filters";
  }
  EXPECT_EQ(tuvo_test::RunInChild([] {
              SharingDB db(kPath);
              EntryDB store(db);
              Entry entry = LegalEntry("before");
              EXPECT_TRUE(tuvo_test::RefuseCalls({{tuvo_test::kGetrandom, EPERM}}));
              EXPECT_FALSE(store.CreateWithHash(entry));
              EXPECT_EQ(entry.get_hash(), "");
              EXPECT_EQ(entry.get_id(), 0);
              return 0;
            }),
            0);
  EXPECT_EQ(Hashes(), Lines{});
}

// --- Look-ups ---------------------------------------------------------------------------------

TEST_F(EntryDBTest, GetByHashFindsTheLink) {
  Add(LegalEntry("other"));
  const int id = Add(LegalEntry("Ab3dE5fG7"));
  Entry entry;
  EXPECT_TRUE(store_->GetByHash("Ab3dE5fG7", entry));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE hash = 'Ab3dE5fG7'");
  EXPECT_EQ(entry.get_id(), id);
  EXPECT_EQ(entry.get_hash(), "Ab3dE5fG7");
}

TEST_F(EntryDBTest, AHashOfDigitsIsATextAndCaseCounts) {
  Add(LegalEntry("012345678"));
  Add(LegalEntry("AAAAAAAAA"));
  Entry entry;
  EXPECT_TRUE(store_->GetByHash("012345678", entry));
  EXPECT_FALSE(store_->GetByHash("12345678", entry));
  EXPECT_FALSE(store_->GetByHash("aaaaaaaaa", entry));
}

TEST_F(EntryDBTest, GetByHashOfNoLinkFailsAndLeavesTheRecord) {
  Entry entry = LegalEntry("kept").set_id(7);
  EXPECT_FALSE(store_->GetByHash("missing", entry));
  EXPECT_EQ(entry.get_hash(), "kept");
  EXPECT_EQ(entry.get_id(), 7);
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(EntryDBTest, AHashWithAQuoteFindsNothingAndBreaksNothing) {
  Add(LegalEntry("one"));
  Entry entry;
  EXPECT_FALSE(store_->GetByHash("x' OR '1'='1", entry));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE hash = 'x'' OR ''1''=''1'");
  EXPECT_EQ(db_.GetLastError(), "");
}

TEST_F(EntryDBTest, GetByHashOfALinkThatLoadsAsIllegalFailsAndFillsTheRecord) {
  ASSERT_TRUE(db_.Execute("INSERT INTO entry (hash, owner_uid, data) VALUES ('bad', 7, '{}')"));
  Entry entry;
  EXPECT_FALSE(store_->GetByHash("bad", entry));
  EXPECT_EQ(entry.get_hash(), "bad");
  EXPECT_EQ(entry.get_owner_uid(), 7U);
}

TEST_F(EntryDBTest, AFailedGetByHashLeavesTheRecord) {
  ASSERT_TRUE(db_.Execute("DROP TABLE entry"));
  Entry entry = LegalEntry("kept");
  EXPECT_FALSE(store_->GetByHash("kept", entry));
  EXPECT_EQ(entry.get_hash(), "kept");
}

TEST_F(EntryDBTest, GetByTokenFollowsTheTokensEntryId) {
  const int id = Add(LegalEntry("one"));
  Add(LegalEntry("two"));
  Entry entry;
  EXPECT_TRUE(store_->GetByToken(LegalToken(id, 77), entry));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE id = 1");
  EXPECT_EQ(entry.get_hash(), "one");
  EXPECT_FALSE(store_->GetByToken(Token(), entry));
  EXPECT_EQ(Seen(), "SELECT * FROM entry WHERE id = 0");
  EXPECT_EQ(entry.get_hash(), "one");
}

// --- Deletes ----------------------------------------------------------------------------------

TEST_F(EntryDBTest, DeleteByOwnerUidDeletesAllLinksOfThatOwner) {
  Add(LegalEntry("one"));
  Add(LegalEntry("two"));
  Add(LegalEntry("other").set_owner_uid(1027));
  EXPECT_TRUE(store_->DeleteByOwnerUid(1026));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE owner_uid = 1026");
  EXPECT_EQ(Hashes(), Lines{"other"});
  EXPECT_TRUE(store_->DeleteByOwnerUid(kAnyOwner));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE owner_uid = 4294967295");
  EXPECT_EQ(Hashes(), Lines{"other"}) << "no owner is not every owner";
}

// The store itself touches its table alone; what the schema's foreign keys do is theirs.
TEST_F(EntryDBTest, DeleteByOwnerUidDeletesNoSessionsAndNoTokensItself) {
  const int id = Add(LegalEntry("one"));
  Session session = LegalSession("visitor");
  ASSERT_TRUE(SessionDB(db_).Create(session));
  Token token = LegalToken(id, session.get_id());
  ASSERT_TRUE(TokenDB(db_).Create(token));
  ASSERT_TRUE(db_.Execute("PRAGMA foreign_keys = OFF"));
  EXPECT_TRUE(store_->DeleteByOwnerUid(1026));
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT COUNT(*) FROM token"), "1");
  EXPECT_EQ(SqliteFile(kPath).Value("SELECT COUNT(*) FROM session"), "1");
}

TEST_F(EntryDBTest, AFailedDeleteByOwnerUidAnswersFalse) {
  ASSERT_TRUE(db_.Execute("DROP TABLE entry"));
  EXPECT_FALSE(store_->DeleteByOwnerUid(1026));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// --- Purges -----------------------------------------------------------------------------------

// Links for every reason to go or to stay, made around the current second.
void AddAllKinds(EntryDB& store, std::time_t now) {
  const auto add = [&](const char* hash, long expire_at, int expire_times, int use_count,
                       bool auto_gc) {
    Entry entry = LegalEntry(hash);
    entry.set_expire_at(expire_at)
        .set_expire_times(expire_times)
        .set_use_count(use_count)
        .set_auto_gc(auto_gc);
    EXPECT_TRUE(store.Create(entry));
  };
  add("stays: now", now, 0, 0, true);
  add("stays: later", now + 1000, 0, 0, true);
  add("stays: never", 0, 0, 100, true);
  add("stays: one use left", 0, 3, 2, true);
  add("goes: a second ago", now - 1, 0, 0, true);
  add("goes: before the epoch", -5, 0, 0, true);
  add("goes: used up", 0, 3, 3, true);
  add("goes: overused", 0, 3, 4, true);
  add("goes: by both", now - 1, 3, 3, true);
  add("goes: a limit below zero", 0, -1, 0, true);
  add("kept: a second ago", now - 1, 0, 0, false);
  add("kept: used up", 0, 3, 3, false);
}

const Lines kStay{"stays: later", "stays: never", "stays: now", "stays: one use left"};

TEST_F(EntryDBTest, ThePurgeDeletesWhatIsExpiredAndMayBeCollected) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM entry"));
    AddAllKinds(*store_, now);
    EXPECT_TRUE(store_->PurgeExpired(1.0F));
  });
  EXPECT_EQ(Hashes(),
            (Lines{"kept: a second ago", "kept: used up", kStay[0], kStay[1], kStay[2], kStay[3]}));
}

TEST_F(EntryDBTest, ThePurgesStatementIsThisOne) {
  tuvo_test::ExpectStatementOfNow(
      [&] { return store_->PurgeExpired(1.0F); }, [&] { return db_.GetLastQuery(); },
      "DELETE FROM entry WHERE auto_gc = 1 AND " + std::string(kExpired));
}

TEST_F(EntryDBTest, ASkippedPurgeRunsNothingAndSucceeds) {
  Add(LegalEntry("expired").set_expire_at(1));
  Seen();
  for (int i = 0; i < 100; ++i) {
    EXPECT_TRUE(store_->PurgeExpired(0.0F));
    EXPECT_TRUE(store_->PurgeExpired(-1.0F));
  }
  EXPECT_EQ(Seen(), nothing_);
  EXPECT_EQ(Hashes(), Lines{"expired"});
}

TEST_F(EntryDBTest, APurgeWithAProbabilityBetweenRunsAtSomeCalls) {
  int runs = 0;
  for (int i = 0; i < 200; ++i) {
    EXPECT_TRUE(store_->PurgeExpired(0.5F));
    runs += Seen() != nothing_ ? 1 : 0;
  }
  EXPECT_GT(runs, 30);
  EXPECT_LT(runs, 170);
}

TEST_F(EntryDBTest, APurgeThatFailsAnswersFalseAndASkippedOneDoesNot) {
  ASSERT_TRUE(db_.Execute("DROP TABLE entry"));
  EXPECT_FALSE(store_->PurgeExpired(1.0F));
  EXPECT_TRUE(store_->PurgeExpired(0.0F));
  EXPECT_FALSE(store_->PurgeExpiredByOwnerProject(1026, "photo"));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(EntryDBTest, ThePurgeByOwnerAndProjectDeletesAlsoWhatIsNotCollectedAutomatically) {
  tuvo_test::WithinOneSecond([&](std::time_t now) {
    ASSERT_TRUE(db_.Execute("DELETE FROM entry"));
    AddAllKinds(*store_, now);
    EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(1026, "photo"));
  });
  EXPECT_EQ(Hashes(), kStay);
}

TEST_F(EntryDBTest, ThePurgeByOwnerAndProjectsStatementsAreThese) {
  struct Case {
    unsigned int uid;
    const char* project;
    const char* narrowing;
  };
  for (const Case& one :
       {Case{1026, "photo", " owner_uid = 1026 AND project_name = 'photo' AND"},
        Case{1026, "", " owner_uid = 1026 AND"}, Case{0, "", " owner_uid = 0 AND"},
        Case{kAnyOwner, "it's", " project_name = 'it''s' AND"}, Case{kAnyOwner, "", ""},
        Case{4294967294U, "", " owner_uid = 4294967294 AND"}}) {
    tuvo_test::ExpectStatementOfNow(
        [&] { return store_->PurgeExpiredByOwnerProject(one.uid, one.project); },
        [&] { return db_.GetLastQuery(); },
        "DELETE FROM entry WHERE" + std::string(one.narrowing) + kExpired);
  }
}

TEST_F(EntryDBTest, ThePurgeByOwnerAndProjectIsNarrowedByWhatIsGiven) {
  const auto fill = [&] {
    ASSERT_TRUE(db_.Execute("DELETE FROM entry"));
    Add(LegalEntry("1026 photo").set_expire_at(1));
    Add(LegalEntry("1026 drive").set_expire_at(1).set_project_name("drive"));
    Add(LegalEntry("1027 photo").set_expire_at(1).set_owner_uid(1027));
    Add(LegalEntry("1027 drive").set_expire_at(1).set_owner_uid(1027).set_project_name("drive"));
  };
  fill();
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(1026, "photo"));
  EXPECT_EQ(Hashes(), (Lines{"1026 drive", "1027 drive", "1027 photo"}));
  fill();
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(1026, ""));
  EXPECT_EQ(Hashes(), (Lines{"1027 drive", "1027 photo"}));
  fill();
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(kAnyOwner, "photo"));
  EXPECT_EQ(Hashes(), (Lines{"1026 drive", "1027 drive"}));
  fill();
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(kAnyOwner, ""));
  EXPECT_EQ(Hashes(), Lines{});
}

TEST_F(EntryDBTest, AProjectCannotGetOutOfItsQuotes) {
  Add(LegalEntry("one").set_expire_at(1));
  EXPECT_TRUE(store_->PurgeExpiredByOwnerProject(7, "x' OR '1'='1"));
  EXPECT_EQ(Hashes(), Lines{"one"});
}

// Groups digits, as a program with a local taste might.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST_F(EntryDBTest, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  EXPECT_TRUE(store_->DeleteByOwnerUid(1234567));
  EXPECT_EQ(Seen(), "DELETE FROM entry WHERE owner_uid = 1234567");
  tuvo_test::ExpectStatementOfNow(
      [&] { return store_->PurgeExpiredByOwnerProject(1234567, ""); },
      [&] { return db_.GetLastQuery(); },
      "DELETE FROM entry WHERE owner_uid = 1234567 AND" + std::string(kExpired));
  Entry entry = LegalEntry("grouped");
  entry.set_owner_uid(1234567).set_start_at(1700000000).set_expire_times(1234567);
  EXPECT_TRUE(store_->Create(entry));
  Entry found;
  EXPECT_TRUE(store_->GetByHash("grouped", found));
  EXPECT_EQ(found.get_owner_uid(), 1234567U);
  EXPECT_EQ(found.get_start_at(), 1700000000);
  EXPECT_EQ(found.get_expire_times(), 1234567);
  std::locale::global(former);
}

}  // namespace
