// The database files of every version that ever was, kept as SQL in golden/: each is restored,
// opened through the library as any program would open it, and compared with a new file and with
// what it held. A row that a program has once stored is to be there, and to mean the same, for
// ever.
#include <gtest/gtest.h>
#include <json/value.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>
#include <unistd.h>

#include <filesystem>
#include <limits>
#include <set>
#include <string>
#include <vector>

#include "database_text.h"
#include "sqlite_file.h"
#include "store_records.h"
#include "support/syslog_listener.h"
#include "test_files.h"

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;
using tuvo_test::ContentOf;
using tuvo_test::NewPath;
using tuvo_test::SqliteFile;
using tuvo_test::StructureOf;
using tuvo_test::SyslogListener;
using tuvo_test::TableColumns;
using tuvo_test::TablesOf;
using tuvo_test::TextRow;
using Ids = std::vector<int>;
using Lines = std::vector<std::string>;

// Where times have 32 bits, a later one reads as "not set".
constexpr bool kShortTimes = std::numeric_limits<long>::digits == 31;

std::string PrivatePath(const std::string& name) {
  return tuvo_test::kPrivateFolder + name;
}

std::string GoldenText(int version) {
  return tuvo_test::ReadFile(TUVO_PROJECT_FOLDER "/tests/db/golden/" + std::to_string(version) +
                             ".sql");
}

// The numbers of the files NUMBER.sql in a folder.
std::set<int> NumbersIn(const std::string& folder) {
  std::set<int> numbers;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) {
    EXPECT_EQ(entry.path().extension(), ".sql") << entry.path();
    numbers.insert(std::stoi(entry.path().stem()));
  }
  return numbers;
}

std::set<int> Goldens() {
  return NumbersIn(TUVO_PROJECT_FOLDER "/tests/db/golden");
}

std::set<int> GoldensWithTables() {
  std::set<int> versions = Goldens();
  versions.erase(0);
  return versions;
}

// As the library makes a file that is not there.
Lines NewStructure() {
  const std::string path = NewPath(PrivatePath("new.db"));
  EXPECT_TRUE(SharingDB(path).IsGood());
  SqliteFile db(path);
  return StructureOf(db);
}

// A golden file, restored where the library finds it. It belongs to the system, as every database.
class Restored {
 public:
  explicit Restored(int version) : path_(NewPath(PrivatePath("golden.db"))) {
    SqliteFile(path_).Execute(GoldenText(version));
    EXPECT_EQ(chown(path_.c_str(), 1, 1), 0);
    EXPECT_EQ(chmod(path_.c_str(), 0660), 0);
  }

  const std::string& path() const { return path_; }

  Lines Structure() const {
    SqliteFile db(path_);
    return StructureOf(db);
  }

  std::vector<TableColumns> Tables() const {
    SqliteFile db(path_);
    return TablesOf(db);
  }

  Lines Content(const std::vector<TableColumns>& tables) const {
    SqliteFile db(path_);
    return ContentOf(db, tables);
  }

  std::string Value(const std::string& sql) const { return SqliteFile(path_).Value(sql); }

 private:
  std::string path_;
};

// One version each, on the file as it was left.
class Golden : public testing::TestWithParam<int> {
 protected:
  Golden() : file_(GetParam()) {}

  Restored file_;
};

// One version that has tables each, on the file as the library has opened it.
class GoldenRows : public testing::TestWithParam<int> {
 protected:
  GoldenRows() : file_(GetParam()), db_(file_.path()) { EXPECT_TRUE(db_.IsGood()); }

  Entry Link(int id) {
    Entry entry;
    EXPECT_TRUE(EntryDB(db_).GetById(id, entry)) << id;
    return entry;
  }

  Session Visitor(int id) {
    Session session;
    EXPECT_TRUE(SessionDB(db_).GetById(id, session)) << id;
    return session;
  }

  Token Admission(int id) {
    Token token;
    EXPECT_TRUE(TokenDB(db_).GetById(id, token)) << id;
    return token;
  }

  Restored file_;
  SharingDB db_;
};

// --- The golden files themselves ----------------------------------------------------------------

