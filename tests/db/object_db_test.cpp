// What all stores share, on a table and a record of the test's own.
#include <gtest/gtest.h>
#include <internal/object_db_query.h>
#include <json/value.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>
#include <tuvosharing/object.h>
#include <tuvosharing/object_db.h>
#include <tuvosharing/row.h>
#include <unistd.h>

#include <climits>
#include <locale>
#include <map>
#include <memory>
#include <string>
#include <tuple>
#include <type_traits>
#include <utility>
#include <vector>

#include "log_lines.h"
#include "sqlite_file.h"
#include "support/class_layout.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "test_files.h"

namespace tuvo_test {

using TUVO::sharing::db::ObjectDB;
auto MembersOf(const ObjectDB&);
template struct Reveal<ObjectDB, &ObjectDB::db_, &ObjectDB::table_, &ObjectDB::flag_,
                       &ObjectDB::condition_>;

}  // namespace tuvo_test

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::ObjectDB;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Object;
using tuvo_test::MembersOf;
using tuvo_test::Slot;
using tuvo_test::SqliteFile;
using tuvo_test::SyslogListener;
using tuvo_test::TakeLines;
using tuvo_test::TakeWritten;
using Lines = std::vector<std::string>;

constexpr char kPath[] = "/tmp/object.db";

// A record of the table thing (id, name, size); one without a name is not legal.
class Thing : public Object {
 public:
  Thing() = default;
  Thing(std::string its_name, std::string its_size)
      : name(std::move(its_name)), size(std::move(its_size)) {}

  std::vector<std::string> GetFieldList() const override { return {name, size}; }
  std::map<std::string, std::string> GetFieldMap() const override {
    return {{"size", size}, {"name", name}};
  }
  bool IsLegal() const override { return !name.empty(); }
  void ToJSON(Json::Value& /*value*/) const override {}
  bool FromRow(const Row& row) override {
    set_id(row.GetField("id").AsInt(0));
    name = row.GetField("name").AsString("");
    size = row.GetField("size").AsString("");
    return IsLegal();
  }

  std::string name;
  std::string size;
};

class ThingDB : public ObjectDB {
 public:
  explicit ThingDB(BaseDB& db) : ObjectDB(db, "thing") {}
  int Flag() const { return GetFlag(); }
  std::string Table() const { return GetTable(); }
  const BaseDB* Database() const { return &GetDB(); }
};

// What the function of object_db.cpp that begins so logs, whole: the line feed is one.
std::string LineOf(const std::string& function, const std::string& message) {
  const int line = tuvo_test::SourceLine("db/object_db.cpp",
                                         "SHARING_LOG_PID(\"" + message + "\\n\");", function);
  return "user.err object_db:" + std::to_string(line) + " (" + std::to_string(getpid()) + ") " +
         message + "\n";
}

constexpr char kCreate[] = "bool ObjectDB::Create(";
constexpr char kUpdate[] = "bool ObjectDB::Update(";
constexpr char kDelete[] = "bool ObjectDB::Delete(int";

// Keeps the ids that it was asked to delete instead of deleting them.
class KeepingDB : public ThingDB {
 public:
  using ThingDB::Delete;
  using ThingDB::ThingDB;
  bool Delete(int id) override {
    asked.push_back(id);
    return true;
  }

  std::vector<int> asked;
};

class ObjectDBTest : public testing::Test {
 protected:
  ObjectDBTest() : db_(tuvo_test::NewPath(kPath), 0660) {
    EXPECT_TRUE(
        db_.Execute("CREATE TABLE thing (id INTEGER PRIMARY KEY, name TEXT UNIQUE, "
                    "size TEXT)"));
    store_ = std::make_unique<ThingDB>(db_);
    Seen();
  }

  // The last statement, once: what it was is forgotten.
  std::string Seen() {
    std::string query = db_.GetLastQuery();
    db_.Execute("SELECT 'nothing since'");
    return query;
  }

  static std::string Stored() {
    std::string all;
    for (const auto& row : SqliteFile(kPath).Rows("SELECT * FROM thing ORDER BY id")) {
      all += row[0] + "|" + row[1] + "|" + row[2] + " ";
    }
    return all;
  }

