// The four operations of the login API. They live in one file because the log lines of all name it.
#include <internal/contained.h>
#include <internal/entry_alike.h>
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

// Reads the link, raises its count and writes it back as a whole: without the file held, what its
// owner, or a login, writes in between would be undone, a link that was just switched off would be
// on again.
bool IncreaseUseCount(const std::string& hash) {
  SharingDB& db = SharingDB::Instance();
  if (!db.IsGood()) {
    return false;
  }
  EntryDB entries(db);  // checkpoints when the transaction is over
  WriteTransaction transaction(db, WriteTransaction::IsOpenIn(db));
  Entry entry;
  if (!transaction.IsOpen() || !entries.GetByHash(hash, entry)) {
    return false;
  }
  entry.inc_use_count();
  return entries.Update(entry) && transaction.Commit();
}

bool InForceAlike(const Entry& one, const Entry& other) {
  return one.get_enabled() == other.get_enabled() && one.get_start_at() == other.get_start_at() &&
         one.get_expire_at() == other.get_expire_at();
}

// One visitor's login, from the look at the link to the token. Where the link changes meanwhile it
// begins anew.
class LinkLogin {
 public:
  LinkLogin(SharingDB& db, const _tag_sharing_login_params* params, bool skip_autoblock)
      : db_(db),
        params_(params),
        skip_autoblock_(skip_autoblock),
        joins_(WriteTransaction::IsOpenIn(db)) {}

  int Run(std::string& session_id) {
    // So that nobody writes between the look at the link and the count.
    if (joins_ && !WriteTransaction(db_, joins_).IsOpen()) {
      return kFailed;
    }
    constexpr int kMostChanges = 10;
    for (int changes = 0; changes < kMostChanges; ++changes) {
      const int result = LogIn(session_id);
      if (result != kLinkChanged) {
        return result;
      }
    }
    return kFailed;
  }

 private:
  enum class Use {
    kToCount,
    kCounted,
    kUncountable,  // which was logged
  };

  int LogIn(std::string& session_id) {
    std::string ip;
    if (!GetRemoteIP(ip)) {
      return kFailed;
    }
    if (TuvoCgiIsDeniedIP(ip.c_str()) == 1) {
      SHARING_LOG("TuvoAutoBlockIsDeniedIP %s", ip.c_str());
      return kAddress;
    }
    EntryDB entries(db_);
    Entry entry;
    if (!entries.GetByHash(params_->sharing_id, entry) || !entry.IsValid()) {
      return kNoValidLink;
    }
    if (entry.get_id() != link_) {
      link_ = entry.get_id();
      use_ = Use::kToCount;
    }
    if (use_ != Use::kCounted && IsUsedUp(entry)) {
      return kUsedUp;
    }
    unsigned int uid = kNoUid;
    const int protection = CheckProtection(entry, params_, uid);
    if (protection != kSuccess) {
      // A caller that skips the auto-block does not hold it against an account that it is not
      // listed; a wrong password counts in any case.
      if (protection != kAccountNotListed || !skip_autoblock_) {
        AutoBlockFailLoginSet(ip.c_str(), kService);
      }
      return protection;
    }
    int admission = Contained([&] { return CountUse(entry); }, int{kSuccess});
    if (admission == kSuccess) {
      admission = Admit(entries, entry, uid, session_id);
    }
    if (admission == kSuccess && !skip_autoblock_) {
      TUVOAutoBlockFailLoginReset(ip.c_str());
    }
    return admission;
  }

  // Decides again, with the file held, for a visitor whom `link` let in: other visitors may have
  // taken the last uses since it was read, and its owner may have changed it and signed everybody
  // out.
  int JudgeAgain(const EntryDB& entries, const Entry& link, Entry& now) const {
    if (!entries.GetByHash(params_->sharing_id, now) || !ProtectAlike(now, link)) {
      return kLinkChanged;
    }
    if (use_ == Use::kCounted) {  // it came before the link was switched off, or ended
      return kSuccess;
    }
    if (!InForceAlike(now, link)) {
      return kLinkChanged;
    }
    return IsUsedUp(now) ? kLinkChanged : kSuccess;
  }

  void NoteUse(bool counted) {
    use_ = counted ? Use::kCounted : Use::kUncountable;
    if (!counted) {
      SHARING_LOG("update entry use count fail");
    }
  }

  // Leaves the use to be counted with the admission when the file could not be had, or not be
  // written.
  int CountUse(const Entry& link) {
    EntryDB entries(db_);  // checkpoints when the transaction is over
    WriteTransaction transaction(db_, joins_);
    if (use_ != Use::kToCount || !transaction.IsOpen()) {
      return kSuccess;
    }
    Entry entry;
    const int verdict = JudgeAgain(entries, link, entry);
    if (verdict != kSuccess) {
      return verdict;
    }
    entry.inc_use_count();
    if (!entries.Update(entry)) {
      NoteUse(false);
    } else if (transaction.Commit()) {
      NoteUse(true);
    }
    return joins_ && !transaction.IsOpen() ? kFailed : kSuccess;
  }

  // Makes session and token, in one transaction: one session must not get two tokens, nor anybody a
  // token behind a change of the protection, which signs everybody out.
  int Admit(EntryDB& entries, const Entry& link, unsigned int uid, std::string& session_id) {
    SessionDB sessions(db_);
    TokenDB tokens(db_);
    WriteTransaction transaction(db_, joins_);
    if (!transaction.IsOpen()) {
      if (use_ == Use::kToCount) {
        NoteUse(false);
      }
      return kFailed;
    }
    Entry entry;
    const int verdict = JudgeAgain(entries, link, entry);
    if (verdict != kSuccess) {
      return verdict;
    }
    bool counting = use_ == Use::kToCount;
    if (counting) {
      entry.inc_use_count();
      counting = entries.Update(entry);
      if (!counting) {
        NoteUse(false);
      }
    }
    Token token;
    std::string text;
    const bool admitted = Contained([&] {
      return transaction.IsOpen() &&
             TakeBoth(transaction, sessions, tokens, link, uid, token, text);
    });
    // A token of a transaction that is gone is gone with it, and its number may be somebody else's
    // by now.
    if (!admitted && transaction.IsOpen()) {
      tokens.Delete(token);
    }
    const bool written = transaction.Commit();
    if (counting) {
      NoteUse(written);
    }
    if (!written || !admitted) {
      return kFailed;
    }
    session_id = std::move(text);
    return kSuccess;
  }

  // On failure `token` is what there is to take back.
  bool TakeBoth(const WriteTransaction& transaction, SessionDB& sessions, TokenDB& tokens,
                const Entry& link, unsigned int uid, Token& token, std::string& text) const {
    Session session;
    std::string ip;
    if (!db_.IsGood() || !GetRemoteIP(ip) ||
        !TakeSession(sessions, params_->sharing_sid, ip, session) ||
        !TakeToken(transaction, tokens, session, link, token)) {
      return false;
    }
    if (link.get_protect_type() == Entry::PROTECT_USER) {
      session.set_uid(uid);
    }
    text = session.get_session_id();
    return sessions.Update(session);
  }

  SharingDB& db_;
  const _tag_sharing_login_params* const params_;
  const bool skip_autoblock_;
  const bool joins_;
  int link_ = 0;
  Use use_ = Use::kToCount;
};

int Login(std::string& session_id, const _tag_sharing_login_params* params, bool skip_autoblock) {
  SharingDB& db = SharingDB::Instance();
  if (params == nullptr || !db.IsGood() || params->sharing_id == nullptr) {
    return kFailed;
  }
  return LinkLogin(db, params, skip_autoblock).Run(session_id);
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
