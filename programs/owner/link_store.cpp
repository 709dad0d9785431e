#include "owner/link_store.h"

#include <tuvosharing/condition.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/result.h>
#include <tuvosharing/row.h>
#include <tuvosharing/token_db.h>

#include <ctime>

#include "owner/database_log.h"
#include "owner/link_state.h"
#include "owner/transaction.h"

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;

MaybeProblem NoSuchLink() {
  return Fault(Error::kNoSuchLink, "there is no such link");
}

// Read here and not by the store's look-ups, which answer the same for a statement that failed and
// for a link that is not there.
MaybeProblem Load(BaseDB& db, const std::string& clause, Entry* link) {
  *link = Entry();
  Result result;
  Row row;
  if (!db.Execute("SELECT * FROM entry WHERE " + clause, result)) {
    return InternalFault();
  }
  if (result.NextRow(row) && link->FromRow(row)) {
    return std::nullopt;
  }
  return NoSuchLink();
}

MaybeProblem Find(BaseDB& db, const LinkName& name, Scope scope, Entry* link) {
  const std::string clause =
      name.id != 0 ? "id = " + std::to_string(name.id) : "hash = '" + db.Escape(name.hash) + "'";
  if (MaybeProblem problem = Load(db, clause, link)) {
    return problem;
  }
  if (scope && link->get_owner_uid() != *scope) {
    *link = Entry();
    return NoSuchLink();
  }
  return std::nullopt;
}

// Whether another link than `id` has the hash; rows that do not load as a link count.
MaybeProblem CheckHashFree(BaseDB& db, const std::string& hash, int id) {
  Result result;
  Row row;
  if (!db.Execute("SELECT id FROM entry WHERE hash = '" + db.Escape(hash) +
                      "' AND id != " + std::to_string(id),
                  result)) {
    return InternalFault();
  }
  return result.NextRow(row) ? Fault(Error::kHashTaken, "is taken by another link", "hash")
                             : std::nullopt;
}

// Whether nobody who is in has proved what the link asks for now. A password is asked for at the
// login alone; accounts are looked at again at every visit, so that a change of those needs no
// more.
bool AsksAnew(const Entry& before, const Entry& after) {
  return after.get_protect_type() == Entry::PROTECT_PASSWORD &&
         (before.get_protect_type() != Entry::PROTECT_PASSWORD ||
          before.get_protect_password() != after.get_protect_password() ||
          before.get_protect_password_salt() != after.get_protect_password_salt());
}

MaybeProblem Purge(BaseDB& db, Scope scope, const std::string& project, int* deleted) {
  Condition ended(db);
  ended.Where(EndedClause(std::time(nullptr)));
  if (scope) {
    ended.Where(TUVO::sharing::SZK_OWNER_UID, std::to_string(*scope));
  }
  if (!project.empty()) {
    ended.Where(TUVO::sharing::SZK_PROJECT_NAME, project);
  }
  Result result;
  Row row;
  if (!db.Execute("DELETE FROM entry" + ended.GetSQL()) ||
      !db.Execute("SELECT changes() AS c", result) || !result.NextRow(row)) {
    return InternalFault();
  }
  *deleted = row.GetField("c").AsInt(0);
  return std::nullopt;
}

}  // namespace

MaybeProblem CreateLink(BaseDB& db, Entry* link) {
  if (link->get_hash().empty()) {
    // Any failure would count as a hash that is taken; without the lock, each of the attempts would
    // wait for it.
    return InTransaction(
        db,
        [link](EntryDB& links) {
          return links.CreateWithHash(*link) ? std::nullopt : InternalFault();
        },
        Locking::kFirst);
  }
  return InTransaction(db, [&db, link](EntryDB& links) {
    if (MaybeProblem problem = CheckHashFree(db, link->get_hash(), 0)) {
      return problem;
    }
    return links.Create(*link) ? std::nullopt : InternalFault();
  });
}

MaybeProblem FindLink(BaseDB& db, const LinkName& name, Scope scope, Entry* link) {
  MaybeProblem problem = Find(db, name, scope, link);
  if (problem && problem->error == Error::kInternal) {
    LogDatabaseFault(db.GetLastError());
  }
  return problem;
}

MaybeProblem ChangeLink(BaseDB& db, const LinkName& name, Scope scope,
                        const std::function<MaybeProblem(Entry*)>& change, Entry* link) {
  TokenDB tokens(db);  // ends, and checkpoints, behind the transaction
  return InTransaction(db, [&](EntryDB& links) {
    MaybeProblem problem = Find(db, name, scope, link);
    if (problem) {
      return problem;
    }
    const Entry before = *link;
    problem = change(link);
    if (!problem && link->get_hash() != before.get_hash()) {
      problem = CheckHashFree(db, link->get_hash(), link->get_id());
    }
    if (!problem &&
        (!links.Update(*link) || (AsksAnew(before, *link) && !tokens.PurgeByEntry(*link)))) {
      problem = InternalFault();
    }
    return problem;
  });
}

MaybeProblem DeleteLink(BaseDB& db, const LinkName& name, Scope scope, Entry* link) {
  return InTransaction(db, [&](EntryDB& links) {
    if (MaybeProblem problem = Find(db, name, scope, link)) {
      return problem;
    }
    return links.Delete(*link) ? std::nullopt : InternalFault();
  });
}

MaybeProblem DeleteExpiredLinks(BaseDB& db, Scope scope, const std::string& project, int* deleted) {
  return InTransaction(db, [&](EntryDB& /*links*/) { return Purge(db, scope, project, deleted); });
}

// The very deletion, taken back: only that counts exactly what it would delete.
MaybeProblem CountExpiredLinks(BaseDB& db, Scope scope, const std::string& project, int* count) {
  bool counted = false;
  const MaybeProblem problem = InTransaction(
      db,
      [&](EntryDB& /*links*/) {
        MaybeProblem fault = Purge(db, scope, project, count);
        counted = !fault;
        return fault ? fault : Fault(Error::kConflict, "only counted");
      },
      Locking::kFirst);
  return counted ? std::nullopt : problem;
}

}  // namespace owner
