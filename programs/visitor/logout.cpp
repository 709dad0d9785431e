#include "visitor/logout.h"

#include <tuvosharing/entry_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <string>

#include "visitor/events.h"
#include "visitor/page_answers.h"

namespace visitor {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;
using TUVO::sharing::record::Session;
using TUVO::sharing::record::Token;

// Whether there is a token that admits the session to the link. The library's answer to a logout
// does not tell a token that was never there from one that could not be deleted.
bool HasToken(const Request& request) {
  SharingDB& db = SharingDB::Instance();
  Session session;
  Entry entry;
  Token token;
  SessionDB(db).GetBySessionId(request.session_id, session);
  EntryDB(db).GetByHash(request.route.hash, entry);
  if (session.get_id() == 0 || entry.get_id() == 0) {
    return false;
  }
  TokenDB(db).GetBySessionEntry(session, entry, token);
  return token.get_id() != 0;
}

// Asked first, so that a second logout does not fill the log with errors.
Notice EndAccess(const Request& request) {
  if (request.session_id.empty()) {
    return Notice::kLoggedOut;
  }
  if (!SharingDB::Instance().IsGood()) {
    return Notice::kLogoutFailed;
  }
  if (!HasToken(request)) {
    return Notice::kLoggedOut;
  }
  const bool ended =
      TUVO::TuvoSharingLogout(request.route.hash, request.session_id) || !HasToken(request);
  LogLogout(request.route.hash, ended);
  return ended ? Notice::kLoggedOut : Notice::kLogoutFailed;
}

}  // namespace

Answer LogoutPage(const Request& request) {
  const std::string action = LogoutPath(request.route.hash);
  NoticePage page;
  page.heading = "Log out of this link?";
  page.text = "This browser will no longer open the link until you prove yourself again.";
  page.button = "Log out";
  page.action = action;
  constexpr int kOk = 200;
  return PageAnswer(kOk, page);
}

Answer Logout(const Request& request) {
  const NoticeText& text = TextOf(EndAccess(request));
  const std::string back = LinkPath(request.route.hash);
  NoticePage page;
  page.heading = text.heading;
  page.text = text.text;
  page.link = back;
  page.link_text = "Back to the link";
  return PageAnswer(text.status, page);
}

}  // namespace visitor