TEST(GoldenFiles, EveryVersionHasItsScriptAndItsGoldenFile) {
  const std::string path = NewPath(PrivatePath("new.db"));
  ASSERT_TRUE(SharingDB(path).IsGood());
  const int current = std::stoi(SqliteFile(path).Value("PRAGMA user_version"));
  std::set<int> scripts;
  for (int version = 1; version <= current; ++version) {
    scripts.insert(version);
  }
  EXPECT_EQ(NumbersIn("/usr/tuvo/share/tuvosharing/db_schema"), scripts);
  std::set<int> goldens = scripts;
  goldens.insert(0);
  EXPECT_EQ(Goldens(), goldens);
}

// So that neither a script nor a golden file is ever changed alone.
TEST_P(Golden, IsWhatTheScriptsUpToItsVersionMake) {
  SqliteFile made(":memory:");
  for (int version = 1; version <= GetParam(); ++version) {
    made.Execute(tuvo_test::SchemaScript(version));
  }
  EXPECT_EQ(file_.Structure(), StructureOf(made));
}

TEST_P(GoldenRows, HoldsRowsOfEveryTable) {
  for (const std::string table : {"entry", "session", "token"}) {
    EXPECT_NE(file_.Value("SELECT COUNT(*) FROM " + table), "0") << table;
  }
}

// --- What the library makes of them -------------------------------------------------------------

TEST_P(Golden, BecomesWhatANewFileIs) {
  EXPECT_TRUE(SharingDB(file_.path()).IsGood());
  EXPECT_EQ(file_.Structure(), NewStructure());
  EXPECT_EQ(file_.Value("PRAGMA journal_mode"), "wal");
  EXPECT_EQ(file_.Value("PRAGMA integrity_check"), "ok");
  EXPECT_EQ(tuvo_test::OwnerAndMode(file_.path()), "1:1 0660");
}

TEST_P(Golden, LosesAndChangesNothing) {
  const std::vector<TableColumns> tables = file_.Tables();
  const Lines before = file_.Content(tables);
  const Lines damage = {file_.Value("SELECT COUNT(*) FROM pragma_foreign_key_check")};
  EXPECT_TRUE(SharingDB(file_.path()).IsGood());
  EXPECT_EQ(file_.Content(tables), before);
  EXPECT_EQ(Lines{file_.Value("SELECT COUNT(*) FROM pragma_foreign_key_check")}, damage);
}

TEST_P(Golden, IsOpenedWithoutALineInTheLog) {
  SyslogListener listener;
  EXPECT_TRUE(SharingDB(file_.path()).IsGood());
  EXPECT_EQ(listener.TakeTexts(), Lines{});
}

TEST_P(Golden, IsOpenedTwiceLikeOnce) {
  const std::vector<TableColumns> tables = file_.Tables();
  const Lines before = file_.Content(tables);
  for (int times = 0; times < 2; ++times) {
    EXPECT_TRUE(SharingDB(file_.path()).IsGood());
  }
  EXPECT_EQ(file_.Structure(), NewStructure());
  EXPECT_EQ(file_.Content(tables), before);
}

// A process may end between making the file and writing to it.
TEST(GoldenFiles, AFileWithoutAByteBecomesANewOne) {
  const std::string path = NewPath(PrivatePath("empty.db"));
  tuvo_test::WriteFile(path, "");
  ASSERT_EQ(chown(path.c_str(), 1, 1), 0);
  EXPECT_TRUE(SharingDB(path).IsGood());
  SqliteFile db(path);
  EXPECT_EQ(StructureOf(db), NewStructure());
}

// --- Links --------------------------------------------------------------------------------------

TEST_P(GoldenRows, AllLinksLoadThatAreLinks) {
  EntryDB store(db_);
  int count = 0;
  ASSERT_TRUE(store.Count(count));
  EXPECT_EQ(count, 33);
  std::vector<Entry> entries;
  store.GetCondition().OrderBy("id", true);
  ASSERT_TRUE(store.Query(entries));
  Ids ids;
  for (const Entry& entry : entries) {
    ids.push_back(entry.get_id());
  }
  EXPECT_EQ(ids, (Ids{1,  2,  3,  4,  5,  6,  7,  8,  9,  10,        11,
                      12, 13, 14, 21, 22, 23, 24, 25, 26, 1000000007}));
}

