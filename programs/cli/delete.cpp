// tuvosharing delete
#include <tuvosharing/entry.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/row.h>

#include <functional>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/display.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_name.h"
#include "cli/output.h"
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
  for (const owner::LinkName& name : names) {
    Entry link;
    Require(owner::FindLink(Database(), name, std::nullopt, &link), TextOf(name));
    links.push_back(link);
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
    throw Failure(ExitStatus::kFailed, "nothing was deleted");
  }
}

// Calls `remove` for each row number.
ExitStatus DeleteEach(const std::vector<int>& ids,
                      const std::function<owner::MaybeProblem(int id)>& remove) {
  ExitStatus status = ExitStatus::kDone;
  for (const int id : ids) {
    StopIfInterrupted();
    const owner::MaybeProblem problem = remove(id);
    LogChange("delete", id, problem);
    if (problem) {
      const Failure failure = FailureOf(*problem, TextOf({id, {}}));
      Complain(failure.what());
      status = status == ExitStatus::kDone ? failure.status() : status;
    }
  }
  return status;
}

owner::MaybeProblem DeleteLinkById(int id) {
  Entry link;
  return owner::DeleteLink(Database(), {id, {}}, std::nullopt, &link);
}

ExitStatus DeleteLinks(const DeleteOptions& options) {
  const std::vector<Entry> links = FindAll(LinkNamesOf(options.links.texts, options.links.ids));
  if (!options.yes) {
    AskFirst(QuestionAbout(links));
  }
  std::vector<int> ids;
  for (const Entry& link : links) {
    ids.push_back(link.get_id());
  }
  return DeleteEach(ids, DeleteLinkById);
}

// A row that loads as a link is none of these, whatever number was typed.
owner::MaybeProblem DeleteDamagedRow(int id) {
  return owner::InTransaction(Database(), [id](EntryDB& links) -> owner::MaybeProblem {
    Result result;
    Row row;
    if (!Database().Execute("SELECT * FROM entry WHERE id = " + std::to_string(id), result)) {
      return owner::InternalFault();
    }
    if (!result.NextRow(row)) {
      return owner::Fault(owner::Error::kNoSuchLink, "there is no such row");
    }
    if (Entry().FromRow(row)) {
      return owner::Fault(owner::Error::kConflict, "is not damaged");
    }
    return links.Delete(id) ? std::nullopt : owner::InternalFault();
  });
}

ExitStatus DeleteDamaged(const DeleteOptions& options) {
  std::vector<int> ids;
  for (const owner::LinkName& name : LinkNamesOf(options.links.texts, options.links.ids)) {
    if (name.id == 0) {
      throw Failure(ExitStatus::kUsage, "--damaged: rows are named by their numbers, as #ID");
    }
    ids.push_back(name.id);
  }
  if (!options.yes) {
    AskFirst("Delete " + std::to_string(ids.size()) + " damaged rows?");
  }
  return DeleteEach(ids, DeleteDamagedRow);
}

}  // namespace

ExitStatus Delete(const DeleteOptions& options) {
  return options.damaged ? DeleteDamaged(options) : DeleteLinks(options);
}

}  // namespace cli
