// No statement of a request reads a whole table: asks SQLite for the plan of every statement that
// the stores really issue, in empty and filled tables, with and without statistics.
#include <gtest/gtest.h>
#include <json/value.h>
#include <tuvosharing/tuvosharing.h>
#include <unistd.h>

#include <ctime>
#include <map>
#include <ostream>
#include <string>
#include <vector>

#include "sqlite_file.h"

namespace {

using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;
using tuvo_test::SchemaScript;
using tuvo_test::SqliteFile;

constexpr unsigned int kOwner = 1026;
constexpr unsigned int kAnyOwner = 4294967295U;
constexpr char kProject[] = "photo";

std::string NewFile(const std::string& path) {
  for (const char* suffix : {"", "-wal", "-shm"}) {
    unlink((path + suffix).c_str());
  }
  return path;
}

// Runs the stores' operations on a small file and keeps the statements they end with, by the
// operation's name.
class Recorder {
 public:
  Recorder() : db_(NewFile("/tmp/recorded.db")) {
    EXPECT_TRUE(db_.IsGood());
    RecordEntryStatements();
    RecordSessionStatements();
    RecordTokenStatements();
  }

  const std::map<std::string, std::string>& Statements() const { return statements_; }

 private:
  void Keep(const std::string& name, bool done) {
    EXPECT_TRUE(done) << name << ": " << db_.GetLastError();
    EXPECT_TRUE(statements_.emplace(name, db_.GetLastQuery()).second) << name << " twice";
  }

  static Entry NewEntry() {
    Entry entry;
    entry.set_hash("recorded1")
        .set_project_name(kProject)
        .set_owner_uid(kOwner)
        .set_app(Json::Value(Json::objectValue));
    return entry;
  }

  static Session NewSession() {
    Session session;
    session.set_session_id("recorded").set_ip("192.0.2.1").set_timeout(std::time(nullptr) + 1000);
    return session;
  }

  void RecordEntryStatements() {
    EntryDB store(db_);
    Entry entry = NewEntry();
    Entry found;
    Token token;
    Keep("entry Create", store.Create(entry));
    Keep("entry Update", store.Update(entry));
    Keep("entry GetById", store.GetById(entry.get_id(), found));
    Keep("entry GetByHash", store.GetByHash("recorded1", found));
    token.set_entry_id(entry.get_id());
    Keep("entry GetByToken", store.GetByToken(token, found));
    RecordListings(store);
    RecordPurges(store);
    Keep("entry Delete", store.Delete(entry));
    Keep("entry DeleteByOwnerUid", store.DeleteByOwnerUid(kOwner));
    Entry hashed = NewEntry();
    Keep("entry CreateWithHash", store.CreateWithHash(hashed));
  }

  void RecordListings(EntryDB& store) {
    std::vector<Entry> entries;
    int count = 0;
    Keep("entry Count of all", store.Count(count));
    Keep("entry Query of all", store.Query(entries));
    for (const std::string filter : {"owner", "project", "owner and project"}) {
      Filter(store.GetCondition(), filter);
      Keep("entry Count by " + filter, store.Count(count));
      Filter(store.GetCondition(), filter);
      Keep("entry Query by " + filter, store.Query(entries));
      Filter(store.GetCondition(), filter);
      store.GetCondition().OrderBy("id", false);
      store.GetCondition().Page(2, 10);
      Keep("entry Query by page of " + filter, store.Query(entries));
    }
  }

  static void Filter(Condition& condition, const std::string& by) {
    if (by != "project") {
      condition.Where("owner_uid", std::to_string(kOwner));
    }
    if (by != "owner") {
      condition.Where("project_name", kProject);
    }
  }

  void RecordPurges(EntryDB& store) {
    Keep("entry PurgeExpired", store.PurgeExpired(1.0F));
    Keep("entry purge of all", store.PurgeExpiredByOwnerProject(kAnyOwner, ""));
    Keep("entry purge by owner", store.PurgeExpiredByOwnerProject(kOwner, ""));
    Keep("entry purge by project", store.PurgeExpiredByOwnerProject(kAnyOwner, kProject));
    Keep("entry purge by both", store.PurgeExpiredByOwnerProject(kOwner, kProject));
  }