TEST_P(GoldenRows, RowsThatAreNoLinksAreRefusedOneByOneToo) {
  for (int id = 31; id <= 42; ++id) {
    Entry entry;
    EXPECT_FALSE(EntryDB(db_).GetById(id, entry)) << id;
    EXPECT_EQ(entry.get_id(), id) << "it is there";
  }
}

// What the library once wrote it still writes: loading and storing such a row changes no byte.
TEST_P(GoldenRows, LinksThatTheLibraryWroteAreWrittenBackAsTheyWere) {
  const std::vector<TableColumns> tables = file_.Tables();
  const Lines before = file_.Content(tables);
  for (const int id : {1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 1000000007}) {
    EXPECT_TRUE(EntryDB(db_).Update(Link(id))) << id;
  }
  EXPECT_EQ(file_.Content(tables), before);
}

TEST_P(GoldenRows, LinksAreFoundByTheirHashes) {
  Entry entry;
  EXPECT_TRUE(EntryDB(db_).GetByHash("000000042", entry));
  EXPECT_EQ(entry.get_id(), 12);
  EXPECT_TRUE(EntryDB(db_).GetByHash("Zk3AbcDe9", entry));
  EXPECT_EQ(entry.get_id(), 1);
  EXPECT_TRUE(EntryDB(db_).GetByHash("zK3aBCdE9", entry));
  EXPECT_EQ(entry.get_id(), 13);
  EXPECT_TRUE(EntryDB(db_).GetByHash("\xc3\x28\xff'", entry));
  EXPECT_EQ(entry.get_id(), 26);
}

TEST_P(GoldenRows, PasswordsStillOpenTheirLinks) {
  EXPECT_TRUE(Link(2).IsPasswordValid("correct horse"));
  EXPECT_FALSE(Link(2).IsPasswordValid("battery staple"));
  EXPECT_EQ(Link(2).get_protect_password_algo(), Entry::ENCRYPT_ALGO_DEFAULT);
  EXPECT_EQ(Link(2).get_protect_title(), "Holiday");
  EXPECT_TRUE(Link(3).IsPasswordValid("battery staple"));
  EXPECT_FALSE(Link(3).IsPasswordValid("correct horse"));
  EXPECT_EQ(Link(3).get_protect_password_algo(), Entry::ENCRYPT_ALGO_MD5);
}

TEST_P(GoldenRows, AccountsAndNamesAreStillAdmitted) {
  EXPECT_EQ(Link(4).get_protect_type(), Entry::PROTECT_USER);
  EXPECT_EQ(Link(4).get_protect_uids(), (std::vector<unsigned int>{2001, 4294967294}));
  EXPECT_EQ(Link(4).get_protect_users(), (Lines{"alice", "zoe"}));
  EXPECT_EQ(Link(4).get_protect_groups(), (Lines{"friends", "choir"}));
  EXPECT_EQ(Link(13).get_protect_users(), (Lines{"zoe", "zoe"}));
}

TEST_P(GoldenRows, LinksAreSentOnAsBefore) {
  EXPECT_EQ(Link(5).get_redirect_type(), Entry::REDIRECT_ALWAYS);
  EXPECT_EQ(Link(5).get_redirect_uri(), "https://nas.example.org/a?b=c&d#e");
  EXPECT_EQ(Link(6).get_redirect_type(), Entry::REDIRECT_URLPARAM);
  EXPECT_EQ(Link(6).get_redirect_uri(), "/drive/");
  EXPECT_EQ(Link(1).get_redirect_type(), Entry::REDIRECT_NONE);
}

TEST_P(GoldenRows, OnlyLinksThatAreInForceAreValid) {
  for (const int id : {1, 2, 3, 4, 5, 6, 10, 12, 13, 14, 1000000007}) {
    EXPECT_TRUE(Link(id).IsValid()) << id;
  }
  for (const int id : {7, 8, 9, 11}) {
    EXPECT_FALSE(Link(id).IsValid()) << id;
  }
}

TEST_P(GoldenRows, OddTextsAreReadAsTheyWere) {
  const Entry link = Link(12);
  EXPECT_EQ(link.get_project_name(),
            "O'Reilly \"&\" <b>; DROP TABLE entry; -- ü 日本 😀\nsecond line\\");
  EXPECT_EQ(link.get_protect_title(),
            std::string("line\nbreak\ttab \\ \" ' % _ ; -- ü 日本 😀 \x01\0", 47));
  EXPECT_EQ(link.get_private_data()["key"].asString(), "Gehe1m'\"");
  EXPECT_EQ(link.get_app()["list"].size(), 6U);
  EXPECT_EQ(Link(14).get_app()["text"].asString(), std::string(100000, 'x'));
}

