// The filters of queries, and the look-ups by text: only the rows that are meant, whatever the
// texts hold. The rows never change, so a second opinion in memory knows what has to come.
//
// Input: commands, a line with a letter and then a line for each argument:
//   w COLUMN VALUE, o COLUMN VALUE   an equality, joined with AND or OR
//   r VALUE                          a raw clause made with Escape
//   s COLUMN DIRECTION               a sort key: number of a known column; "1" is ascending
//   l OFFSET LIMIT, p PAGE SIZE      the range
//   q                                counts, and with the same filter queries (so too at the end)
//   h TEXT, i TEXT                   the link of a hash, the session of an identifier
//   d UID PROJECT                    the purge of ended links (rolled back)
// A column is the program's own text and not a visitor's: a backquote in one would end it, and is
// left out here.
#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/session.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <charconv>
#include <climits>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "fixed_time.h"
#include "lines.h"
#include "links_database.h"
#include "target.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;

using Cell = std::variant<std::monostate, std::int64_t, std::string>;  // in SQLite's order of kinds

constexpr std::array<const char*, 11> kColumns = {
    "id",        "hash",         "project_name", "enabled", "owner_uid", "start_at",
    "expire_at", "expire_times", "use_count",    "auto_gc", "data"};
constexpr std::size_t kProject = 2;
constexpr std::size_t kOwner = 4;
constexpr std::size_t kEnd = 6;
constexpr std::size_t kLimit = 7;
constexpr std::size_t kUses = 8;

struct StoredRow {
  std::array<Cell, kColumns.size()> cells;
  bool legal = true;
};

bool IsTextColumn(std::size_t column) {
  return column == 1 || column == 2 || column == 10;
}

const char kData[] =
    R"({"app":{},"enable_match_ip":true,"private_data":{},"protect_type":"none","redirect_type":"none"})";

StoredRow Row(std::int64_t id, const std::string& hash, Cell project, Cell owner, Cell start,
              Cell end, Cell limit, Cell uses, bool legal = true) {
  StoredRow row;
  row.cells = {id,
               hash,
               std::move(project),
               std::int64_t{id % 2},
               std::move(owner),
               std::move(start),
               std::move(end),
               std::move(limit),
               std::move(uses),
               std::int64_t{id % 3 == 0 ? 1 : 0},
               std::string(kData)};
  row.legal = legal;
  return row;
}

const std::vector<StoredRow>& Rows() {
  using Int = std::int64_t;
  static const std::vector<StoredRow> rows = {
      Row(1, "abc", "web", Int{2001}, Int{0}, Int{0}, Int{0}, Int{0}),
      Row(2, "ABC", "web", Int{2002}, Int{0}, Int{0}, Int{0}, Int{0}),
      Row(3, "007", "file", Int{2001}, Int{7}, Int{1}, Int{3}, Int{3}),
      Row(4, "7", "it's", Int{2001}, Int{-7}, Int{1}, Int{3}, Int{2}),
      Row(5, "x' OR '1'='1", "it''s", Int{2003}, Int{100000}, Int{fuzz::kNow}, Int{1}, Int{2}),
      Row(6, " ", "%", Int{2003}, Int{0}, Int{fuzz::kNow + 1}, Int{-1}, Int{-1}),
      Row(7, "\xc3\xa4", "w_b", Int{4294967294}, Int{0}, Int{-1}, Int{0}, Int{9}),
      Row(8, "\xff\xfe", "a\\b", Int{0}, Int{0}, Int{0}, Int{2147483647}, Int{2147483647}),
      Row(9, "`", "\"", Int{1}, Int{1099511627776}, Int{0}, Int{0}, Int{0}),
      Row(10, "line\nfeed", "a;b--", Int{2001}, std::string("abc"), std::monostate(), Int{0},
          Int{0}),
      Row(11, "no-owner", "web", std::monostate(), Int{0}, Int{0}, Int{0}, Int{0}, false),
      Row(12, "no-project", std::monostate(), Int{2001}, Int{0}, Int{1}, Int{0}, Int{0}, false),
      Row(13, "empty-project", "", Int{2001}, Int{0}, Int{0}, Int{1}, Int{1}, false),
      Row(14, "NULL", "NULL", Int{2002}, std::monostate(), std::monostate(), std::monostate(),
          std::monostate())};
  return rows;
}

std::string CellLiteral(const Cell& cell) {
  if (const auto* number = std::get_if<std::int64_t>(&cell)) {
    return std::to_string(*number);
  }
  const auto* text = std::get_if<std::string>(&cell);
  return text == nullptr ? "NULL" : fuzz::Literal(*text);
}

