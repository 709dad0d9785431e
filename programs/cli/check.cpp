// tuvosharing check
#include <tuvoplatform/database.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>

#include <iostream>
#include <memory>

#include "cli/check_files.h"
#include "cli/check_rows.h"
#include "cli/commands.h"
#include "cli/display.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "owner/text_check.h"

namespace cli {

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;

constexpr int kNewestVersion = 2;

struct CloseDb {
  void operator()(TUVODB* db) const { TUVODBClose(db); }
};

class QueryFailure : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

// A connection of its own, which leaves the file as it is: the library's would make a missing file,
// and bring an old one up to date.
class Inspection {
 public:
  explicit Inspection(const std::string& path) : db_(TUVODBConnect("", "", "", path.c_str())) {}

  Result Run(const std::string& sql) const {
    DBResult_tag* rows = nullptr;
    if (TUVODBExecute(db_.get(), sql.c_str(), &rows) != 0) {
      throw QueryFailure(TUVODBErrorGet(db_.get()));
    }
    return Result(rows);
  }

  std::string Value(const std::string& sql, const std::string& column) const {
    Result result = Run(sql);
    Row row;
    return result.NextRow(row) ? row.GetField(column).AsString("") : "";
  }

 private:
  std::unique_ptr<TUVODB, CloseDb> db_;
};

struct Report {
  std::string schema_version;
  std::string journal_mode;
  Findings findings;
};

void CheckWhole(const Inspection& db, Report* report) {
  report->schema_version = db.Value("PRAGMA user_version", "user_version");
  report->journal_mode = db.Value("PRAGMA journal_mode", "journal_mode");
  if (std::to_string(kNewestVersion) != report->schema_version) {
    report->findings.push_back(
        {"schema", "",
         "has the version " + report->schema_version + ", not " + std::to_string(kNewestVersion)});
  }
  if (report->journal_mode != "wal") {
    report->findings.push_back({"journal", "", "is " + report->journal_mode + ", not wal"});
  }
  StopIfInterrupted();
  Result integrity = db.Run("PRAGMA integrity_check");
  for (Row row; integrity.NextRow(row);) {
    const std::string text = row.GetField("integrity_check").AsString("");
    if (text != "ok") {
      report->findings.push_back({"integrity", "", text});
    }
  }
  StopIfInterrupted();
  Result keys = db.Run("PRAGMA foreign_key_check");
  for (Row row; keys.NextRow(row);) {
    report->findings.push_back(
        {"foreign_key",
         row.GetField("table").AsString("") + " #" + row.GetField("rowid").AsString(""),
         "there is no such " + row.GetField("parent").AsString("")});
  }
}

Report Inspect(const std::string& path) {
  Report report;
  if (!CheckFiles(path, &report.findings)) {
    return report;
  }
  const Inspection db(path);
  try {
    CheckWhole(db, &report);
    CheckRows([&db](const std::string& sql) { return db.Run(sql); }, &report.findings);
  } catch (const QueryFailure& failure) {
    report.findings.push_back({"integrity", "", failure.what()});
  }
  return report;
}

void PrintAsJson(const Report& report) {
  Json::Value json;
  json["ok"] = report.findings.empty();
  json["schema_version"] = report.schema_version;
  json["journal_mode"] = report.journal_mode;
  json["findings"] = Json::Value(Json::arrayValue);
  for (const Finding& finding : report.findings) {
    Json::Value item;
    item["kind"] = finding.kind;
    item["subject"] = owner::RepairedUtf8(finding.subject);
    item["reason"] = owner::RepairedUtf8(finding.reason);
    json["findings"].append(item);
  }
  PrintJson(json);
}

void PrintForPeople(const Report& report) {
  for (const Finding& finding : report.findings) {
    std::cout << finding.kind << ": "
              << Harmless(finding.subject.empty() ? finding.reason
                                                  : finding.subject + ": " + finding.reason)
              << '\n';
  }
  if (report.findings.empty()) {
    std::cout << "all is well: schema version " << report.schema_version << ", journal mode "
              << report.journal_mode << '\n';
  }
}

}  // namespace

ExitStatus Check(const CheckOptions& options) {
  const Report report = Inspect(TUVO::sharing::SZF_SHARING_DB_PATH);
  if (options.json) {
    PrintAsJson(report);
  } else {
    PrintForPeople(report);
  }
  return report.findings.empty() ? ExitStatus::kDone : ExitStatus::kDamage;
}

}  // namespace cli
