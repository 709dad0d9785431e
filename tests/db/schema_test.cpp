// What the schema scripts promise to the records and stores, seen through SQLite itself.
#include <gtest/gtest.h>
#include <unistd.h>

#include <chrono>
#include <stdexcept>
#include <string>
#include <thread>

#include "sqlite_file.h"

namespace {

using tuvo_test::SchemaScript;
using tuvo_test::SqliteFile;
using tuvo_test::TextRow;

constexpr char kPath[] = "/tmp/schema.db";

class Schema : public testing::Test {
 protected:
  Schema() : db_(NewFile()) {
    db_.Execute(SchemaScript(1));
    db_.Execute(SchemaScript(2));
  }

  static const char* NewFile() {
    unlink(kPath);
    return kPath;
  }

  // Column names in table order.
  TextRow Columns(const std::string& table) {
    TextRow names;
    for (const TextRow& row : db_.Rows("SELECT name FROM pragma_table_info('" + table + "')")) {
      names.push_back(row[0]);
    }
    return names;
  }

  // How SQLite keeps each column of the only row.
  TextRow Types(const std::string& table) {
    std::string list;
    for (const std::string& column : Columns(table)) {
      list += (list.empty() ? "" : ", ") + ("typeof(" + column + ")");
    }
    return db_.Rows("SELECT " + list + " FROM " + table).at(0);
  }

  void InsertEntry(const std::string& id, const std::string& hash) {
    db_.Execute("INSERT INTO entry (id, hash) VALUES (" + id + ", '" + hash + "')");
  }

  void InsertSession(const std::string& id, const std::string& identifier) {
    db_.Execute("INSERT INTO session (id, session_id) VALUES (" + id + ", '" + identifier + "')");
  }

  std::string Objects() {
    std::string all;
    for (const TextRow& row : db_.Rows("SELECT type, name, sql FROM sqlite_schema ORDER BY name")) {
      all += row[0] + "|" + row[1] + "|" + row[2] + "\n";
    }
    return all;
  }

