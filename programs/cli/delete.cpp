// tuvosharing delete
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/row.h>

#include <functional>
#include <set>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/damage.h"
#include "cli/database.h"
#include "cli/display.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_name.h"
#include "cli/link_row.h"
#include "cli/output.h"
#include "cli/row_id.h"
#include "cli/terminal.h"
#include "owner/link_store.h"
#include "owner/transaction.h"

namespace cli {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::record::Entry;

// The links as they are now, by their row numbers: a hash may come to be another link's.
std::vector<Entry> FindAll(const std::vector<owner::LinkName>& names) {
  std::vector<Entry> links;
  std::set<int> known;  // one may be named by its hash and by its number
  for (const owner::LinkName& name : names) {
    Entry link;
    const owner::MaybeProblem problem = owner::FindLink(Database(), name, std::nullopt, &link);
    if (problem) {
      LogChange("delete", 0, problem);
      throw FailureOf(*problem, TextOf(name));
    }
    if (known.insert(link.get_id()).second) {
      links.push_back(link);
    }
  }
  return links;
}

std::string QuestionAbout(const std::vector<Entry>& links) {
  if (links.size() > 1) {
    return "Delete these " + std::to_string(links.size()) + " links?";
  }
  const Entry& link = links.front();
  return "Delete the link " + Harmless(link.get_hash()) + " (#" + std::to_string(link.get_id()) +
         ", project " + Harmless(link.get_project_name()) + ")?";
}

void AskFirst(const std::string& question) {
  if (!CanAsk()) {
    throw Failure(ExitStatus::kUsage, "delete: there is nobody to ask; --yes deletes unasked");
  }
  const bool confirmed = Confirm(question);
  StopIfInterrupted();
  if (!confirmed) {
    throw Declined("nothing was deleted");
  }
}

// Calls `remove` for each row number.
ExitStatus DeleteEach(const std::vector<RowId>& ids,
                      const std::function<owner::MaybeProblem(RowId id)>& remove) {
  ExitStatus status = ExitStatus::kDone;
  for (const RowId id : ids) {
    StopIfInterrupted();
    const owner::MaybeProblem problem = remove(id);
    LogChange("delete", IsUsualId(id) ? static_cast<int>(id) : 0, problem);
    if (problem) {
      StopIfInterrupted();  // which the waiting for a lock may have outlived
      const Failure failure = FailureOf(*problem, "#" + std::to_string(id));
      Complain(failure.what());
      status = status == ExitStatus::kDone ? failure.status() : status;
    }
  }
  return status;
}

owner::MaybeProblem DeleteLinkById(RowId id) {
  Entry link;
  return owner::DeleteLink(Database(), {static_cast<int>(id), {}}, std::nullopt, &link);
}

ExitStatus DeleteLinks(const DeleteOptions& options) {
  const std::vector<Entry> links = FindAll(LinkNamesOf(options.links.texts, options.links.ids));
  if (!options.yes) {
    AskFirst(QuestionAbout(links));
  }
  std::vector<RowId> ids;
  ids.reserve(links.size());
  for (const Entry& link : links) {
    ids.push_back(link.get_id());
  }
  return DeleteEach(ids, DeleteLinkById);
}

// A row that loads as a link is none of these, whatever number was typed.
owner::MaybeProblem DeleteDamagedRow(RowId id) {
  const std::string from_row = " FROM entry WHERE id = " + std::to_string(id);
  return owner::InTransaction(Database(), [&](EntryDB& /*links*/) -> owner::MaybeProblem {
    StopIfInterrupted();
    Result result;
    Row row;
    if (!Database().Execute("SELECT " + LinkRowSelection() + from_row, result)) {
      return owner::InternalFault();
    }
    if (!result.NextRow(row)) {
      return owner::Fault(owner::Error::kNoSuchLink, "there is no such row");
    }
    if (IsUsualId(id) && !DamageOf(row)) {
      return owner::Fault(owner::Error::kConflict, "is not damaged");
    }
    return Database().Execute("DELETE" + from_row) ? std::nullopt : owner::InternalFault();
  });
}

ExitStatus DeleteDamaged(const DeleteOptions& options) {
  const std::vector<RowId> ids = RowIdsOf(options.links.texts, options.links.ids);
  if (!options.yes) {
    AskFirst("Delete " + std::to_string(ids.size()) + " damaged rows?");
  }
  return DeleteEach(ids, DeleteDamagedRow);
}

}  // namespace

ExitStatus Delete(const DeleteOptions& options) {
  return LogRefusal("delete", [&options] {
    return options.damaged ? DeleteDamaged(options) : DeleteLinks(options);
  });
}

}  // namespace cli
