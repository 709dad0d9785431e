// Thirty-two programs at once log visitors in, check them, log them out, count, create, change,
// delete, purge and query, each opening the file anew every few requests. Whatever was acknowledged
// is there in the end, and nothing else; no call fails.
//
// The long form: TUVO_SECONDS=60; TUVO_SEED chooses other requests. TUVO_PAUSE_AFTER=100000
// (milliseconds) leaves out the pauses, in which the log goes away with the last process that has
// the file open.
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <map>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "concurrency/board.h"
#include "concurrency/crew.h"
#include "concurrency/tally.h"
#include "concurrency/visitors.h"
#include "concurrency/worker.h"
#include "db/sqlite_file.h"
#include "support/syslog_listener.h"

namespace tuvo_test {
namespace {

using Clock = std::chrono::steady_clock;
using std::chrono::milliseconds;
using TUVO::sharing::db::SharingDB;

constexpr long kUsualSeconds = 6;
constexpr long kUsualBetweenPauses = 1300;  // milliseconds
constexpr int kIndices = 9;

// What the log beside the file may grow to. A commit that leaves 8 MB in it has it begun anew; more
// than what is written until that succeeds is not added.
constexpr std::uintmax_t kLargestLog = std::uintmax_t{16} * 1024 * 1024;

std::string Lines(const std::vector<std::string>& lines) {
  std::string all;
  for (const std::string& line : lines) {
    all += line + "\n";
  }
  return all;
}

// What is acknowledged, in the form of the rows that are to be there.
using Rows = std::multiset<TextRow>;

Rows RowsOf(SqliteFile& file, const std::string& sql) {
  const std::vector<TextRow> rows = file.Rows(sql);
  return {rows.begin(), rows.end()};
}

// Empty when both are the same; else a few of the differences. Adds to `lost_rows` what is missing,
// or is there again.
std::string Difference(const Rows& wanted, const Rows& found, long* lost_rows) {
  std::vector<TextRow> lost;
  std::vector<TextRow> extra;
  std::set_difference(wanted.begin(), wanted.end(), found.begin(), found.end(),
                      std::back_inserter(lost));
  std::set_difference(found.begin(), found.end(), wanted.begin(), wanted.end(),
                      std::back_inserter(extra));
  *lost_rows += static_cast<long>(std::max(lost.size(), extra.size()));
  std::string text;
  for (const auto& [name, rows] : {std::pair("lost", lost), std::pair("extra", extra)}) {
    for (std::size_t i = 0; i < rows.size() && i < 5; ++i) {
      text += std::string(name) + " (" + std::to_string(rows.size()) + "):";
      for (const std::string& value : rows[i]) {
        text += " " + value;
      }
      text += "\n";
    }
  }
  return text;
}

class ManyProcesses : public testing::Test {
 protected:
  ManyProcesses() { ClearSharingFolder(); }

  // All workers' processes open a file that is not there yet.
  static void OpenTogether() {
    Gate gate;
    std::vector<pid_t> pids;
    for (int worker = 0; worker < kWorkers; ++worker) {
      pids.push_back(Start(IdsOf(worker), [&] {
        gate.Pass();
        return SharingDB::Instance().IsGood() ? 0 : 1;
      }));
    }
    gate.Open();
    EXPECT_EQ(0, WaitForAll(pids));
  }

  // The last process that closes the file takes the log away. Two last ones that close it in the
  // same instant each take the other for one who goes on: the log then stays for the next to open.
  static bool IsLogThere() {
    return std::filesystem::exists(std::string(kSharingFile) + "-wal") ||
           std::filesystem::exists(std::string(kSharingFile) + "-shm");
  }

  void StoreLinks() {
    for (int number = 0; number < kPublicLinks; ++number) {
      Put(board_->link[static_cast<std::size_t>(number)].hash, StoreLink([&](auto& link) {
            link.set_expire_times(number == kLimitedLink ? kLimit : 0);
          }));
    }
  }