  // Five things, the fourth of which loads as not legal.
  void Fill() {
    ASSERT_TRUE(
        db_.Execute("INSERT INTO thing VALUES (1,'a','1'),(2,'b','2'),(3,'c','1'),"
                    "(4,'','1'),(5,'e','2')"));
  }

  static Lines Names(const std::vector<Thing>& things) {
    Lines names;
    for (const Thing& thing : things) {
      names.push_back(std::to_string(thing.get_id()) + thing.name);
    }
    return names;
  }

  const std::string nothing_ = "SELECT 'nothing since'";
  BaseDB db_;
  std::unique_ptr<ThingDB> store_;
  SyslogListener listener_;
};

// --- Construction and end ---------------------------------------------------------------------

TEST_F(ObjectDBTest, KeepsDatabaseTableFlagAndAnEmptyCondition) {
  EXPECT_EQ(store_->Database(), &db_);
  EXPECT_EQ(store_->Table(), "thing");
  EXPECT_EQ(store_->Flag(), 1);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
}

TEST_F(ObjectDBTest, TheConditionIsOneAndTheSame) {
  const ThingDB& same = *store_;
  EXPECT_EQ(&same.GetCondition(), &store_->GetCondition());
}

TEST_F(ObjectDBTest, MakingAStoreRunsNoStatement) {
  const ThingDB other(db_);
  EXPECT_EQ(db_.GetLastQuery(), nothing_);
}

TEST_F(ObjectDBTest, CannotBeMadeWithoutATableNorCopied) {
  static_assert(!std::is_default_constructible_v<ObjectDB>);
  static_assert(!std::is_constructible_v<ObjectDB, BaseDB&, const char*>);
  static_assert(!std::is_copy_constructible_v<ThingDB>);
  static_assert(!std::is_copy_assignable_v<ThingDB>);
  static_assert(std::has_virtual_destructor_v<ObjectDB>);
}

TEST_F(ObjectDBTest, ItsEndBringsTheLogIntoTheFile) {
  Thing thing("a mark to look for", "");
  ASSERT_TRUE(store_->Create(thing));
  EXPECT_EQ(tuvo_test::ReadFile(kPath).find(thing.name), std::string::npos);
  store_.reset();
  EXPECT_EQ(db_.GetLastQuery(), "PRAGMA wal_checkpoint;");
  EXPECT_NE(tuvo_test::ReadFile(kPath).find(thing.name), std::string::npos);
}

TEST_F(ObjectDBTest, ItsEndOnADatabaseThatIsNotGoodSaysSo) {
  BaseDB bad("/tmp/no such folder/x.db", 0660);
  TakeLines(listener_);
  { const ThingDB store(bad); }
  EXPECT_EQ(TakeLines(listener_), Lines{"base_db:LINE (PID) db is not good.\n\n"});
}

// Programs have stores of their own, with the base's members and operations in these places.
TEST_F(ObjectDBTest, MembersStandInTheirOrder) {
  const ObjectDB& store = *store_;
  static_assert(std::is_same_v<tuvo_test::TypesOf<decltype(MembersOf(store))>,
                               std::tuple<BaseDB*, const char*, int, std::unique_ptr<Condition>>>);
  static_assert(sizeof(std::unique_ptr<Condition>) == sizeof(Condition*));
  EXPECT_TRUE(tuvo_test::StandInThisOrder(store, MembersOf(store)));
  EXPECT_EQ(store.*std::get<2>(MembersOf(store)), 1);
}

TEST_F(ObjectDBTest, OperationsHaveTheirPlacesInTheTable) {
  if (!tuvo_test::kTablesCanBeRead) {
    GTEST_SKIP() << "on this processor tables are read in another way";
  }
  // The destructor takes the first two.
  EXPECT_EQ(Slot(&ObjectDB::Create), 2U);
  EXPECT_EQ(Slot(&ObjectDB::Update), 3U);
  EXPECT_EQ(Slot(static_cast<bool (ObjectDB::*)(int)>(&ObjectDB::Delete)), 4U);
  EXPECT_EQ(Slot(static_cast<bool (ObjectDB::*)(const Object&)>(&ObjectDB::Delete)), 5U);
  EXPECT_EQ(Slot(&ObjectDB::GetById), 6U);
  EXPECT_EQ(Slot(&ObjectDB::Count), 7U);
  EXPECT_EQ(tuvo_test::SlotCount<ThingDB>(), 8U);
  EXPECT_EQ(Slot(&ObjectDB::GetCondition), tuvo_test::kNotVirtual);
}

