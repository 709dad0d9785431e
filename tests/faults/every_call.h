// What the tests about calls that fail have in common.
#ifndef TESTS_FAULTS_EVERY_CALL_H_
#define TESTS_FAULTS_EVERY_CALL_H_

#include <sqlite3.h>
#include <tuvosharing/sharing_db.h>

#include <functional>
#include <set>
#include <stdexcept>
#include <string>

#include "faults/fault_points.h"
#include "faults/sweep.h"
#include "login/visit.h"

namespace tuvo_test {

constexpr unsigned int kCalls = kFiles | kMemory;

// A second connection, which looks at what is left behind.
class Observer {
 public:
  Observer() {
    if (sqlite3_open(kDatabase, &handle_) != SQLITE_OK) {
      throw std::runtime_error("cannot observe");
    }
    Number("PRAGMA user_version");
  }
  ~Observer() { sqlite3_close(handle_); }
  Observer(const Observer&) = delete;
  Observer& operator=(const Observer&) = delete;

  long Number(const std::string& sql) { return std::stol(Text(sql)); }

  // The first column of the first row; "none" without one, the error's text on an error.
  std::string Text(const std::string& sql) {
    sqlite3_stmt* statement = nullptr;
    std::string text = "none";
    if (sqlite3_prepare_v2(handle_, sql.c_str(), -1, &statement, nullptr) != SQLITE_OK) {
      return sqlite3_errmsg(handle_);
    }
    const int code = sqlite3_step(statement);
    if (code == SQLITE_ROW) {
      const auto* column = reinterpret_cast<const char*>(sqlite3_column_text(statement, 0));
      text = column != nullptr ? column : "NULL";
    } else if (code != SQLITE_DONE) {
      text = sqlite3_errmsg(handle_);
    }
    sqlite3_finalize(statement);
    return text;
  }

  // Nobody holds the file: neither to write it nor to read it as it was.
  void ExpectNothingHeld() {
    EXPECT_EQ("none", Text("BEGIN IMMEDIATE"));
    EXPECT_EQ("none", Text("ROLLBACK"));
    EXPECT_EQ("0", Text("PRAGMA wal_checkpoint(TRUNCATE)"));
  }

  void ExpectWhole() {
    EXPECT_EQ("ok", Text("PRAGMA integrity_check"));
    EXPECT_EQ("none", Text("PRAGMA foreign_key_check"));
  }

 private:
  sqlite3* handle_ = nullptr;
};

class EveryCall : public VisitTest {
 protected:
  // Runs `body` in a process of its own that has used the library before, as one that serves many
  // requests has.
  static void InLongProcess(const Visit& visit, const std::function<void()>& body) {
    InChild([&] {
      visit.EnterEnvironment();
      ASSERT_TRUE(TUVO::sharing::db::SharingDB::Instance().IsGood());
      body();
    });
  }

  static int LogIn(const Visit& visit, std::string& session_id) {
    _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingLogin(session_id, &params, false);
  }

  static int Check(const Visit& visit) {
    const _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingIsAuthorized(&params);
  }

  // An operation that changes nothing when it fails, and says so.
  static void SweepRefused(const std::string& name, const Visit& visit,
                           const std::function<int()>& operation, const std::set<int>& answers) {
    InLongProcess(visit, [&] {
      Observer observer;
      Sweep(name, kCalls, operation, [&](const Step& step) {
        EXPECT_EQ(1U, answers.count(step.answer));
        observer.ExpectNothingHeld();
      });
      observer.ExpectWhole();
    });
  }
};

}  // namespace tuvo_test

#endif  // TESTS_FAULTS_EVERY_CALL_H_