  SqliteFile db_;
};

TEST_F(Schema, EntryHasItsColumnsInTheOrderThatRowsAreInsertedIn) {
  EXPECT_EQ(Columns("entry"),
            (TextRow{"id", "hash", "project_name", "enabled", "owner_uid", "start_at", "expire_at",
                     "expire_times", "use_count", "auto_gc", "data"}));
}

TEST_F(Schema, SessionHasItsColumnsInTheOrderThatRowsAreInsertedIn) {
  EXPECT_EQ(Columns("session"), (TextRow{"id", "session_id", "uid", "ip", "timeout"}));
}

TEST_F(Schema, TokenHasItsColumnsInTheOrderThatRowsAreInsertedIn) {
  EXPECT_EQ(Columns("token"), (TextRow{"id", "entry_id", "session_id", "timeout"}));
}

TEST_F(Schema, QuotedNumbersOfAnEntryAreKeptAsIntegersAndTextsAsTexts) {
  db_.Execute(
      "INSERT INTO entry VALUES (NULL,'012345678','7','1','4294967295','0','1700000000','3','2',"
      "'1','{}')");
  EXPECT_EQ(Types("entry"), (TextRow{"integer", "text", "text", "integer", "integer", "integer",
                                     "integer", "integer", "integer", "integer", "text"}));
}

TEST_F(Schema, AHashOfDigitsKeepsItsLeadingZeros) {
  InsertEntry("1", "000000042");
  EXPECT_EQ(db_.Value("SELECT hash FROM entry"), "000000042");
}

TEST_F(Schema, QuotedNumbersOfASessionAreKeptAsIntegersAndTextsAsTexts) {
  db_.Execute("INSERT INTO session VALUES (NULL,'0123','4294967295','10.0','1700000000')");
  EXPECT_EQ(Types("session"), (TextRow{"integer", "text", "integer", "text", "integer"}));
  EXPECT_EQ(db_.Value("SELECT ip FROM session"), "10.0");
}

TEST_F(Schema, QuotedNumbersOfATokenAreKeptAsIntegers) {
  InsertEntry("34", "a");
  InsertSession("12", "b");
  db_.Execute("INSERT INTO token VALUES (NULL,'34','12','1700000000')");
  EXPECT_EQ(Types("token"), (TextRow{"integer", "integer", "integer", "integer"}));
}

TEST_F(Schema, AQuotedTimeIsComparedAsANumber) {
  db_.Execute("INSERT INTO session VALUES (NULL,'late','0','ip','1700000001')");
  db_.Execute("INSERT INTO session VALUES (NULL,'early','0','ip','999999999')");
  EXPECT_EQ(db_.Value("SELECT session_id FROM session WHERE timeout < '1700000000'"), "early");
  EXPECT_EQ(db_.Value("SELECT COUNT(*) FROM session WHERE timeout < '1700000000'"), "1");
}

TEST_F(Schema, ATakenHashIsRefused) {
  InsertEntry("1", "taken");
  EXPECT_FALSE(db_.Succeeds("INSERT INTO entry (hash) VALUES ('taken')"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO entry (hash) VALUES ('Taken')"));
}

TEST_F(Schema, ATakenSessionIdentifierIsRefused) {
  InsertSession("1", "taken");
  EXPECT_FALSE(db_.Succeeds("INSERT INTO session (session_id) VALUES ('taken')"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO session (session_id) VALUES ('Taken')"));
}

TEST_F(Schema, RowsMayLackValues) {
  EXPECT_TRUE(db_.Succeeds("INSERT INTO entry (id) VALUES (1)"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO entry (id) VALUES (2)"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO session (id) VALUES (1)"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO session (id) VALUES (2)"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO token (id) VALUES (1)"));
}

TEST_F(Schema, AnIdIsNeverGivenOutTwice) {
  for (const std::string table : {"entry", "session", "token"}) {
    db_.Execute("INSERT INTO " + table + " (id) VALUES (7)");
    db_.Execute("DELETE FROM " + table);
    db_.Execute("INSERT INTO " + table + " (id) VALUES (NULL)");
    EXPECT_EQ(db_.Value("SELECT id FROM " + table), "8") << table;
  }
}

TEST_F(Schema, TokensGoWithTheirEntry) {
  InsertEntry("1", "gone");
  InsertEntry("2", "stays");
  InsertSession("5", "s");
  db_.Execute("INSERT INTO token VALUES (10,1,5,9), (11,1,5,9), (12,2,5,9)");
  db_.Execute("DELETE FROM entry WHERE hash = 'gone'");
  EXPECT_EQ(db_.Rows("SELECT id FROM token"), (std::vector<TextRow>{{"12"}}));
  EXPECT_EQ(db_.Value("SELECT COUNT(*) FROM session"), "1");
}

TEST_F(Schema, TokensGoWithTheirSession) {
  InsertEntry("1", "e");
  InsertSession("5", "gone");
  InsertSession("6", "stays");
  db_.Execute("INSERT INTO token VALUES (10,1,5,9), (11,1,5,9), (12,1,6,9)");
  db_.Execute("DELETE FROM session WHERE session_id = 'gone'");
  EXPECT_EQ(db_.Rows("SELECT id FROM token"), (std::vector<TextRow>{{"12"}}));
  EXPECT_EQ(db_.Value("SELECT COUNT(*) FROM entry"), "1");
}

TEST_F(Schema, ATokenOfNoLinkOrNoSessionIsRefused) {
  InsertEntry("1", "e");
  InsertSession("5", "s");
  EXPECT_TRUE(db_.Succeeds("INSERT INTO token VALUES (NULL,'1','5','9')"));
  EXPECT_FALSE(db_.Succeeds("INSERT INTO token VALUES (NULL,'2','5','9')"));
  EXPECT_FALSE(db_.Succeeds("INSERT INTO token VALUES (NULL,'1','6','9')"));
}

TEST_F(Schema, APairMayHoldTwoTokens) {
  InsertEntry("1", "e");
  InsertSession("5", "s");
  EXPECT_TRUE(db_.Succeeds("INSERT INTO token VALUES (NULL,1,5,9)"));
  EXPECT_TRUE(db_.Succeeds("INSERT INTO token VALUES (NULL,1,5,9)"));
}

TEST_F(Schema, ScriptsRunAgainChangeNothing) {
  InsertEntry("1", "e");
  const std::string before = Objects();
  for (const int version : {1, 2, 2, 1, 2}) {
    db_.Execute(SchemaScript(version));
  }
  EXPECT_EQ(Objects(), before);
  EXPECT_EQ(db_.Value("SELECT hash FROM entry"), "e");
}

TEST_F(Schema, ARowWrittenAtVersionOneIsStillThereAtVersionTwo) {
  SqliteFile old(":memory:");
  old.Execute(SchemaScript(1));
  old.Execute("INSERT INTO entry (hash) VALUES ('e')");
  old.Execute(SchemaScript(2));
  EXPECT_EQ(old.Value("SELECT hash FROM entry WHERE hash = 'e'"), "e");
  EXPECT_EQ(old.Value("PRAGMA integrity_check"), "ok");
}

TEST(SchemaVersion, EachScriptSetsItsOwnNumber) {
  SqliteFile db(":memory:");
  EXPECT_EQ(db.Value("PRAGMA user_version"), "0");
  db.Execute(SchemaScript(1));
  EXPECT_EQ(db.Value("PRAGMA user_version"), "1");
  db.Execute(SchemaScript(2));
  EXPECT_EQ(db.Value("PRAGMA user_version"), "2");
}

// A script stopped before its COMMIT, as by a crash, must leave nothing behind, its number
// included.
TEST(SchemaVersion, AScriptThatDoesNotReachItsEndLeavesTheFileAsItWas) {
  for (const int version : {1, 2}) {
    unlink(kPath);
    SqliteFile db(kPath);
    for (int done = 1; done < version; ++done) {
      db.Execute(SchemaScript(done));
    }
    const auto before = db.Rows("SELECT name, sql FROM sqlite_schema ORDER BY name");
    const std::string script = SchemaScript(version);
    const size_t end = script.rfind("COMMIT;");
    ASSERT_NE(end, std::string::npos);
    db.Execute(script.substr(0, end));
    EXPECT_EQ(db.Value("PRAGMA user_version"), std::to_string(version));
    db.Execute("ROLLBACK");
    EXPECT_EQ(db.Value("PRAGMA user_version"), std::to_string(version - 1));
    EXPECT_EQ(db.Rows("SELECT name, sql FROM sqlite_schema ORDER BY name"), before);
  }
}

// A script that had begun reading while another program writes could not write any more: what it
// read would be out of date. It must take its turn from the start.
TEST(SchemaVersion, AScriptWaitsForAnotherProgramThatWrites) {
  for (const int version : {1, 2}) {
    unlink(kPath);
    SqliteFile writer(kPath);
    writer.Execute("PRAGMA journal_mode = WAL");
    writer.Execute(SchemaScript(1) + SchemaScript(2));
    writer.Execute("BEGIN IMMEDIATE; INSERT INTO entry (hash) VALUES ('e')");
    std::string reason;
    std::thread other([&] {
      try {
        SqliteFile db(kPath);
        db.Execute("PRAGMA busy_timeout = 10000");
        db.Execute(SchemaScript(version));
      } catch (const std::runtime_error& error) {
        reason = error.what();
      }
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    writer.Execute("COMMIT");
    other.join();
    EXPECT_EQ(reason, "") << version;
    EXPECT_EQ(writer.Value("PRAGMA user_version"), std::to_string(version));
  }
}

}  // namespace