const std::vector<std::string>& SessionIds() {
  static const std::vector<std::string> ids = {"abc", "ABC", "'",   "' OR '1'='1",
                                               "7",   "007", "\xff"};
  return ids;
}

bool Fill() {
  fuzz::Run("DELETE FROM entry");
  for (const StoredRow& row : Rows()) {
    std::string values;
    for (const Cell& cell : row.cells) {
      values += (values.empty() ? "" : ",") + CellLiteral(cell);
    }
    fuzz::Run("INSERT INTO entry VALUES (" + values + ")");
  }
  fuzz::Run("DELETE FROM session");
  for (const std::string& id : SessionIds()) {
    fuzz::Run("INSERT INTO session VALUES (NULL," + fuzz::Literal(id) + ",1,'::1'," +
              std::to_string(fuzz::kNow + 9) + ")");
  }
  return true;
}

// What the database sees of a text: a zero byte ends it.
std::string UpToZero(const std::string& text) {
  return text.c_str();
}

bool IsSpace(char c) {
  return c == ' ' || (c >= '\t' && c <= '\r');
}

// A text that SQLite takes for a number where a column holds numbers: an optional sign, digits with
// or without a point, an optional exponent; blanks around it.
std::optional<std::string> NumberIn(std::string text) {
  while (!text.empty() && IsSpace(text.back())) {
    text.pop_back();
  }
  while (!text.empty() && IsSpace(text.front())) {
    text.erase(0, 1);
  }
  std::size_t at = 0;
  const auto skip_sign = [&] {
    at += at < text.size() && (text[at] == '+' || text[at] == '-') ? 1U : 0U;
  };
  const auto skip_digits = [&] {
    const std::size_t begin = at;
    while (at < text.size() && text[at] >= '0' && text[at] <= '9') {
      ++at;
    }
    return at - begin;
  };
  skip_sign();
  std::size_t digits = skip_digits();
  if (at < text.size() && text[at] == '.') {
    ++at;
    digits += skip_digits();
  }
  if (digits != 0 && at < text.size() && (text[at] == 'e' || text[at] == 'E')) {
    ++at;
    skip_sign();
    if (skip_digits() == 0) {
      return std::nullopt;
    }
  }
  return digits != 0 && at == text.size() ? std::optional<std::string>(text) : std::nullopt;
}

// Whole numbers are compared as such, others as doubles; those in the rows are all exact as
// doubles.
bool EqualsNumber(std::int64_t number, const std::string& text) {
  const std::optional<std::string> digits = NumberIn(text);
  if (!digits) {
    return false;
  }
  const char* begin = digits->c_str() + (digits->front() == '+' ? 1 : 0);
  const char* end = digits->c_str() + digits->size();
  std::int64_t whole = 0;
  const auto [stop, error] = std::from_chars(begin, end, whole);
  if (error == std::errc() && stop == end) {
    return whole == number;
  }
  return std::strtod(digits->c_str(), nullptr) == static_cast<double>(number);
}

bool Equals(const StoredRow& row, std::size_t column, const std::string& value) {
  const Cell& cell = row.cells[column];
  if (const auto* number = std::get_if<std::int64_t>(&cell)) {
    return EqualsNumber(*number, value);
  }
  const auto* text = std::get_if<std::string>(&cell);
  return text != nullptr && *text == value && (IsTextColumn(column) || !NumberIn(value));
}

std::optional<std::size_t> ColumnNamed(std::string name) {
  for (char& c : name) {
    c = c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  }
  if (name == "rowid" || name == "_rowid_" || name == "oid") {
    return 0;
  }
  const auto* found = std::find(kColumns.begin(), kColumns.end(), name);
  return found == kColumns.end()
             ? std::nullopt
             : std::optional<std::size_t>(static_cast<std::size_t>(found - kColumns.begin()));
}

struct Clause {
  std::optional<std::size_t> column;  // nothing: there is no such column
  std::string value;
  bool is_and = true;
};

// What the condition has been told so far.
struct Filter {
  std::vector<Clause> clauses;
  std::vector<std::pair<std::size_t, bool>> keys;
  int offset = -1;
  int limit = -1;
};

// AND binds tighter than OR, as in SQL.
bool Admits(const Filter& filter, const StoredRow& row) {
  bool any = filter.clauses.empty();
  bool all = true;
  for (std::size_t i = 0; i < filter.clauses.size(); ++i) {
    const Clause& clause = filter.clauses[i];
    if (i != 0 && !clause.is_and) {
      any = any || all;
      all = true;
    }
    all = all && Equals(row, *clause.column, clause.value);
  }
  return any || (!filter.clauses.empty() && all);
}

