// tuvosharing purge
#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>

#include <ctime>
#include <iostream>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "cli/progress.h"
#include "owner/transaction.h"

namespace cli {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;

// Visitors wait while a piece is deleted, and not for longer.
constexpr int kPiece = 500;

struct Counts {
  long long links = 0;
  long long sessions = 0;
  long long tokens = 0;
};

// Which links the library's own purge by owner and project would take.
std::string EndedLinks(BaseDB& db, const PurgeOptions& options, std::time_t now) {
  Condition condition(db);
  if (!options.owner.empty()) {
    condition.Where(TUVO::sharing::SZK_OWNER_UID, std::to_string(OwnerUidOf(options.owner)));
  }
  if (!options.project.empty()) {
    condition.Where(TUVO::sharing::SZK_PROJECT_NAME, options.project);
  }
  condition.Where("((expire_at != 0 AND expire_at < " + std::to_string(now) +
                  ") OR (expire_times != 0 AND use_count >= expire_times))");
  return "FROM entry" + condition.GetSQL();
}

std::string TimedOut(const char* table, std::time_t now) {
  return std::string("FROM ") + table + " WHERE timeout < " + std::to_string(now);
}

long long CountOf(BaseDB& db, const std::string& rows) {
  return Number(db, "SELECT count(*) AS value " + rows);
}

Counts CountAll(BaseDB& db, const PurgeOptions& options, std::time_t now) {
  Counts counts;
  counts.links = CountOf(db, EndedLinks(db, options, now));
  if (options.all_kinds) {
    counts.sessions = CountOf(db, TimedOut("session", now));
    counts.tokens = CountOf(db, TimedOut("token", now));
  }
  return counts;
}

// Deletes at most kPiece rows; how many goes to `*deleted`.
owner::MaybeProblem DeletePiece(BaseDB& db, const std::string& table, const std::string& rows,
                                long long* deleted) {
  return owner::InTransaction(db, [&](EntryDB& /*links*/) -> owner::MaybeProblem {
    if (!db.Execute("DELETE FROM " + table + " WHERE id IN (SELECT id " + rows + " LIMIT " +
                    std::to_string(kPiece) + ")")) {
      return owner::InternalFault();
    }
    *deleted = Number(db, "SELECT changes() AS value");
    return std::nullopt;
  });
}

long long DeleteAll(BaseDB& db, const std::string& table, const std::string& rows,
                    Progress* progress, long long* done) {
  long long all = 0;
  for (long long deleted = kPiece; deleted == kPiece;) {
    StopIfInterrupted();
    Require(DeletePiece(db, table, rows, &deleted));
    all += deleted;
    *done += deleted;
    progress->Show(*done);
  }
  return all;
}

// Tokens first: the sessions' deletion would take them along uncounted.
Counts DeleteExpired(BaseDB& db, const PurgeOptions& options, std::time_t now) {
  const Counts expected = CountAll(db, options, now);
  Progress progress("removed", expected.links + expected.sessions + expected.tokens);
  Counts counts;
  long long done = 0;
  if (options.all_kinds) {
    counts.tokens = DeleteAll(db, "token", TimedOut("token", now), &progress, &done);
    counts.sessions = DeleteAll(db, "session", TimedOut("session", now), &progress, &done);
  }
  counts.links = DeleteAll(db, "entry", EndedLinks(db, options, now), &progress, &done);
  return counts;
}

void Print(const Counts& counts, const PurgeOptions& options) {
  if (options.json) {
    Json::Value json;
    json["links"] = static_cast<Json::Int64>(counts.links);
    json["sessions"] = static_cast<Json::Int64>(counts.sessions);
    json["tokens"] = static_cast<Json::Int64>(counts.tokens);
    json["dry_run"] = options.dry_run;
    PrintJson(json);
    return;
  }
  std::cout << (options.dry_run ? "would remove " : "removed ") << counts.links << " links";
  if (options.all_kinds) {
    std::cout << ", " << counts.sessions << " sessions, " << counts.tokens << " tokens";
  }
  std::cout << '\n';
}

}  // namespace

ExitStatus Purge(const PurgeOptions& options) {
  BaseDB& db = Database();
  const std::time_t now = std::time(nullptr);
  if (options.dry_run) {
    Print(CountAll(db, options, now), options);
    return ExitStatus::kDone;
  }
  try {
    const Counts counts = DeleteExpired(db, options, now);
    LogChange("delete_expired", 0, std::nullopt);
    Print(counts, options);
  } catch (const std::exception&) {
    LogChange("delete_expired", 0, owner::InternalFault());
    throw;
  }
  return ExitStatus::kDone;
}

}  // namespace cli