  // Lets the workers work, with pauses, for so long.
  void Run(std::chrono::seconds duration) {
    std::vector<pid_t> workers;
    for (int number = 0; number < kWorkers; ++number) {
      workers.push_back(Start(kRoot, [&, number] {
        Work(*board_, number);
        return 0;
      }));
    }
    const milliseconds between(FromEnvironment("TUVO_PAUSE_AFTER", kUsualBetweenPauses));
    const Clock::time_point end = Clock::now() + duration;
    const auto goes_on = [&] {  // a slow machine takes longer to come behind the limit
      return Clock::now() < end || board_->link[kLimitedLink].uses < kLimit;
    };
    while (goes_on() && board_->complaints == 0) {
      const Clock::time_point next = Clock::now() + between;
      WatchLog(Clock::now() < end ? std::min(next, end) : next);
      Pause();
    }
    board_->stop = true;
    EXPECT_EQ(0, WaitForAll(workers));
    ExpectNewFile();
  }

  void WatchLog(Clock::time_point end) {
    while (Clock::now() < end) {
      struct stat st {};
      if (stat((std::string(kSharingFile) + "-wal").c_str(), &st) == 0) {
        largest_log_ = std::max(largest_log_, static_cast<std::uintmax_t>(st.st_size));
      }
      std::this_thread::sleep_for(milliseconds(2));
    }
  }

  // A moment in which no process has the file open. Then all open it at once, and find it of an
  // older version; another file as well, which is of an older version, or is not there.
  void Pause() {
    WaitFor([&] { return board_->new_file == 0 || board_->new_file_by == kWorkers; });
    board_->pause = true;
    WaitFor([&] { return board_->running == 0; });
    pauses_with_log_ += IsLogThere() ? 1 : 0;
    ++pauses_;
    ExpectNewFile();
    MakeNewFile();
    MakeOld(pauses_ % 3);
    board_->pause = false;
  }

  static void WaitFor(const std::function<bool()>& what) {
    const Clock::time_point end = Clock::now() + std::chrono::seconds(60);
    while (!what() && Clock::now() < end) {
      std::this_thread::sleep_for(milliseconds(1));
    }
    EXPECT_TRUE(what()) << "nothing for a minute";
  }

  // 0: leaves the file as it is. 1 and 2: takes it back to version 1 or 0, rows and all.
  static void MakeOld(int how) {
    if (how == 0) {
      return;
    }
    SqliteFile file(kSharingFile);
    for (const TextRow& index :
         file.Rows("SELECT name FROM sqlite_schema WHERE type = 'index' AND sql IS NOT NULL")) {
      file.Execute("DROP INDEX " + index[0]);
    }
    file.Execute(how == 1 ? "PRAGMA user_version = 1" : "PRAGMA user_version = 0");
  }

  void MakeNewFile() {
    const int number = board_->new_file + 1;
    if (number % 2 == 0) {
      SqliteFile old(NewFile(number));
      old.Execute(SchemaScript(1));
    }
    if (number % 2 == 0 && chown(NewFile(number).c_str(), 1, 1) != 0) {
      throw std::runtime_error("chown");
    }
    board_->new_file_by = 0;
    board_->new_file = number;
  }

  // Every worker that came to it has written one row.
  void ExpectNewFile() const {
    if (board_->new_file == 0 || board_->new_file_by == 0) {
      return;
    }
    SqliteFile file(NewFile(board_->new_file));
    ExpectWhole(file);
    EXPECT_EQ(std::to_string(board_->new_file_by), file.Value("SELECT COUNT(*) FROM session"));
  }

  static void ExpectWhole(SqliteFile& file) {
    EXPECT_EQ("ok", file.Value("PRAGMA integrity_check"));
    EXPECT_EQ(std::vector<TextRow>{}, file.Rows("PRAGMA foreign_key_check"));
    EXPECT_EQ("2", file.Value("PRAGMA user_version"));
    EXPECT_EQ("wal", file.Value("PRAGMA journal_mode"));
    EXPECT_EQ(std::to_string(kIndices),
              file.Value("SELECT COUNT(*) FROM sqlite_schema WHERE type = 'index' AND sql IS NOT "
                         "NULL"));
  }