bool IsBefore(const StoredRow& a, const StoredRow& b, const Filter& filter) {
  for (const auto& [column, ascending] : filter.keys) {
    if (a.cells[column] != b.cells[column]) {
      const bool less = a.cells[column] < b.cells[column];
      return less == ascending;
    }
  }
  return false;
}

std::vector<StoredRow> Matching(const Filter& filter) {
  std::vector<StoredRow> rows;
  std::copy_if(Rows().begin(), Rows().end(), std::back_inserter(rows),
               [&filter](const StoredRow& row) { return Admits(filter, row); });
  std::stable_sort(rows.begin(), rows.end(), [&filter](const StoredRow& a, const StoredRow& b) {
    return IsBefore(a, b, filter);
  });
  return rows;
}

std::string ExpectedIds(const Filter& filter) {
  std::vector<StoredRow> rows = Matching(filter);
  if (filter.limit > 0) {
    const auto offset = static_cast<std::size_t>(std::max(filter.offset, 0));
    rows.erase(rows.begin(),
               rows.begin() + static_cast<std::ptrdiff_t>(std::min(offset, rows.size())));
    rows.resize(std::min(rows.size(), static_cast<std::size_t>(filter.limit)));
  }
  std::string ids;
  for (const StoredRow& row : rows) {
    ids += row.legal ? std::to_string(std::get<std::int64_t>(row.cells[0])) + " " : "";
  }
  return ids;
}

bool HasUnknownColumn(const Filter& filter) {
  return std::any_of(filter.clauses.begin(), filter.clauses.end(),
                     [](const Clause& clause) { return !clause.column; });
}

class Player {
 public:
  explicit Player(fuzz::Lines lines) : lines_(lines), store_(fuzz::Links()) {}

  void Play() {
    // SQLite refuses conditions of too many clauses.
    constexpr int kMostCommands = 60;
    for (int count = 0; count < kMostCommands && !lines_.AtEnd(); ++count) {
      Take(lines_.Raw());
    }
    Query();
    RequireEqual(fuzz::ChangesSoFar(), Changes(), "reading changes nothing");
  }

 private:
  // As it was when the last change of the target's own was done.
  static std::string& Changes() {
    static std::string changes = fuzz::ChangesSoFar();
    return changes;
  }

  void Take(std::string_view command) {
    if (command == "w" || command == "o") {
      Equality(command == "w");
    } else if (command == "r") {
      Raw();
    } else if (command == "s") {
      Sort();
    } else if (command == "l" || command == "p") {
      Range(command == "l");
    } else if (command == "q") {
      Query();
    } else if (command == "h") {
      FindLink(lines_.Text());
    } else if (command == "i") {
      FindSession(lines_.Text());
    } else if (command == "d") {
      Purge();
    }
  }

  void Equality(bool is_and) {
    std::string column = lines_.Text();
    const std::string value = lines_.Text();
    column.erase(std::remove(column.begin(), column.end(), '`'), column.end());
    Condition& condition = store_.GetCondition();
    is_and ? condition.Where(column, value) : condition.OrWhere(column, value);
    if (!column.empty()) {
      filter_.clauses.push_back({ColumnNamed(UpToZero(column)), UpToZero(value), is_and});
    }
  }

  void Raw() {
    const std::string value = lines_.Text();
    store_.GetCondition().Where("(project_name = '" + fuzz::Links().Escape(value) + "')");
    filter_.clauses.push_back({kProject, UpToZero(value), true});
  }

  void Sort() {
    const std::size_t column = lines_.Choice(kColumns.size());
    const bool ascending = lines_.Flag();
    store_.GetCondition().OrderBy(kColumns.at(column), ascending);
    filter_.keys.emplace_back(column, ascending);
  }

  void Range(bool is_limit) {
    const int first = static_cast<int>(lines_.Number());
    const int second = static_cast<int>(lines_.Number());
    if (is_limit) {
      store_.GetCondition().Limit(first, second);
      filter_.offset = first;
    } else {
      store_.GetCondition().Page(first, second);
      filter_.offset = static_cast<int>((static_cast<unsigned int>(first) - 1U) *
                                        static_cast<unsigned int>(second));
    }
    filter_.limit = second;
  }

  // In the order of the ids where nothing else is asked, so that there is one right answer.
  void SortAtLast() {
    store_.GetCondition().OrderBy("id", true);
    filter_.keys.emplace_back(0, true);
  }