TEST_P(GoldenRows, MissingValuesReadAsTheirDefaults) {
  const Entry link = Link(21);
  EXPECT_TRUE(link.get_enabled());
  EXPECT_EQ(link.get_start_at(), 0);
  EXPECT_EQ(link.get_expire_at(), 0);
  EXPECT_EQ(link.get_expire_times(), 0);
  EXPECT_EQ(link.get_use_count(), 0);
  EXPECT_FALSE(link.get_auto_gc());
  EXPECT_EQ(link.get_private_data(), Json::Value(Json::objectValue));
  EXPECT_EQ(Link(22).get_protect_title(), "7");
  EXPECT_TRUE(Link(22).get_enable_match_ip());
  EXPECT_EQ(Link(22).get_redirect_type(), Entry::REDIRECT_ALWAYS);
}

TEST_P(GoldenRows, WhatIsNoNumberReadsAsItAlwaysDid) {
  const Entry link = Link(23);
  EXPECT_FALSE(link.get_enabled());
  EXPECT_EQ(link.get_start_at(), 0);
  EXPECT_EQ(link.get_expire_at(), 12);
  EXPECT_EQ(link.get_expire_times(), 3);
  EXPECT_EQ(link.get_use_count(), 1);
  EXPECT_FALSE(link.get_auto_gc());
}

TEST_P(GoldenRows, NumbersBelowZeroAndBeyondAnIntReadAsTheyAlwaysDid) {
  EXPECT_FALSE(Link(24).get_enabled());
  EXPECT_EQ(Link(24).get_start_at(), -1);
  EXPECT_EQ(Link(24).get_expire_times(), -5);
  EXPECT_EQ(Link(24).get_use_count(), std::numeric_limits<int>::min());
  EXPECT_TRUE(Link(24).get_auto_gc());
  EXPECT_EQ(Link(25).get_start_at(), kShortTimes ? 0 : 4102444800);
  EXPECT_EQ(Link(25).get_expire_times(), 0);
  EXPECT_EQ(Link(25).get_use_count(), 0);
  EXPECT_EQ(Link(11).get_owner_uid(), 4294967294U);
  EXPECT_EQ(Link(11).get_use_count(), std::numeric_limits<int>::max());
}

TEST_P(GoldenRows, BytesThatAreNoTextAreReadUpToAZero) {
  EXPECT_EQ(Link(26).get_hash(), "\xc3\x28\xff'");
  EXPECT_EQ(Link(26).get_project_name(), "a");
}

TEST_P(GoldenRows, ThePurgeTakesExactlyWhatIsPastItsTimeOrUsedUp) {
  ASSERT_TRUE(EntryDB(db_).PurgeExpired(1));
  EXPECT_EQ(file_.Value("SELECT COUNT(*) FROM entry"), "31") << "without 9 and 11";
  Entry entry;
  for (const int id : {9, 11}) {
    EXPECT_FALSE(EntryDB(db_).GetById(id, entry));
    EXPECT_EQ(entry.get_id(), 0) << id;
  }
}

// --- Sessions and tokens ------------------------------------------------------------------------

TEST_P(GoldenRows, AllSessionsLoadThatHaveNotEnded) {
  SessionDB store(db_);
  std::vector<Session> sessions;
  store.GetCondition().OrderBy("id", true);
  ASSERT_TRUE(store.Query(sessions));
  Ids ids;
  for (const Session& session : sessions) {
    ids.push_back(session.get_id());
  }
  EXPECT_EQ(ids, (kShortTimes ? Ids{1, 2, 6, 9, 2147483646} : Ids{1, 2, 6, 8, 9, 2147483646}));
}

