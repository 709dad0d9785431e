// tuvosharing purge
#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>

#include <chrono>
#include <ctime>
#include <iostream>
#include <thread>
#include <vector>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "cli/progress.h"
#include "owner/link_state.h"
#include "owner/transaction.h"

namespace cli {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;

// Visitors wait while a piece is deleted, and not for longer.
constexpr int kPiece = 500;
// Whoever waits for the lock looks for it from time to time only: without a pause between the
// pieces most would find it taken until the end.
constexpr std::chrono::milliseconds kPause{10};

struct Counts {
  long long links = 0;
  long long sessions = 0;
  long long tokens = 0;
};

std::string EndedLinks(BaseDB& db, const PurgeOptions& options, std::time_t now) {
  Condition condition(db);
  if (!options.owner.empty()) {
    condition.Where(TUVO::sharing::SZK_OWNER_UID, std::to_string(OwnerUidOf(options.owner)));
  }
  if (!options.project.empty()) {
    condition.Where(TUVO::sharing::SZK_PROJECT_NAME, options.project);
  }
  condition.Where(owner::EndedClause(now));
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
  const auto work = [&](EntryDB& /*links*/) -> owner::MaybeProblem {
    StopIfInterrupted();
    if (!db.Execute("DELETE FROM " + table + " WHERE id IN (SELECT id " + rows + " LIMIT " +
                    std::to_string(kPiece) + ")")) {
      return owner::InternalFault();
    }
    *deleted = Number(db, "SELECT changes() AS value");
    return std::nullopt;
  };
  // The lock first: to begin with a write and try again would be to wait for it twice.
  return owner::InTransaction(db, work, owner::Locking::kFirst);
}

// What is to go, and how much of it has gone.
struct Removal {
  const char* table;
  std::string rows;
  long long* count;
};

// Counts as it goes: what has gone stays so when the rest fails.
owner::MaybeProblem DeleteAll(BaseDB& db, const std::vector<Removal>& removals,
                              Progress* progress) {
  long long done = 0;
  for (const Removal& removal : removals) {
    for (long long deleted = kPiece; deleted == kPiece;) {
      StopIfInterrupted();
      if (owner::MaybeProblem problem = DeletePiece(db, removal.table, removal.rows, &deleted)) {
        StopIfInterrupted();  // which the waiting for a lock may have outlived
        return problem;
      }
      *removal.count += deleted;
      done += deleted;
      progress->Show(done);
      if (deleted == kPiece) {
        std::this_thread::sleep_for(kPause);
      }
    }
  }
  return std::nullopt;
}

// Tokens first: the sessions' deletion would take them along uncounted.
owner::MaybeProblem DeleteExpired(BaseDB& db, const PurgeOptions& options, std::time_t now,
                                  Counts* counts) {
  std::vector<Removal> removals;
  if (options.all_kinds) {
    removals.push_back({"token", TimedOut("token", now), &counts->tokens});
    removals.push_back({"session", TimedOut("session", now), &counts->sessions});
  }
  removals.push_back({"entry", EndedLinks(db, options, now), &counts->links});
  const Counts expected = CountAll(db, options, now);
  Progress progress("removed", expected.links + expected.sessions + expected.tokens);
  return DeleteAll(db, removals, &progress);
}

// One line, however it ends. A purge that a signal ended has been one as far as it came; when
// nothing had gone yet there was no change.
void DeleteAndLog(BaseDB& db, const PurgeOptions& options, std::time_t now, Counts* counts) {
  owner::MaybeProblem problem;
  try {
    problem = DeleteExpired(db, options, now, counts);
  } catch (const Interruption&) {
    if (counts->links + counts->sessions + counts->tokens > 0) {
      LogChange("delete_expired", 0, std::nullopt);
    }
    throw;
  } catch (const std::exception&) {
    LogChange("delete_expired", 0, owner::InternalFault());
    throw;
  }
  LogChange("delete_expired", 0, problem);
  Require(problem);
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
  std::cout << (options.dry_run ? "would remove " : "removed ") << Counted(counts.links, "link");
  if (options.all_kinds) {
    std::cout << ", " << Counted(counts.sessions, "session") << ", "
              << Counted(counts.tokens, "token");
  }
  std::cout << '\n';
}

ExitStatus PurgeOrCount(const PurgeOptions& options) {
  BaseDB& db = Database();
  const std::time_t now = std::time(nullptr);
  (void)EndedLinks(db, options, now);  // an owner who is none is told before anything is done
  if (options.dry_run) {
    Print(CountAll(db, options, now), options);
    return ExitStatus::kDone;
  }
  Counts counts;
  DeleteAndLog(db, options, now, &counts);
  Print(counts, options);
  return ExitStatus::kDone;
}

}  // namespace

ExitStatus Purge(const PurgeOptions& options) {
  if (options.dry_run) {
    return PurgeOrCount(options);
  }
  return LogRefusal("delete_expired", [&options] { return PurgeOrCount(options); });
}

}  // namespace cli