  void Query() {
    SortAtLast();
    const std::string sql = store_.GetCondition().GetSQL();
    const bool fails = HasUnknownColumn(filter_) || (filter_.offset > 0 && filter_.limit <= 0);
    int count = -1;
    const bool counted = store_.Count(count);
    Require(store_.GetCondition().IsEmpty(), "a filter serves once");
    // The one row of a count is skipped as well.
    Require(counted == (!fails && filter_.offset <= 0), "a count fails when its statement does");
    if (counted) {
      RequireEqual(std::to_string(count), std::to_string(Matching(filter_).size()), sql.c_str());
    }
    std::vector<Entry> found;
    const bool queried = QueryAgain(&found);
    Require(queried == !fails, "a query fails when its statement does");
    if (queried) {
      std::string ids;
      for (const Entry& entry : found) {
        ids += std::to_string(entry.get_id()) + " ";
      }
      RequireEqual(ids, ExpectedIds(filter_), sql.c_str());
    }
    filter_ = Filter();
  }

  // The count has cleared the condition: filled anew from what is known of it, which has to give
  // the same rows.
  bool QueryAgain(std::vector<Entry>* found) {
    Condition& condition = store_.GetCondition();
    for (const Clause& clause : filter_.clauses) {
      const std::string column = clause.column ? kColumns.at(*clause.column) : "no such column";
      clause.is_and ? condition.Where(column, clause.value)
                    : condition.OrWhere(column, clause.value);
    }
    for (const auto& [column, ascending] : filter_.keys) {
      condition.OrderBy(kColumns.at(column), ascending);
    }
    condition.Limit(filter_.offset, filter_.limit);
    return store_.Query(*found);
  }

  void FindLink(const std::string& hash) {
    Entry entry;
    const bool found = store_.GetByHash(hash, entry);
    int expected = 0;
    bool legal = false;
    for (const StoredRow& row : Rows()) {
      if (std::get<std::string>(row.cells[1]) == UpToZero(hash)) {
        expected = static_cast<int>(std::get<std::int64_t>(row.cells[0]));
        legal = row.legal;
      }
    }
    Require(found == legal, "a link is found by its hash");
    Require(entry.get_id() == expected, "the link of that hash and no other");
  }

  void FindSession(const std::string& id) {
    SessionDB sessions(fuzz::Links());
    Session session;
    const bool found = sessions.GetBySessionId(id, session);
    const std::string text = UpToZero(id);
    const bool expected =
        std::find(SessionIds().begin(), SessionIds().end(), text) != SessionIds().end();
    Require(found == expected, "a session is found by its identifier");
    RequireEqual(session.get_session_id(), expected ? text : "", "the session of that identifier");
  }

  static bool IsEnded(const StoredRow& row) {
    const auto number = [&row](std::size_t column) {
      const auto* value = std::get_if<std::int64_t>(&row.cells[column]);
      return value == nullptr ? 0 : *value;
    };
    return (number(kEnd) != 0 && number(kEnd) < fuzz::kNow) ||
           (number(kLimit) != 0 && number(kUses) >= number(kLimit));
  }

  void Purge() {
    constexpr unsigned int kAnyOwner = UINT_MAX;
    const auto uid = static_cast<unsigned int>(lines_.Number());
    const std::string project = lines_.Text();
    const std::string meant = UpToZero(project);
    std::string left;
    for (const StoredRow& row : Rows()) {
      const bool owned = uid == kAnyOwner || row.cells[kOwner] == Cell(std::int64_t{uid});
      const bool in_project = project.empty() || row.cells[kProject] == Cell(meant);
      if (!owned || !in_project || !IsEnded(row)) {
        left += std::to_string(std::get<std::int64_t>(row.cells[0])) + "\n";
      }
    }
    RequireEqual(fuzz::ChangesSoFar(), Changes(), "reading changes nothing");
    Require(fuzz::Links().Begin(), "a transaction begins");
    Require(store_.PurgeExpiredByOwnerProject(uid, project), "a purge succeeds");
    RequireEqual(fuzz::Column("SELECT id AS c FROM entry ORDER BY id"), left,
                 "the links that a purge leaves");
    fuzz::Run("ROLLBACK");
    Changes() = fuzz::ChangesSoFar();
  }

  fuzz::Lines lines_;
  EntryDB store_;
  Filter filter_;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  static const bool filled = Fill();
  Player(fuzz::Lines(data, size)).Play();
  return filled ? 0 : 1;
}