TEST_P(GoldenRows, SessionsAreWhatTheyWere) {
  EXPECT_EQ(Visitor(1).get_session_id(), "aB3dE6gH9jK2mN5pQ8sT1vW4yZ7cF0iL");
  EXPECT_EQ(Visitor(1).get_uid(), 2001U);
  EXPECT_EQ(Visitor(1).get_ip(), "192.0.2.1");
  EXPECT_EQ(Visitor(2).get_uid(), 4294967295U);
  EXPECT_EQ(Visitor(2).get_ip(), "2001:db8::1");
  EXPECT_EQ(Visitor(6).get_session_id(), "00000000000000000000000000000042");
  EXPECT_EQ(Visitor(9).get_uid(), 4294967295U);
  Session session;
  EXPECT_TRUE(SessionDB(db_).GetBySessionId("it's \"odd\" ü", session));
  EXPECT_EQ(session.get_id(), 9);
}

TEST_P(GoldenRows, TokensAreFoundByTheirPair) {
  Token token;
  EXPECT_TRUE(TokenDB(db_).GetBySessionEntry(Visitor(2), Link(2), token));
  EXPECT_EQ(token.get_id(), 3);
  Token great;
  EXPECT_TRUE(TokenDB(db_).GetBySessionEntry(Visitor(2147483646), Link(1000000007), great));
  EXPECT_EQ(great.get_id(), 6);
  Token other;
  EXPECT_FALSE(TokenDB(db_).GetBySessionEntry(Visitor(2), Link(1), other));
  EXPECT_EQ(other.get_id(), 0);
}

TEST_P(GoldenRows, AllTokensLoadThatHaveNotEnded) {
  TokenDB store(db_);
  std::vector<Token> tokens;
  store.GetCondition().OrderBy("id", true);
  ASSERT_TRUE(store.Query(tokens));
  Ids ids;
  for (const Token& token : tokens) {
    ids.push_back(token.get_id());
  }
  EXPECT_EQ(ids, (Ids{1, 2, 3, 5, 6, 9, 2147483647}));
}

TEST_P(GoldenRows, SessionsAndTokensThatTheLibraryWroteAreWrittenBackAsTheyWere) {
  const std::vector<TableColumns> tables = file_.Tables();
  const Lines before = file_.Content(tables);
  for (const int id : {1, 2, 6, 2147483646}) {
    EXPECT_TRUE(SessionDB(db_).Update(Visitor(id))) << id;
  }
  for (const int id : {1, 2, 3, 5, 6, 2147483647}) {
    EXPECT_TRUE(TokenDB(db_).Update(Admission(id))) << id;
  }
  EXPECT_EQ(file_.Content(tables), before);
}

TEST_P(GoldenRows, TokensGoWithTheirLinksAndSessions) {
  ASSERT_TRUE(EntryDB(db_).Delete(1));
  EXPECT_EQ(file_.Value("SELECT group_concat(id) FROM (SELECT id FROM token ORDER BY id)"),
            "3,4,6,7,8,9,10,2147483647");
  ASSERT_TRUE(SessionDB(db_).Delete(2));
  EXPECT_EQ(file_.Value("SELECT group_concat(id) FROM (SELECT id FROM token ORDER BY id)"),
            "4,6,7,8,9,10");
}

// --- Life goes on -------------------------------------------------------------------------------

TEST_P(GoldenRows, NewRowsGetNumbersBehindAllThatEverWere) {
  Entry entry = tuvo_test::LegalEntry("brandNew1");
  ASSERT_TRUE(EntryDB(db_).Create(entry));
  EXPECT_EQ(entry.get_id(), 1000000101);
  Session session = tuvo_test::LegalSession("brandNew1");
  ASSERT_TRUE(SessionDB(db_).Create(session));
  EXPECT_EQ(session.get_id(), 2147483647);
}

TEST_P(GoldenRows, TakenNamesAreStillRefused) {
  Entry entry = tuvo_test::LegalEntry("000000042");
  EXPECT_FALSE(EntryDB(db_).Create(entry));
  Session session = tuvo_test::LegalSession("00000000000000000000000000000042");
  EXPECT_FALSE(SessionDB(db_).Create(session));
}

std::string VersionName(const testing::TestParamInfo<int>& info) {
  return "Version" + std::to_string(info.param);
}

INSTANTIATE_TEST_SUITE_P(OfEveryVersion, Golden, testing::ValuesIn(Goldens()), VersionName);
INSTANTIATE_TEST_SUITE_P(OfEveryVersion, GoldenRows, testing::ValuesIn(GoldensWithTables()),
                         VersionName);

}  // namespace
