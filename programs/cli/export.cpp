// tuvosharing export
#include <tuvosharing/condition.h>
#include <tuvosharing/row.h>
#include <unistd.h>

#include <ctime>
#include <memory>

#include "cli/caller_file.h"
#include "cli/commands.h"
#include "cli/damage.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_file.h"
#include "cli/output.h"
#include "cli/progress.h"
#include "cli/row_id.h"
#include "cli/standard_output.h"
#include "owner/link_list.h"

namespace cli {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;

constexpr int kPiece = 500;

// What is read within is of one moment. No store may live in it: its end would checkpoint.
class ReadTransaction {
 public:
  explicit ReadTransaction(BaseDB& db) : db_(db) { Query(db_, "BEGIN"); }
  ~ReadTransaction() { db_.Execute("COMMIT"); }
  ReadTransaction(const ReadTransaction&) = delete;
  ReadTransaction& operator=(const ReadTransaction&) = delete;

 private:
  BaseDB& db_;
};

void Write(int fd, const std::string& text) {
  if (!WriteOutput(fd, text)) {
    throw SystemFailure("cannot write the links");
  }
}

struct Counts {
  long long links = 0;
  long long damaged = 0;
};

// The rows behind `last` as lines, whatever their numbers, which the file does not hold; `*last` is
// then the last row's. False behind the end.
bool NextLines(BaseDB& db, const owner::ListRequest& request, std::time_t now,
               std::optional<RowId>* last, std::string* lines, Counts* counts) {
  Condition condition(db);
  owner::AddFilters(db, request, now, &condition);
  condition.Where(BehindRow("id", *last));
  condition.OrderBy("id", true);
  condition.Limit(0, kPiece);
  Result result = Query(db, "SELECT " + LinkRowSelection() + " FROM entry" + condition.GetSQL());
  bool any = false;
  for (Row row; result.NextRow(row); any = true) {
    *last = RowIdOf(row);
    const std::optional<LinkRow> link = LinkRowOf(row);
    if (link && !DamageOf(row)) {
      *lines += LineOf(*link);
      ++counts->links;
    } else {
      ++counts->damaged;
    }
  }
  return any;
}

Counts WriteLinks(int fd, const owner::ListRequest& request) {
  BaseDB& db = Database();
  const std::time_t now = std::time(nullptr);
  const ReadTransaction transaction(db);
  Condition condition(db);
  owner::AddFilters(db, request, now, &condition);
  Progress progress("exported",
                    Number(db, "SELECT count(*) AS value FROM entry" + condition.GetSQL()));
  Write(fd, FirstLine());
  Counts counts;
  std::optional<RowId> last;
  for (bool more = true; more;) {
    StopIfInterrupted();
    std::string lines;
    more = NextLines(db, request, now, &last, &lines, &counts);
    Write(fd, lines);
    progress.Show(counts.links);
  }
  Write(fd, LastLine(counts.links));
  return counts;
}

Counts ExportToOutput(const ExportOptions& options, const owner::ListRequest& request) {
  if (options.file.empty() && isatty(STDOUT_FILENO) != 0) {
    throw Failure(ExitStatus::kUsage,
                  "export: holds passwords' digests and private data; name a file, or - to see it");
  }
  return WriteLinks(STDOUT_FILENO, request);
}

Counts ExportToFile(const ExportOptions& options, const owner::ListRequest& request) {
  NewFile file(options.file, options.force);
  const Counts counts = WriteLinks(file.fd(), request);
  file.Keep();
  return counts;
}

}  // namespace

ExitStatus Export(const ExportOptions& options) {
  const owner::ListRequest request = RequestOf(options.filter);
  const bool to_output = options.file.empty() || options.file == "-";
  const Counts counts =
      to_output ? ExportToOutput(options, request) : ExportToFile(options, request);
  if (counts.damaged == 0) {
    return ExitStatus::kDone;
  }
  Complain(std::to_string(counts.damaged) +
           " damaged rows were left out; tuvosharing check names them");
  return ExitStatus::kDamage;
}

}  // namespace cli
