// The log beside a database is begun anew in the moment between a checkpoint's look at its end and
// its look at how much of it was copied.
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <tuvoplatform/database.h>

#include <functional>
#include <string>
#include <utility>

#include "platform/database_handles.h"
#include "platform/temp_folder.h"

namespace {

using tuvo_test::Connect;
using tuvo_test::Db;
using tuvo_test::Execute;
using tuvo_test::Query;
using tuvo_test::Rows;
using tuvo_test::TempFolder;

constexpr char kPragmas[] = "PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL";
constexpr char kRead[] = "SELECT COUNT(*) AS n FROM t";
constexpr char kWrite[] = "INSERT INTO t VALUES (1)";
constexpr char kLongWrite[] = "INSERT INTO t VALUES (randomblob(100000))";
constexpr char kFoldBack[] = "PRAGMA wal_checkpoint;";

// SQLite gives mapped pages back when it has found another end of the log than it knew, which is
// the moment. What is to happen in it; it does so once.
std::function<void()> meanwhile;
const sqlite3_io_methods* methods;

int Unfetch(sqlite3_file* file, sqlite3_int64 offset, void* page) {
  if (page == nullptr && meanwhile != nullptr) {
    std::exchange(meanwhile, nullptr)();
  }
  return methods->xUnfetch(file, offset, page);
}

class LogRestart : public testing::Test {
 protected:
  LogRestart() {
    for (const Db* db : {&checkpointer_, &writer_}) {
      Execute(*db, kPragmas);
    }
    Execute(writer_, "CREATE TABLE t (a)");
    // Opens the log, which a checkpoint alone does not.
    EXPECT_EQ("0", Count(checkpointer_));
  }
  ~LogRestart() override { meanwhile = nullptr; }

  static std::string Count(const Db& db) {
    const Rows rows = Query(db, kRead);
    return rows == nullptr ? "none" : TUVODBFetchField(rows.get(), 0, "n");
  }

  // Has `what` happen within the next checkpoint, behind its look at the log's end.
  void InTheMoment(const std::function<void()>& what) {
    sqlite3_file* file = nullptr;
    ASSERT_EQ(SQLITE_OK,
              sqlite3_file_control(checkpointer_->sqlite, "main", SQLITE_FCNTL_FILE_POINTER,
                                   static_cast<void*>(&file)));
    ASSERT_LE(3, file->pMethods->iVersion);
    methods = file->pMethods;
    own_ = *methods;
    own_.xUnfetch = Unfetch;
    file->pMethods = &own_;
    meanwhile = what;
  }

  // A log that was folded back as a whole, which the next write begins anew.
  void WriteAndFoldBack() {
    ASSERT_EQ(0, Execute(writer_, kLongWrite));
    ASSERT_EQ(0, Execute(writer_, kFoldBack));
  }

  TempFolder folder_;
  const std::string path_ = folder_ / "test.db";
  sqlite3_io_methods own_{};
  Db checkpointer_ = Connect(path_);
  Db writer_ = Connect(path_);
};

TEST_F(LogRestart, WithinACheckpointLosesNothing) {
  WriteAndFoldBack();
  int written = 1;
  InTheMoment([&] { written += Execute(writer_, kWrite) == 0 ? 1 : 0; });
  EXPECT_EQ(0, Execute(checkpointer_, kFoldBack));
  EXPECT_EQ(nullptr, meanwhile) << "the moment did not come";
  EXPECT_EQ(2, written);
  ASSERT_EQ(0, Execute(writer_, kWrite));
  // The last one to close folds back what has not been copied, and takes the log away.
  checkpointer_ = nullptr;
  writer_ = nullptr;
  const Db db = Connect(path_);
  EXPECT_EQ("3", Count(db));
  const Rows check = Query(db, "PRAGMA integrity_check");
  ASSERT_NE(nullptr, check);
  EXPECT_STREQ("ok", TUVODBFetchField(check.get(), 0, "integrity_check"));
}

TEST_F(LogRestart, WithinACheckpointLeavesTheNextOneItsWork) {
  WriteAndFoldBack();
  InTheMoment([&] { EXPECT_EQ(0, Execute(writer_, kWrite)); });
  EXPECT_EQ(0, Execute(checkpointer_, kFoldBack));
  const Rows done = Query(checkpointer_, kFoldBack);
  ASSERT_NE(nullptr, done);
  EXPECT_STREQ("0", TUVODBFetchField(done.get(), 0, "busy"));
  EXPECT_STREQ(TUVODBFetchField(done.get(), 0, "log"),
               TUVODBFetchField(done.get(), 0, "checkpointed"));
}

// A write that only makes the log longer is no reason to give up.
TEST_F(LogRestart, IsNoneWhenTheLogHasGrown) {
  ASSERT_EQ(0, Execute(writer_, kLongWrite));
  InTheMoment([&] { EXPECT_EQ(0, Execute(writer_, kWrite)); });
  const Rows done = Query(checkpointer_, kFoldBack);
  EXPECT_EQ(nullptr, meanwhile) << "the moment did not come";
  ASSERT_NE(nullptr, done);
  EXPECT_GT(std::stoi(TUVODBFetchField(done.get(), 0, "checkpointed")), 20);
}

}  // namespace
