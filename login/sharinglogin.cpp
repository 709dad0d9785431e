// The four operations of the login API. They live in one file because the log lines of all name it.
#include <internal/contained.h>
#include <internal/log.h>
#include <internal/user_access.h>
#include <internal/write_transaction.h>
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <ctime>
#include <limits>
#include <optional>
#include <string>
#include <utility>

namespace TUVO {

namespace {

using sharing::CheckUserAccess;
using sharing::Contained;
using sharing::GetRemoteIP;
using sharing::db::EntryDB;
using sharing::db::SessionDB;
using sharing::db::SharingDB;
using sharing::db::TokenDB;
using sharing::db::WriteTransaction;
using sharing::record::Entry;
using sharing::record::Session;
using sharing::record::Token;

enum ResultCode {
  kSuccess = 1,
  kExpired = -1,
  kAccountRefused = -2,
  kNoValidLink = -3,
  kFailed = -4,
  kNoSession = -5,
  kLinkNotValid = -6,
  kNoToken = -7,
  kAddress = -8,
  kWrongPassword = -9,
  kAccountNotListed = -10,
  kUsedUp = -11,
  kLinkChanged = 0,  // never leaves a login
};

// How long session and token last after a login and after every authorised request.
constexpr long kLifetimeSeconds = 86400;

constexpr unsigned int kNoUid = static_cast<unsigned int>(-1);

// Name under which failed logins are counted.
constexpr char kService[] = "SHARING";

// Where times have 32 bits, the last day of theirs has no end of its own.
long EndOfLifetime() {
  constexpr long kLast = std::numeric_limits<long>::max();
  const long now = std::time(nullptr);
  return now > kLast - kLifetimeSeconds ? kLast : now + kLifetimeSeconds;
}

// A look-up answers false for "no such row" and for a row that is not legal any more; only the
// second fills the record, whose id was 0 before.
template <typename Record>
bool WasFound(bool answer, const Record& record) {
  return answer || record.get_id() != 0;
}

// Whether the visitor gets past the link's protection: 1 or a refusal. Stores the account's uid.
int CheckProtection(const Entry& entry, const _tag_sharing_login_params* params,
                    unsigned int& uid) {
  switch (entry.get_protect_type()) {
    case Entry::PROTECT_PASSWORD:
      if (params->password == nullptr) {
        return kNoValidLink;
      }
      return entry.IsPasswordValid(params->password) ? kSuccess : kWrongPassword;
    case Entry::PROTECT_USER:
      switch (CheckUserAccess(entry, params, &uid)) {
        case 1:
          return kSuccess;
        case -2:
          return kAccountRefused;
        case -6:
          return kAccountNotListed;
        default:
          return kNoValidLink;
      }
    default:
      return kSuccess;
  }
}

// The session that the visitor's cookie names when it is still usable, else a new one. Not yet
// written when it is an old one.
bool TakeSession(SessionDB& sessions, const char* sharing_sid, const std::string& ip,
                 Session& session) {
  if (sharing_sid != nullptr && sessions.GetBySessionId(sharing_sid, session)) {
    session.set_ip(ip);
    session.set_timeout(EndOfLifetime());
    return true;
  }
  session = Session();  // nothing of an expired one is carried over
  session.set_ip(ip);
  session.set_timeout(EndOfLifetime());
  return sessions.CreateWithSessionId(session);
}

// Whether there is certainly no row of the condition: a look-up that fails finds none, too.
template <typename Store>
bool HasNone(const Store& store) {
  int count = 0;
  return store.Count(count) && count == 0;
}

// Renews the token of session and link, expired or not, or creates one.
bool TakeToken(const WriteTransaction& transaction, TokenDB& tokens, const Session& session,
               const Entry& entry, Token& token) {
  if (WasFound(tokens.GetBySessionEntry(session, entry, token), token)) {
    token.set_timeout(EndOfLifetime());
    return tokens.Update(token);
  }
  // Of two tokens for the pair a logout would remove one. And a token that is no part of the
  // transaction would stay when that fails.
  tokens.GetCondition().Where("session_id", std::to_string(session.get_id()));
  tokens.GetCondition().Where("entry_id", std::to_string(entry.get_id()));
  if (!HasNone(tokens) || !transaction.IsOpen()) {
    return false;
  }
  token.set_session_id(session.get_id());
  token.set_entry_id(entry.get_id());
  token.set_timeout(EndOfLifetime());
  return tokens.Create(token);
}

// One use stricter than the link's own validity, so that a limit of N admits exactly N logins.
bool IsUsedUp(const Entry& entry) {
  return entry.get_expire_times() > 0 && entry.get_use_count() >= entry.get_expire_times();
}

// Whether whoever is let in by one link is by the other: the same link, in force for the same time
// and protected in the same way.
bool AdmitAlike(const Entry& one, const Entry& other) {
  return one.get_id() == other.get_id() && one.get_enabled() == other.get_enabled() &&
         one.get_start_at() == other.get_start_at() &&
         one.get_expire_at() == other.get_expire_at() &&
         one.get_protect_type() == other.get_protect_type() &&
         one.get_protect_password() == other.get_protect_password() &&
         one.get_protect_uids() == other.get_protect_uids() &&
         one.get_protect_gids() == other.get_protect_gids();
}

enum class Count {
  kDone,
  kFailed,
  kUsedUp,   // nothing was written
  kChanged,  // nothing was written: the link that let the visitor in is not there any more
};

// `admitting` is the link as it let the visitor in; null for a caller who has decided already.
Count CountUse(EntryDB& entries, const std::string& hash, const Entry* admitting) {
  Entry entry;
  if (!entries.GetByHash(hash, entry)) {
    entries.GetCondition().Where("hash", hash);
    return admitting != nullptr && HasNone(entries) ? Count::kChanged : Count::kFailed;
  }
  if (admitting != nullptr && !AdmitAlike(entry, *admitting)) {
    return Count::kChanged;
  }
  if (admitting != nullptr && IsUsedUp(entry)) {
    return Count::kUsedUp;
  }
  entry.inc_use_count();
  return entries.Update(entry) ? Count::kDone : Count::kFailed;
}

bool IncreaseUseCount(const std::string& hash) {
  SharingDB& db = SharingDB::Instance();
  if (!db.IsGood()) {
    return false;
  }
  EntryDB entries(db);  // checkpoints when the transaction is over
  // The whole link is read and written back: what its owner, or a login, writes in between would be
  // undone, a link that was just switched off would be on again.
  WriteTransaction transaction(db);
  return transaction.IsOpen() && CountUse(entries, hash, nullptr) == Count::kDone &&
         transaction.Commit();
}

// Session and token of a visitor who is past the link's protection. On failure `token` is what
// there is to take back.
bool Admit(SharingDB& db, const WriteTransaction& transaction, SessionDB& sessions, TokenDB& tokens,
           const Entry& entry, const char* sharing_sid, unsigned int uid, Token& token,
           std::string& session_id) {
  Session session;
  std::string ip;
  if (!db.IsGood() || !GetRemoteIP(ip) || !TakeSession(sessions, sharing_sid, ip, session) ||
      !TakeToken(transaction, tokens, session, entry, token)) {
    return false;
  }
  if (entry.get_protect_type() == Entry::PROTECT_USER) {
    session.set_uid(uid);
  }
  session_id = session.get_session_id();
  return sessions.Update(session);
}

void LogUncounted() {
  SHARING_LOG("update entry use count fail");
}

// Counts the use and lets the visitor in. All of it holds the file, so that nothing comes in
// between: other visitors may have taken the last uses since the link was read, and its owner may
// have changed it and signed everybody out.
int CountAndAdmit(SharingDB& db, const Entry& entry, const _tag_sharing_login_params* params,
                  unsigned int uid, std::string& session_id) {
  EntryDB entries(db);  // these checkpoint when the transaction is over
  SessionDB sessions(db);
  TokenDB tokens(db);
  std::optional<WriteTransaction> transaction(std::in_place, db);
  const auto count = [&] { return CountUse(entries, params->sharing_id, &entry); };
  bool counted = false;
  switch (transaction->IsOpen() ? Contained(count, Count::kFailed) : Count::kFailed) {
    case Count::kDone:
      counted = true;
      break;
    case Count::kUsedUp:
      return kUsedUp;
    case Count::kChanged:
      return kLinkChanged;
    case Count::kFailed:
      LogUncounted();
      transaction.emplace(db);  // takes back what there is of the failed one
  }
  Token token;
  std::string text;
  const auto admit = [&] {
    return transaction->IsOpen() &&
           Admit(db, *transaction, sessions, tokens, entry, params->sharing_sid, uid, token, text);
  };
  const bool admitted = Contained(admit);
  // Whoever is not admitted has used the link all the same. A token of a transaction that is gone
  // is gone with it, and its number may be somebody else's by now.
  if (!admitted && transaction->IsOpen()) {
    tokens.Delete(token);
  }
  if (!transaction->Commit()) {
    if (counted) {
      LogUncounted();
    }
    return kFailed;
  }
  if (!admitted) {
    return kFailed;
  }
  session_id = std::move(text);
  return kSuccess;
}

// kLinkChanged when it has to be done again.
int TryLogin(std::string& session_id, const _tag_sharing_login_params* params,
             bool skip_autoblock) {
  SharingDB& db = SharingDB::Instance();
  if (params == nullptr || !db.IsGood() || params->sharing_id == nullptr) {
    return kFailed;
  }
  std::string ip;
  if (!GetRemoteIP(ip)) {
    return kFailed;
  }
  if (TuvoCgiIsDeniedIP(ip.c_str()) == 1) {
    SHARING_LOG("TuvoAutoBlockIsDeniedIP %s", ip.c_str());
    return kAddress;
  }
  const EntryDB entries(db);
  Entry entry;
  if (!entries.GetByHash(params->sharing_id, entry) || !entry.IsValid()) {
    return kNoValidLink;
  }
  if (IsUsedUp(entry)) {
    return kUsedUp;
  }
  unsigned int uid = kNoUid;
  const int protection = CheckProtection(entry, params, uid);
  if (protection != kSuccess) {
    // A caller that skips the auto-block does not hold it against an account that it is not listed;
    // a wrong password counts in any case.
    if (protection != kAccountNotListed || !skip_autoblock) {
      AutoBlockFailLoginSet(ip.c_str(), kService);
    }
    return protection;
  }
  const int admission = CountAndAdmit(db, entry, params, uid, session_id);
  if (admission == kSuccess && !skip_autoblock) {
    TUVOAutoBlockFailLoginReset(ip.c_str());
  }
  return admission;
}

int Login(std::string& session_id, const _tag_sharing_login_params* params, bool skip_autoblock) {
  for (;;) {
    const int result = TryLogin(session_id, params, skip_autoblock);
    if (result != kLinkChanged) {
      return result;
    }
  }
}

int IsAuthorized(const _tag_sharing_login_params* params) {
  SharingDB& db = SharingDB::Instance();
  // All three end together, at the end of the check: one of their checkpoints does the work.
  const EntryDB entries(db);
  SessionDB sessions(db);
  TokenDB tokens(db);
  Entry entry;
  Session session;
  Token token;
  if (!db.IsGood()) {
    SHARING_LOG("db is not good");
    if (!db.IsRoot()) {
      return kFailed;
    }
    SHARING_LOG("db ownner is root");
    db.MoveRootDB();  // for the next process to make a new file
  }
  if (params == nullptr || params->sharing_sid == nullptr || params->sharing_id == nullptr) {
    return kFailed;
  }
  std::string ip;
  if (!GetRemoteIP(ip)) {
    SHARING_LOG("invalid ip");
    return kFailed;
  }
  if (!WasFound(sessions.GetBySessionId(params->sharing_sid, session), session)) {
    return kNoSession;
  }
  if (!WasFound(entries.GetByHash(params->sharing_id, entry), entry)) {
    return kNoToken;
  }
  if (!WasFound(tokens.GetBySessionEntry(session, entry, token), token)) {
    return kNoToken;
  }
  if (!entry.IsValid()) {
    SHARING_LOG("entry is not valid");
    return kLinkNotValid;
  }
  if (!session.IsLegal()) {
    SHARING_LOG("session is not valid");
    return kExpired;
  }
  if (!token.IsLegal()) {
    SHARING_LOG("token is not valid");
    if (!tokens.Delete(token)) {
      SHARING_LOG("delete token failed");
      return kFailed;
    }
    return kExpired;
  }
  if (entry.get_protect_type() == Entry::PROTECT_USER) {
    unsigned int uid = session.get_uid();
    if (CheckUserAccess(entry, params, &uid) != kSuccess) {
      SHARING_LOG("user login error");
      return kAccountRefused;
    }
  }
  if (entry.get_enable_match_ip() && session.get_ip() != ip) {
    SHARING_LOG("ip not match, %s, %s", ip.c_str(), session.get_ip().c_str());
    return kAddress;
  }
  session.set_timeout(EndOfLifetime());
  if (!sessions.Update(session)) {
    SHARING_LOG("update session failed");
    return kFailed;
  }
  token.set_timeout(EndOfLifetime());
  if (!tokens.Update(token)) {
    SHARING_LOG("update token failed");
    return kFailed;
  }
  return kSuccess;
}

bool Logout(const std::string& hash, const std::string& session_id) {
  SharingDB& db = SharingDB::Instance();
  const EntryDB entries(db);
  const SessionDB sessions(db);
  TokenDB tokens(db);
  Entry entry;
  Session session;
  Token token;
  if (!db.IsGood()) {
    return false;
  }
  if (!sessions.GetBySessionId(session_id, session)) {
    SHARING_LOG("get session failed");
    return false;
  }
  if (!entries.GetByHash(hash, entry)) {
    SHARING_LOG("get entry failed");
    return false;
  }
  if (!tokens.GetBySessionEntry(session, entry, token)) {
    SHARING_LOG("get token failed");
    return false;
  }
  return tokens.Delete(token);
}

}  // namespace

// What may still be thrown, for want of memory, ends in each: a caller in C could not catch it.

int TuvoSharingLogin(std::string& session_id, _tag_sharing_login_params* params,
                     bool skip_autoblock) {
  return Contained([&] { return Login(session_id, params, skip_autoblock); }, int{kFailed});
}

int TuvoSharingIsAuthorized(const _tag_sharing_login_params* params) {
  return Contained([&] { return IsAuthorized(params); }, int{kFailed});
}

bool TuvoSharingLogout(const std::string& hash, const std::string& session_id) {
  return Contained([&] { return Logout(hash, session_id); }, false);
}

bool TuvoSharingIncreaseUseCount(const std::string& hash) {
  return Contained([&] { return IncreaseUseCount(hash); }, false);
}

}  // namespace TUVO