  void RecordSessionStatements() {
    SessionDB store(db_);
    Session session = NewSession();
    Session found;
    std::vector<Session> sessions;
    int count = 0;
    Keep("session Create", store.Create(session));
    Keep("session Update", store.Update(session));
    Keep("session GetById", store.GetById(session.get_id(), found));
    Keep("session GetBySessionId", store.GetBySessionId("recorded", found));
    Keep("session Count of all", store.Count(count));
    Keep("session Query of all", store.Query(sessions));
    Keep("session PurgeExpired", store.PurgeExpired(1.0F));
    Keep("session Delete", store.Delete(session));
    Keep("session DeleteBySessionId", store.DeleteBySessionId("recorded"));
    Session drawn = NewSession();
    Keep("session CreateWithSessionId", store.CreateWithSessionId(drawn));
  }

  void RecordTokenStatements() {
    Entry entry = NewEntry();
    Session session = NewSession();
    ASSERT_TRUE(EntryDB(db_).Create(entry));
    ASSERT_TRUE(SessionDB(db_).Create(session));
    TokenDB store(db_);
    Token token;
    token.set_entry_id(entry.get_id());
    token.set_session_id(session.get_id());
    token.set_timeout(std::time(nullptr) + 1000);
    Token found;
    std::vector<Token> tokens;
    int count = 0;
    Keep("token Create", store.Create(token));
    Keep("token Update", store.Update(token));
    Keep("token GetById", store.GetById(token.get_id(), found));
    Keep("token GetBySessionEntry", store.GetBySessionEntry(session, entry, found));
    Keep("token Count of all", store.Count(count));
    Keep("token Query of all", store.Query(tokens));
    store.GetCondition().Where("session_id", std::to_string(session.get_id()));
    Keep("token Query by session", store.Query(tokens));
    store.GetCondition().Where("entry_id", std::to_string(entry.get_id()));
    Keep("token Query by entry", store.Query(tokens));
    Keep("token PurgeExpired", store.PurgeExpired(1.0F));
    Keep("token PurgeByEntry", store.PurgeByEntry(entry));
    Keep("token Delete", store.Delete(token));
  }

  SharingDB db_;
  std::map<std::string, std::string> statements_;
};

const std::map<std::string, std::string>& Statements() {
  static const Recorder recorder;
  return recorder.Statements();
}

// Statements that mean the whole table, and so may read it.
bool MeansTheWholeTable(const std::string& name) {
  return name.size() > 7 && name.compare(name.size() - 7, 7, " of all") == 0;
}

// A tenth of the links, sessions and tokens is past its time; 200 owners, three projects.
constexpr char kFill[] = R"(
  WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 20000)
  INSERT INTO entry SELECT NULL, 'hash' || i,
    CASE WHEN i % 5 = 0 THEN 'photo' WHEN i % 5 = 1 THEN 'drive' ELSE 'files' END, 1,
    1026 + i % 200, 0, CASE WHEN i % 2 THEN 0 ELSE strftime('%s') + i * 10 - 20000 END,
    CASE WHEN i % 3 THEN 0 ELSE 5 END, i % 7, i % 10 != 0, '{}' FROM n;
  WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 20000)
  INSERT INTO session SELECT NULL, 'session' || i, 4294967295, '192.0.2.1',
    strftime('%s') + i * 10 - 20000 FROM n;
  WITH RECURSIVE n(i) AS (SELECT 1 UNION ALL SELECT i + 1 FROM n WHERE i < 20000)
  INSERT INTO token SELECT NULL, i, i, strftime('%s') + i * 10 - 20000 FROM n;
)";

struct Setting {
  const char* name;
  bool filled;
  bool analyzed;
};

void PrintTo(const Setting& setting, std::ostream* out) {
  *out << setting.name;
}

class QueryPlan : public testing::TestWithParam<Setting> {
 protected:
  QueryPlan() : db_(NewFile("/tmp/plan.db")) {
    db_.Execute(SchemaScript(1));
    db_.Execute(SchemaScript(2));
    if (GetParam().filled) {
      db_.Execute(std::string("BEGIN;") + kFill + "COMMIT;");
    }
    if (GetParam().analyzed) {
      db_.Execute("ANALYZE");
    }
  }