  // Links by hash, id, title and uses, those apart that may be collected.
  void ExpectLinks(SqliteFile& file) {
    Rows wanted;
    for (const PublicLink& link : board_->link) {
      wanted.insert({link.hash.data(), Title(link.title), std::to_string(link.uses)});
    }
    for (const Worker& worker : board_->worker) {
      for (int i = 0; i < worker.own_links; ++i) {
        const OwnLink& link = worker.own_link[static_cast<std::size_t>(i)];
        if (link.there) {
          wanted.insert({link.hash.data(), Title(link.title), std::to_string(link.uses)});
        }
      }
    }
    const Rows found =
        RowsOf(file,
               "SELECT hash, json_extract(data, '$.protect_title'), use_count FROM entry "
               "WHERE auto_gc = 0");
    EXPECT_EQ("", Difference(wanted, found, &tally_.lost_rows));
    EXPECT_EQ(kLimit, board_->link[kLimitedLink].uses) << "what comes behind the limit was not met";
  }

  static std::string Title(int title) { return title == 0 ? "" : std::to_string(title); }

  void ExpectSessionsAndTokens(SqliteFile& file) {
    Rows sessions;
    Rows tokens;
    for (const Worker& worker : board_->worker) {
      for (int i = 0; i < worker.sessions; ++i) {
        const OwnSession& session = worker.session[static_cast<std::size_t>(i)];
        sessions.insert({session.id.data()});
        for (std::size_t link = 0; link < kPublicLinks; ++link) {
          if (session.admitted[link]) {
            tokens.insert({session.id.data(), board_->link[link].hash.data()});
          }
        }
      }
    }
    const Rows found_sessions =
        RowsOf(file, "SELECT session_id FROM session WHERE ip != '192.0.2.99'");
    EXPECT_EQ("", Difference(sessions, found_sessions, &tally_.lost_rows));
    const Rows found_tokens = RowsOf(file,
                                     "SELECT session.session_id, hash FROM token, session, entry "
                                     "WHERE session.id = token.session_id AND entry.id = entry_id");
    EXPECT_EQ("", Difference(tokens, found_tokens, &tally_.lost_rows));
    EXPECT_EQ(std::to_string(tokens.size()), file.Value("SELECT COUNT(*) FROM token"));
  }

  void ExpectNoComplaint() {
    std::vector<std::string> complaints;
    const auto count = static_cast<std::size_t>(board_->complaints);
    for (std::size_t i = 0; i < std::min(count, board_->complaint.size()); ++i) {
      complaints.emplace_back(board_->complaint[i].data());
    }
    EXPECT_EQ("", Lines(complaints));
    EXPECT_EQ("", Lines(syslog_.TakeTexts()));
  }

  void Tell() const {
    int processes = 0;
    for (const Worker& worker : board_->worker) {
      processes += worker.served;
    }
    std::printf("%d processes, %d pauses (%d with a log), largest -wal %ju bytes\n", processes,
                pauses_, pauses_with_log_, largest_log_);
    for (int kind = 0; kind < kKinds; ++kind) {
      tuvo_test::Tell(NameOf(static_cast<Kind>(kind)),
                      board_->figure[static_cast<std::size_t>(kind)]);
    }
  }

  // Also when an exception has ended the test.
  void TearDown() override {
    for (int kind = kLogin; kind < kClosing; ++kind) {
      tally_.requests += board_->figure[static_cast<std::size_t>(kind)].calls;
    }
    tally_.failures = board_->complaints;
    tally_.over_admissions = std::max(0, board_->link[kLimitedLink].uses - kLimit);
    tuvo_test::Tell(tally_);
  }

  SyslogListener syslog_;
  Tally tally_{};
  Shared<Board> board_;
  std::uintmax_t largest_log_ = 0;
  int pauses_ = 0;
  int pauses_with_log_ = 0;
};

TEST_F(ManyProcesses, LoseNothingAndNeverFail) {
  OpenTogether();
  StoreLinks();
  Run(std::chrono::seconds(FromEnvironment("TUVO_SECONDS", kUsualSeconds)));
  Tell();
  ExpectNoComplaint();
  EXPECT_LT(largest_log_, kLargestLog);
  EXPECT_EQ(0, Wait(Start(kSystem, [] { return SharingDB::Instance().IsGood() ? 0 : 1; })));
  EXPECT_FALSE(IsLogThere());
  SqliteFile file(kSharingFile);
  ExpectWhole(file);
  ExpectLinks(file);
  ExpectSessionsAndTokens(file);
}

}  // namespace
}  // namespace tuvo_test
