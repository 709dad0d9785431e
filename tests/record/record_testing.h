// What the records' tests share: real rows, the log lines of failed checks, the clock and the zone.
#ifndef TESTS_RECORD_RECORD_TESTING_H_
#define TESTS_RECORD_RECORD_TESTING_H_

#include <gtest/gtest.h>
#include <sys/types.h>
#include <syslog.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>
#include <unistd.h>

#include <json/json.h>
#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <fstream>
#include <memory>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace tuvo_test {

// The first row of a statement on a file; the row lives as long as this object.
class FetchedRow {
 public:
  FetchedRow(TUVO::sharing::db::BaseDB& db, const std::string& sql) {
    if (!db.Execute(sql, result_) || !result_.NextRow(row_)) {
      throw std::runtime_error("no row: " + sql + ": " + db.GetLastError());
    }
  }
  FetchedRow(const FetchedRow&) = delete;
  FetchedRow& operator=(const FetchedRow&) = delete;

  operator const TUVO::sharing::db::Row&() const { return row_; }

 private:
  TUVO::sharing::db::Result result_;
  TUVO::sharing::db::Row row_;
};

// A file without tables, for rows made up on the spot.
inline TUVO::sharing::db::BaseDB& ScratchDB() {
  static TUVO::sharing::db::BaseDB db("/tmp/scratch.db", 0600);
  return db;
}

// The row of SELECT <columns>, for example "5 AS id, NULL AS hash".
class SelectedRow : public FetchedRow {
 public:
  explicit SelectedRow(const std::string& columns) : FetchedRow(ScratchDB(), "SELECT " + columns) {}
};

inline std::string Quoted(const std::string& text) {
  return "'" + ScratchDB().Escape(text) + "'";
}

// What the check of `condition` in record/<source>.cpp logs when it fails in process `pid`.
inline std::string FailedLine(const std::string& source, const std::string& condition, int error,
                              pid_t pid) {
  const int line =
      SourceLine("record/" + source + ".cpp", "SHARING_RETURN_FALSE_IF(" + condition + ");");
  return source + ":" + std::to_string(line) + " (" + std::to_string(pid) + ") Failed [" +
         condition + "], err=" + std::strerror(error) + "\n\n";
}

// Expects that since the last look exactly these conditions were logged, in this order, as the
// record `source` logs them in this process, or in `pid`.
inline void ExpectFailed(SyslogListener& log, const std::string& source,
                         const std::vector<std::string>& conditions, int error = 0,
                         pid_t pid = getpid()) {
  const std::vector<LogLine> lines = log.Take();
  ASSERT_EQ(lines.size(), conditions.size());
  for (size_t i = 0; i < lines.size(); ++i) {
    EXPECT_EQ(lines[i].facility, LOG_USER);
    EXPECT_EQ(lines[i].priority, LOG_ERR);
    EXPECT_EQ(lines[i].text, FailedLine(source, conditions[i], error, pid));
  }
}

// Calls body(now) until the whole call has happened within the second `now`, and returns its last
// result.
template <typename Body>
auto WithinOneSecond(const Body& body) {
  for (;;) {
    const std::time_t now = std::time(nullptr);
    auto result = body(now);
    if (std::time(nullptr) == now) {
      return result;
    }
  }
}

// The time zone for a scope.
class ScopedZone {
 public:
  explicit ScopedZone(const char* zone) {
    setenv("TZ", zone, 1);
    tzset();
  }
  ~ScopedZone() {
    unsetenv("TZ");
    tzset();
  }
  ScopedZone(const ScopedZone&) = delete;
  ScopedZone& operator=(const ScopedZone&) = delete;
};

// One more line at the end of a file, for a scope.
class ScopedLine {
 public:
  ScopedLine(std::string path, const std::string& line) : path_(std::move(path)) {
    std::ifstream in(path_);
    before_.assign(std::istreambuf_iterator<char>(in), {});
    std::ofstream(path_, std::ios::app) << line << '\n';
  }
  ~ScopedLine() { std::ofstream(path_, std::ios::trunc) << before_; }
  ScopedLine(const ScopedLine&) = delete;
  ScopedLine& operator=(const ScopedLine&) = delete;

 private:
  std::string path_;
  std::string before_;
};

inline Json::Value ParseJson(const std::string& text) {
  Json::Value value;
  std::string errors;
  const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
  if (!reader->parse(text.data(), text.data() + text.size(), &value, &errors)) {
    throw std::runtime_error("no JSON: " + errors + ": " + text);
  }
  return value;
}

// The document that a link stores in its "data" column.
inline Json::Value DataOf(const TUVO::sharing::record::Entry& entry) {
  return ParseJson(entry.GetFieldMap().at("data"));
}

// Everything that a link holds, except whether its last password could be hashed.
inline std::vector<std::string> Contents(const TUVO::sharing::record::Entry& entry) {
  std::vector<std::string> contents = entry.GetFieldList();
  contents.push_back(std::to_string(entry.get_id()));
  return contents;
}

// A link that may be stored and used.
inline TUVO::sharing::record::Entry LegalEntry() {
  TUVO::sharing::record::Entry entry;
  entry.set_hash("aB3xY7k9Q").set_project_name("photos").set_owner_uid(2001);
  entry.set_app(Json::Value(Json::objectValue));
  return entry;
}

// A legal link with every field different from its default.
inline TUVO::sharing::record::Entry FullEntry() {
  using TUVO::sharing::record::Entry;
  Entry entry = LegalEntry();
  entry.set_id(17).set_enabled(false).set_start_at(1600000000).set_expire_at(1700000000);
  entry.set_expire_times(9).set_use_count(4).set_auto_gc(false).set_enable_match_ip(false);
  entry.set_protect_type(Entry::PROTECT_PASSWORD).set_protect_title("A title, and a long one");
  entry.set_protect_password("drawn for its salt", true, Entry::ENCRYPT_ALGO_DEFAULT);
  entry.set_protect_password("5ebe2294ecd0e0f08eab7690d2a6ee69", false, Entry::ENCRYPT_ALGO_MD5);
  entry.set_protect_users({"alice", "nobody-yet", "bob"});
  entry.set_protect_groups({"friends", "no-such-group"});
  entry.set_redirect_type(Entry::REDIRECT_ALWAYS).set_redirect_uri("https://example.com/a/page");
  entry.set_app(ParseJson(R"({"path":["/exports/photos",1,2.5,null,true]})"));
  entry.set_private_data(ParseJson(R"({"key":{"inner":"secret"}})"));
  return entry;
}

}  // namespace tuvo_test

#endif  // TESTS_RECORD_RECORD_TESTING_H_