  // The steps that walk a whole table or index.
  std::vector<std::string> Scans(const std::string& sql) {
    std::vector<std::string> scans;
    for (const std::string& step : db_.Plan(sql)) {
      if (step.compare(0, 4, "SCAN") == 0) {
        scans.push_back(step);
      }
    }
    return scans;
  }

  bool HasStep(const std::string& sql, const std::string& wanted) {
    for (const std::string& step : db_.Plan(sql)) {
      if (step.compare(0, wanted.size(), wanted) == 0) {
        return true;
      }
    }
    return false;
  }

  SqliteFile db_;
};

TEST_P(QueryPlan, NoStatementButThoseThatMeanTheWholeTableScansOne) {
  for (const auto& [name, sql] : Statements()) {
    if (!MeansTheWholeTable(name)) {
      EXPECT_EQ(Scans(sql), std::vector<std::string>()) << name << ": " << sql;
    }
  }
}

TEST_P(QueryPlan, StatementsThatMeanTheWholeTableAreSeenToScan) {
  for (const auto& [name, sql] : Statements()) {
    if (MeansTheWholeTable(name)) {
      EXPECT_EQ(Scans(sql).size(), 1U) << name << ": " << sql;
    }
  }
}

TEST_P(QueryPlan, EverySearchingStatementIsSeenToSearch) {
  for (const auto& [name, sql] : Statements()) {
    if (!MeansTheWholeTable(name) && sql.compare(0, 6, "INSERT") != 0) {
      EXPECT_TRUE(HasStep(sql, "SEARCH ")) << name << ": " << sql;
    }
  }
}

TEST_P(QueryPlan, TheAutomaticPurgeUsesOneIndexForEachOfItsReasons) {
  const std::string& sql = Statements().at("entry PurgeExpired");
  EXPECT_TRUE(HasStep(sql, "MULTI-INDEX OR")) << sql;
  EXPECT_TRUE(HasStep(sql, "SEARCH entry USING INDEX entry_past_time (auto_gc=? AND expire_at<?)"));
  EXPECT_TRUE(HasStep(sql, "SEARCH entry USING INDEX entry_used_up (auto_gc=?)"));
}

TEST_P(QueryPlan, AListingByPageIsNotSorted) {
  for (const std::string filter : {"owner", "project", "owner and project"}) {
    const std::string& sql = Statements().at("entry Query by page of " + filter);
    EXPECT_FALSE(HasStep(sql, "USE TEMP B-TREE")) << sql;
  }
}

// The plan does not show what a foreign key does; the steps that were made do.
TEST_P(QueryPlan, DeletingAnEntryOrASessionSearchesItsTokens) {
  EXPECT_EQ(db_.FullScanSteps("DELETE FROM entry WHERE id = 5"), 0);
  EXPECT_EQ(db_.FullScanSteps("DELETE FROM session WHERE id = 6"), 0);
  if (GetParam().filled) {
    EXPECT_EQ(db_.Value("SELECT COUNT(*) FROM token"), "19998");
    db_.Execute("DROP INDEX token_by_entry; DROP INDEX token_by_session_entry");
    EXPECT_GT(db_.FullScanSteps("DELETE FROM entry WHERE id = 7"), 19000);
    EXPECT_GT(db_.FullScanSteps("DELETE FROM session WHERE id = 8"), 19000);
  }
}

// Without the steps of the plan, by what a run does: nothing is walked but what is asked for.
TEST_P(QueryPlan, RunStatementsMakeNoStepInAScan) {
  for (const auto& [name, sql] : Statements()) {
    if (!MeansTheWholeTable(name)) {
      db_.Execute("BEGIN; PRAGMA defer_foreign_keys = ON");  // a token of rows that are not here
      EXPECT_EQ(db_.FullScanSteps(sql), 0) << name << ": " << sql;
      db_.Execute("ROLLBACK");
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Settings, QueryPlan,
                         testing::Values(Setting{"empty", false, false},
                                         Setting{"emptyAnalyzed", false, true},
                                         Setting{"filled", true, false},
                                         Setting{"filledAnalyzed", true, true}),
                         [](const auto& setting) { return std::string(setting.param.name); });

}  // namespace
