#include "owner/visitors.h"

#include <tuvosharing/condition.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/token_db.h>
#include <tuvosharing/user_group.h>

#include "owner/transaction.h"

namespace owner {

namespace {

using TUVO::sharing::db::BaseDB;
using TUVO::sharing::db::Condition;
using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;

void OfLink(const Entry& link, std::time_t now, Condition* condition) {
  condition->Where(TUVO::sharing::SZK_ENTRY_ID, std::to_string(link.get_id()));
  condition->Where("timeout >= " + std::to_string(now));
}

// A session carries the account that it proved last, at whatever link: at one that asks for no
// account, its owner has no business to know it.
Visitor VisitorOf(const Entry& link, const Session& session, const Token& token) {
  Visitor visitor;
  visitor.ip = session.get_ip();
  visitor.expires_at = token.get_timeout();
  std::string name;
  if (link.get_protect_type() == Entry::PROTECT_USER &&
      TUVO::sharing::UIDToUser(session.get_uid(), name)) {
    visitor.user = name;
  }
  return visitor;
}

}  // namespace

MaybeProblem ListVisitors(BaseDB& db, const Entry& link, int most, std::time_t now,
                          std::vector<Visitor>* visitors, int* total) {
  const TokenDB tokens(db);
  OfLink(link, now, &tokens.GetCondition());
  if (!tokens.Count(*total)) {
    return InternalFault();
  }
  OfLink(link, now, &tokens.GetCondition());
  tokens.GetCondition().OrderBy(TUVO::sharing::SZK_TIMEOUT, false);
  tokens.GetCondition().Limit(0, most);
  std::vector<Token> found;
  if (!tokens.Query(found)) {
    return InternalFault();
  }
  const SessionDB sessions(db);
  for (const Token& token : found) {
    Session session;
    if (sessions.GetById(token.get_session_id(), session)) {
      visitors->push_back(VisitorOf(link, session, token));
    }
  }
  return std::nullopt;
}

MaybeProblem SignOutVisitors(BaseDB& db, const LinkName& name, Scope scope, std::time_t now,
                             Entry* link, int* count) {
  TokenDB tokens(db);  // ends, and checkpoints, behind the transaction
  return InTransaction(db, [&](EntryDB& /*links*/) {
    if (MaybeProblem problem = FindLink(db, name, scope, link)) {
      return problem;
    }
    OfLink(*link, now, &tokens.GetCondition());
    return tokens.Count(*count) && tokens.PurgeByEntry(*link) ? std::nullopt : InternalFault();
  });
}

}  // namespace owner