// --- Create -----------------------------------------------------------------------------------

TEST_F(ObjectDBTest, CreateInsertsTheValuesInOrderAndSetsTheId) {
  Thing thing("it's", "big");
  EXPECT_TRUE(store_->Create(thing));
  EXPECT_EQ(Seen(), "INSERT INTO thing VALUES (NULL,'it''s','big')");
  EXPECT_EQ(thing.get_id(), 1);
  Thing next("next", "");
  EXPECT_TRUE(store_->Create(next));
  EXPECT_EQ(next.get_id(), 2);
  EXPECT_EQ(Stored(), "1|it's|big 2|next| ");
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, CreateIgnoresTheIdThatTheRecordHad) {
  Thing thing("a", "");
  thing.set_id(500);
  EXPECT_TRUE(store_->Create(thing));
  EXPECT_EQ(thing.get_id(), 1);
}

TEST_F(ObjectDBTest, CreateOfAnIllegalRecordRunsNothingAndKeepsTheId) {
  Thing thing("", "big");
  thing.set_id(500);
  EXPECT_FALSE(store_->Create(thing));
  EXPECT_EQ(Seen(), nothing_);
  EXPECT_EQ(thing.get_id(), 500);
  EXPECT_EQ(TakeWritten(listener_), Lines{LineOf(kCreate, "obj invalid")});
}

TEST_F(ObjectDBTest, AFailedInsertIsLoggedAndKeepsTheId) {
  Thing thing("a", "");
  ASSERT_TRUE(store_->Create(thing));
  Thing same("a", "");
  same.set_id(500);
  EXPECT_FALSE(store_->Create(same));
  EXPECT_EQ(same.get_id(), 500);
  EXPECT_EQ(TakeWritten(listener_), Lines{LineOf(kCreate, "insert failed")});
  EXPECT_EQ(db_.GetLastError(), "UNIQUE constraint failed: thing.name");
}

// --- Update -----------------------------------------------------------------------------------

TEST_F(ObjectDBTest, UpdateWritesEveryColumnOfTheRowWithTheId) {
  Fill();
  Thing thing("it's", "new");
  thing.set_id(2);
  EXPECT_TRUE(store_->Update(thing));
  EXPECT_EQ(Seen(), "UPDATE thing SET name='it''s',size='new' WHERE id=2");
  EXPECT_EQ(Stored(), "1|a|1 2|it's|new 3|c|1 4||1 5|e|2 ");
}

TEST_F(ObjectDBTest, UpdateOfAnIllegalRecordRunsNothing) {
  Fill();
  Seen();
  Thing thing("", "new");
  thing.set_id(2);
  EXPECT_FALSE(store_->Update(thing));
  EXPECT_EQ(Seen(), nothing_);
  EXPECT_EQ(TakeWritten(listener_), Lines{LineOf(kUpdate, "obj invalid")});
}

TEST_F(ObjectDBTest, AFailedUpdateIsLogged) {
  Fill();
  Thing thing("a", "taken by row 1");
  thing.set_id(2);
  EXPECT_FALSE(store_->Update(thing));
  EXPECT_EQ(TakeWritten(listener_), Lines{LineOf(kUpdate, "update failed")});
}

TEST_F(ObjectDBTest, UpdateOfNoRowSucceeds) {
  Thing thing("a", "b");
  thing.set_id(99);
  EXPECT_TRUE(store_->Update(thing));
  EXPECT_EQ(Stored(), "");
}

// --- Delete -----------------------------------------------------------------------------------

TEST_F(ObjectDBTest, DeleteRemovesTheRow) {
  Fill();
  EXPECT_TRUE(store_->Delete(2));
  EXPECT_EQ(Seen(), "DELETE FROM thing WHERE id=2");
  EXPECT_EQ(Stored(), "1|a|1 3|c|1 4||1 5|e|2 ");
}

