#include "visitor/former_session.h"

#include <syslog.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>

#include <string>
#include <utility>

#include "common/client_address.h"

namespace visitor {

namespace {

using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Session;

constexpr unsigned int kNobody = 4294967295U;

// Whoever has stolen a cookie must not go on with it elsewhere: to a link that binds visitors to
// their addresses the new session would come from the right one.
bool IsOfThisAddress(const Session& session) {
  const std::string address = common::ClientAddress();
  return !address.empty() && session.get_ip() == address;
}

// One statement: a token that is deleted meanwhile, by an owner who signs everybody out, does not
// come back. The link that was just opened has a token of the new session already.
bool MoveTokens(SharingDB& db, const Session& from, const Session& to) {
  const std::string target = std::to_string(to.get_id());
  return db.Execute(
      "UPDATE token SET session_id = " + target +
      " WHERE session_id = " + std::to_string(from.get_id()) +
      " AND entry_id NOT IN (SELECT entry_id FROM token WHERE session_id = " + target + ")");
}

bool MoveAccount(SessionDB& sessions, const Session& from, Session* to) {
  if (to->get_uid() != kNobody || from.get_uid() == kNobody) {
    return true;
  }
  to->set_uid(from.get_uid());
  return sessions.Update(*to);
}

// Taken back unless it was committed, also when memory runs out: left open it would lock everybody
// out.
class Transaction {
 public:
  explicit Transaction(SharingDB& db) : db_(db), open_(db.Execute("BEGIN IMMEDIATE")) {}
  ~Transaction() {
    if (open_) {
      db_.Execute("ROLLBACK");
    }
  }
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;

  bool IsOpen() const { return open_; }
  bool Commit() { return std::exchange(open_, false) && db_.Commit(); }

 private:
  SharingDB& db_;
  bool open_;
};

bool Move(SharingDB& db, SessionDB& sessions, const Session& from, Session* to) {
  Transaction transaction(db);
  return transaction.IsOpen() && MoveTokens(db, from, *to) && MoveAccount(sessions, from, to) &&
         sessions.Delete(from) && transaction.Commit();
}

}  // namespace

void TakeOver(const std::string& former_id, const std::string& session_id) {
  SharingDB& db = SharingDB::Instance();
  SessionDB sessions(db);  // ends, and checkpoints, behind the transaction
  Session former;
  Session session;
  if (!sessions.GetBySessionId(former_id, former) || !IsOfThisAddress(former) ||
      !sessions.GetBySessionId(session_id, session)) {
    return;
  }
  if (!Move(db, sessions, former, &session)) {
    syslog(LOG_ERR, "former_session:%d session %d was not taken over", __LINE__, former.get_id());
  }
}

}  // namespace visitor
