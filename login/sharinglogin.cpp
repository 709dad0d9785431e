// The four operations of the login API. They live in one file because the log lines of all name it.
#include <internal/contained.h>
#include <internal/log.h>
#include <internal/user_access.h>
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <ctime>
#include <limits>
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

// Renews the token of session and link, expired or not, or creates one.
bool TakeToken(TokenDB& tokens, const Session& session, const Entry& entry, Token& token) {
  if (WasFound(tokens.GetBySessionEntry(session, entry, token), token)) {
    token.set_timeout(EndOfLifetime());
    return tokens.Update(token);
  }
  token.set_session_id(session.get_id());
  token.set_entry_id(entry.get_id());
  token.set_timeout(EndOfLifetime());
  return tokens.Create(token);
}

// What remains once the visitor is admitted and the use counted: session and token. On failure the
// token is taken back.
bool Admit(SharingDB& db, const Entry& entry, const char* sharing_sid, unsigned int uid,
           std::string& session_id) {
  SessionDB sessions(db);
  TokenDB tokens(db);
  Session session;
  Token token;
  std::string ip;
  if (db.IsGood() && GetRemoteIP(ip) && TakeSession(sessions, sharing_sid, ip, session)) {
    // Copied before there is a token: without memory for it later, one would stay behind.
    std::string text = session.get_session_id();
    if (entry.get_protect_type() == Entry::PROTECT_USER) {
      session.set_uid(uid);
    }
    if (TakeToken(tokens, session, entry, token) && sessions.Update(session)) {
      session_id = std::move(text);
      return true;
    }
  }
  tokens.Delete(token);
  return false;
}

// One use stricter than the link's own validity, so that a limit of N admits exactly N logins.
bool IsUsedUp(const Entry& entry) {
  return entry.get_expire_times() > 0 && entry.get_use_count() >= entry.get_expire_times();
}

// Holds the file for writing until it is committed or taken back. Within a transaction of the
// caller's own this is none, and that one decides.
class WriteTransaction {
 public:
  explicit WriteTransaction(SharingDB& db)
      : db_(db), open_(Begin()), begun_(open_ || IsWithinAnother()) {}
  ~WriteTransaction() {
    // Once more: a transaction that a passing fault leaves open would lock everybody out, and take
    // in all that this process writes from now on.
    if (open_ && !db_.Execute("ROLLBACK")) {
      db_.Execute("ROLLBACK");
    }
  }
  WriteTransaction(const WriteTransaction&) = delete;
  WriteTransaction& operator=(const WriteTransaction&) = delete;

  // False when the file could not be had, being locked by somebody else for one.
  bool HasBegun() const { return begun_; }
  bool Commit() { return !std::exchange(open_, false) || db_.Commit(); }

 private:
  bool Begin() {
    // The last error may be an earlier statement's, and a switch of identity that fails leaves it.
    // A statement that the connection itself refuses puts another in its place.
    if (IsWithinAnother()) {
      db_.Execute(std::string(1, '\0'));
    }
    return db_.Execute("BEGIN IMMEDIATE");
  }

  // What SQLite says to a second BEGIN.
  bool IsWithinAnother() const {
    return db_.GetLastError().find("within a transaction") != std::string::npos;
  }

  SharingDB& db_;
  bool open_;
  bool begun_;
};

enum class Count {
  kDone,
  kFailed,
  kUsedUp,  // nothing was written
};

// Whom a use is counted for.
enum class CountFor {
  kCaller,  // who has decided already: whatever the limit says
  kLogin,   // only as long as the limit is not reached
};

Count CountUse(EntryDB& entries, const std::string& hash, CountFor whom) {
  Entry entry;
  if (!entries.GetByHash(hash, entry)) {
    return Count::kFailed;
  }
  if (whom == CountFor::kLogin && IsUsedUp(entry)) {
    return Count::kUsedUp;
  }
  entry.inc_use_count();
  return entries.Update(entry) ? Count::kDone : Count::kFailed;
}

Count IncreaseUseCount(const std::string& hash, CountFor whom) {
  SharingDB& db = SharingDB::Instance();
  if (!db.IsGood()) {
    return Count::kFailed;
  }
  EntryDB entries(db);  // checkpoints when the transaction is over
  // The whole link is read and written back: what its owner, or another login, writes in between
  // would be undone, a link that was just switched off would be on again.
  WriteTransaction transaction(db);
  if (!transaction.HasBegun()) {
    return Count::kFailed;
  }
  const Count count = CountUse(entries, hash, whom);
  return count == Count::kDone && !transaction.Commit() ? Count::kFailed : count;
}

Count CountLogin(const std::string& hash) {
  return Contained([&] { return IncreaseUseCount(hash, CountFor::kLogin); }, Count::kFailed);
}

int Login(std::string& session_id, const _tag_sharing_login_params* params, bool skip_autoblock) {
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
  // The limit is decided again with the file held: other visitors may have taken the last uses
  // since the link was read.
  switch (CountLogin(params->sharing_id)) {
    case Count::kDone:
      break;
    case Count::kUsedUp:
      return kUsedUp;
    case Count::kFailed:
      SHARING_LOG("update entry use count fail");
  }
  if (!Admit(db, entry, params->sharing_sid, uid, session_id)) {
    return kFailed;
  }
  if (!skip_autoblock) {
    TUVOAutoBlockFailLoginReset(ip.c_str());
  }
  return kSuccess;
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
  return Contained([&] { return IncreaseUseCount(hash, CountFor::kCaller) == Count::kDone; },
                   false);
}

}  // namespace TUVO