TEST_F(ObjectDBTest, DeleteOfNoRowSucceeds) {
  EXPECT_TRUE(store_->Delete(99));
  EXPECT_TRUE(store_->Delete(-1));
  EXPECT_EQ(Seen(), "DELETE FROM thing WHERE id=-1");
}

TEST_F(ObjectDBTest, DeleteByRecordUsesItsIdLegalOrNot) {
  Fill();
  Thing thing;
  thing.set_id(3);
  EXPECT_TRUE(store_->Delete(thing));
  EXPECT_EQ(Seen(), "DELETE FROM thing WHERE id=3");
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, AFailedDeleteIsLogged) {
  ASSERT_TRUE(db_.Execute("DROP TABLE thing"));
  EXPECT_FALSE(store_->Delete(1));
  EXPECT_FALSE(store_->Delete(Thing()));
  EXPECT_EQ(TakeWritten(listener_), Lines(2, LineOf(kDelete, "delete failed")));
}

TEST_F(ObjectDBTest, DeleteByRecordReachesAStoresOwnDeleteById) {
  Fill();
  KeepingDB store(db_);
  Thing thing;
  thing.set_id(3);
  ObjectDB& base = store;
  EXPECT_TRUE(base.Delete(thing));
  EXPECT_EQ(store.asked, std::vector<int>{3});
}

// --- GetById ----------------------------------------------------------------------------------

TEST_F(ObjectDBTest, GetByIdLoadsTheRow) {
  Fill();
  Thing thing;
  EXPECT_TRUE(store_->GetById(2, thing));
  EXPECT_EQ(Seen(), "SELECT * FROM thing WHERE id = 2");
  EXPECT_EQ(thing.get_id(), 2);
  EXPECT_EQ(thing.name, "b");
  EXPECT_EQ(thing.size, "2");
}

TEST_F(ObjectDBTest, GetByIdOfNoRowFailsInSilenceAndLeavesTheRecord) {
  Thing thing("kept", "kept");
  thing.set_id(500);
  EXPECT_FALSE(store_->GetById(99, thing));
  EXPECT_EQ(thing.get_id(), 500);
  EXPECT_EQ(thing.name, "kept");
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, GetByIdOfARowThatLoadsAsIllegalFailsAndFillsTheRecord) {
  Fill();
  Thing thing("before", "before");
  EXPECT_FALSE(store_->GetById(4, thing));
  EXPECT_EQ(thing.get_id(), 4);
  EXPECT_EQ(thing.name, "");
  EXPECT_EQ(thing.size, "1");
}

TEST_F(ObjectDBTest, AFailedGetByIdLogsNothingAndLeavesTheRecord) {
  ASSERT_TRUE(db_.Execute("DROP TABLE thing"));
  Thing thing("kept", "kept");
  EXPECT_FALSE(store_->GetById(1, thing));
  EXPECT_EQ(thing.name, "kept");
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, OnlyCountAndQueryUseTheConditionUp) {
  Fill();
  store_->GetCondition().Where("size", "2");
  Thing thing;
  EXPECT_TRUE(store_->GetById(1, thing)) << "the condition does not narrow it";
  EXPECT_EQ(Seen(), "SELECT * FROM thing WHERE id = 1");
  EXPECT_TRUE(store_->Update(thing));
  Thing created("new", "");
  EXPECT_TRUE(store_->Create(created));
  EXPECT_TRUE(store_->Delete(created.get_id()));
  EXPECT_EQ(store_->GetCondition().GetSQL(), " WHERE `size` = '2'");
}

// --- Count ------------------------------------------------------------------------------------

TEST_F(ObjectDBTest, CountWithoutAConditionNamesTheTableAlone) {
  Fill();
  int count = 0;
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM thing");
  EXPECT_EQ(count, 5) << "illegal rows are counted";
}

TEST_F(ObjectDBTest, CountOfNothingIsZero) {
  int count = 77;
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(count, 0);
}

TEST_F(ObjectDBTest, CountUsesTheConditionOnce) {
  Fill();
  int count = 0;
  store_->GetCondition().Where("size", "2");
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM thing WHERE `size` = '2'");
  EXPECT_EQ(count, 2);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  EXPECT_TRUE(store_->Count(count));
  EXPECT_EQ(count, 5);
}

