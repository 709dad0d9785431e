// tuvosharing import
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/row.h>
#include <unistd.h>

#include <iostream>
#include <map>

#include "cli/caller_file.h"
#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_file.h"
#include "cli/output.h"
#include "cli/progress.h"
#include "owner/transaction.h"

namespace cli {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;

enum class OnConflict { kFail, kSkip, kReplace };

OnConflict OnConflictOf(const std::string& text) {
  static const std::map<std::string, OnConflict> known = {
      {"fail", OnConflict::kFail}, {"skip", OnConflict::kSkip}, {"replace", OnConflict::kReplace}};
  const auto found = known.find(text);
  if (found == known.end()) {
    throw Failure(ExitStatus::kUsage, "--on-conflict: must be fail, skip or replace");
  }
  return found->second;
}

struct Counts {
  int imported = 0;
  int replaced = 0;
  int skipped = 0;
};

// Taking one link after the other into the database, within a transaction.
class Importer {
 public:
  Importer(BaseDB& db, OnConflict on_conflict) : db_(db), on_conflict_(on_conflict) {}

  owner::MaybeProblem Take(const LinkRow& row, std::size_t index) {
    int taken_by = 0;
    if (!FindHash(row, &taken_by)) {
      return owner::InternalFault();
    }
    if (taken_by != 0) {
      if (on_conflict_ == OnConflict::kSkip) {
        ++counts_.skipped;
        return std::nullopt;
      }
      if (on_conflict_ == OnConflict::kFail) {
        return owner::Fault(owner::Error::kHashTaken,
                            LineText(index) + ": the hash is taken; nothing was imported");
      }
      // Whoever was admitted to the former link is not admitted to this one.
      if (!db_.Delete("entry", taken_by)) {
        return owner::InternalFault();
      }
    }
    ++(taken_by != 0 ? counts_.replaced : counts_.imported);
    return Insert(row, index);
  }

  const Counts& Done() const { return counts_; }

 private:
  bool FindHash(const LinkRow& row, int* id) {
    Result result;
    Row found;
    if (!row.hash()) {
      return true;
    }
    if (!db_.Execute("SELECT id FROM entry WHERE hash = '" + db_.Escape(*row.hash()) + "'",
                     result)) {
      return false;
    }
    if (result.NextRow(found)) {
      *id = found.GetField("id").AsInt(0);
    }
    return true;
  }

  // What loads as a link is one.
  owner::MaybeProblem Insert(const LinkRow& row, std::size_t index) {
    int id = 0;
    Result result;
    Row stored;
    if (!db_.Execute(InsertStatement(db_, row)) || !db_.GetLastInsertId(id) ||
        !db_.Execute("SELECT * FROM entry WHERE id = " + std::to_string(id), result)) {
      return owner::InternalFault();
    }
    Entry link;
    if (!result.NextRow(stored) || !link.FromRow(stored)) {
      return owner::Fault(owner::Error::kBadValue,
                          LineText(index) + ": is no link; nothing was imported");
    }
    return std::nullopt;
  }

  BaseDB& db_;
  OnConflict on_conflict_;
  Counts counts_;
};

// A hash that stands twice in the file is no conflict with the database, but a fault of the file.
void CheckUnique(const std::vector<LinkRow>& rows) {
  std::map<std::string, std::size_t> lines;
  for (std::size_t i = 0; i < rows.size(); ++i) {
    const auto [place, is_new] = lines.emplace(rows[i].hash().value_or(""), i);
    if (!is_new) {
      throw Failure(ExitStatus::kUsage, LineText(i) + ": has the hash of " +
                                            LineText(place->second) + "; nothing was imported");
    }
  }
}

owner::MaybeProblem TakeAll(const std::vector<LinkRow>& rows, Importer* importer) {
  Progress progress("imported", static_cast<long long>(rows.size()));
  for (std::size_t i = 0; i < rows.size(); ++i) {
    StopIfInterrupted();
    if (owner::MaybeProblem problem = importer->Take(rows[i], i)) {
      return problem;
    }
    progress.Show(static_cast<long long>(i));
  }
  return std::nullopt;
}

// A rehearsal is taken back as a problem would be.
owner::MaybeProblem ImportAll(const std::vector<LinkRow>& rows, OnConflict on_conflict,
                              bool dry_run, Counts* counts) {
  BaseDB& db = Database();
  bool rehearsed = false;
  const auto work = [&](EntryDB& /*links*/) -> owner::MaybeProblem {
    Importer importer(db, on_conflict);
    owner::MaybeProblem fault = TakeAll(rows, &importer);
    *counts = importer.Done();
    rehearsed = dry_run && !fault;
    return rehearsed ? owner::Fault(owner::Error::kConflict, "a rehearsal") : fault;
  };
  // The write lock first: nobody changes what the conflicts are decided by.
  const owner::MaybeProblem problem = owner::InTransaction(db, work, owner::Locking::kFirst);
  if (problem && !rehearsed) {
    StopIfInterrupted();  // which the waiting for a lock may have outlived
  }
  return rehearsed ? std::nullopt : problem;
}

std::vector<LinkRow> RowsOf(const std::string& file) {
  if (file == "-") {
    return ReadLinkFile(STDIN_FILENO);
  }
  const common::UniqueFd fd = OpenCallersFile(file);
  return ReadLinkFile(fd.get());
}

void Print(const Counts& counts, const ImportOptions& options) {
  if (options.json) {
    Json::Value json;
    json["imported"] = counts.imported;
    json["replaced"] = counts.replaced;
    json["skipped"] = counts.skipped;
    json["dry_run"] = options.dry_run;
    PrintJson(json);
    return;
  }
  std::cout << (options.dry_run ? "would import " : "imported ") << Counted(counts.imported, "link")
            << ", replace" << (options.dry_run ? " " : "d ") << counts.replaced << ", skip"
            << (options.dry_run ? " " : "ped ") << counts.skipped << '\n';
}

ExitStatus ImportOrTry(const ImportOptions& options) {
  const OnConflict on_conflict = OnConflictOf(options.on_conflict);
  const std::vector<LinkRow> rows = RowsOf(options.file);
  CheckUnique(rows);
  Counts counts;
  const owner::MaybeProblem problem = ImportAll(rows, on_conflict, options.dry_run, &counts);
  if (!options.dry_run) {
    LogChange("import", 0, problem);
  }
  Require(problem);
  Print(counts, options);
  return ExitStatus::kDone;
}

}  // namespace

ExitStatus Import(const ImportOptions& options) {
  if (options.dry_run) {
    return ImportOrTry(options);
  }
  return LogRefusal("import", [&options] { return ImportOrTry(options); });
}

}  // namespace cli