TEST_F(ObjectDBTest, AFailedCountLeavesTheNumberLogsNothingAndClearsTheCondition) {
  int count = 77;
  store_->GetCondition().Where("nonsense (");
  EXPECT_FALSE(store_->Count(count));
  EXPECT_EQ(count, 77);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

// An offset behind the one row of the count leaves no row at all.
TEST_F(ObjectDBTest, ACountWithoutARowFailsAndClearsTheCondition) {
  int count = 77;
  store_->GetCondition().Limit(1, 1);
  EXPECT_FALSE(store_->Count(count));
  EXPECT_EQ(Seen(), "SELECT COUNT(*) AS c FROM thing LIMIT 1 OFFSET 1");
  EXPECT_EQ(count, 77);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
}

// --- Query ------------------------------------------------------------------------------------

TEST_F(ObjectDBTest, QueryReplacesTheVectorByTheLegalRows) {
  Fill();
  std::vector<Thing> things(3, Thing("old", ""));
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(Seen(), "SELECT * FROM thing");
  EXPECT_EQ(Names(things), (Lines{"1a", "2b", "3c", "5e"}));
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, QueryUsesTheConditionOnce) {
  Fill();
  std::vector<Thing> things;
  store_->GetCondition().Where("size", "1");
  store_->GetCondition().OrderBy("id", false);
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(Seen(), "SELECT * FROM thing WHERE `size` = '1' ORDER BY id DESC");
  EXPECT_EQ(Names(things), (Lines{"3c", "1a"}));
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(things.size(), 4U);
}

TEST_F(ObjectDBTest, QueryThatFindsNothingSucceedsAndEmptiesTheVector) {
  Fill();
  std::vector<Thing> things(3, Thing("old", ""));
  store_->GetCondition().Where("size", "none");
  EXPECT_TRUE(store_->Query(things));
  EXPECT_TRUE(things.empty());
}

TEST_F(ObjectDBTest, AFailedQueryLeavesTheVectorLogsNothingAndClearsTheCondition) {
  std::vector<Thing> things(3, Thing("old", ""));
  store_->GetCondition().Where("nonsense (");
  EXPECT_FALSE(store_->Query(things));
  EXPECT_EQ(things.size(), 3U);
  EXPECT_TRUE(store_->GetCondition().IsEmpty());
  EXPECT_EQ(TakeLines(listener_), Lines{});
}

TEST_F(ObjectDBTest, AnInvalidRowRangeFailsAndIsCleared) {
  Fill();
  std::vector<Thing> things(3, Thing("old", ""));
  store_->GetCondition().Limit(2, -1);
  EXPECT_FALSE(store_->Query(things));
  EXPECT_EQ(things.size(), 3U);
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(things.size(), 4U);
}

TEST_F(ObjectDBTest, PagesOfAQueryFollowOneAnother) {
  Fill();
  std::vector<Thing> things;
  store_->GetCondition().OrderBy("id", true);
  store_->GetCondition().Page(1, 2);
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(Names(things), (Lines{"1a", "2b"}));
  store_->GetCondition().OrderBy("id", true);
  store_->GetCondition().Page(2, 2);
  EXPECT_TRUE(store_->Query(things));
  EXPECT_EQ(Names(things), Lines{"3c"}) << "the illegal row takes its place on the page";
}

// Groups digits, as a program with a local taste might.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
};

TEST_F(ObjectDBTest, TheProgramsLocaleHasNoSay) {
  const std::locale former = std::locale::global(std::locale(std::locale::classic(), new Grouping));
  Thing thing;
  EXPECT_FALSE(store_->GetById(1234567, thing));
  EXPECT_EQ(Seen(), "SELECT * FROM thing WHERE id = 1234567");
  EXPECT_TRUE(store_->Delete(INT_MAX));
  EXPECT_EQ(Seen(), "DELETE FROM thing WHERE id=2147483647");
  ASSERT_TRUE(db_.Execute("INSERT INTO thing VALUES (1234567,'a','b')"));
  EXPECT_TRUE(store_->GetById(1234567, thing));
  EXPECT_EQ(thing.get_id(), 1234567);
  std::locale::global(former);
}

}  // namespace
