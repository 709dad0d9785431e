// The web API: from a request's text to the answer's, on a database that is the same at first for
// every input. Whatever is asked, the answer is of its documented form, nothing is shown or changed
// that is not the account's, and nothing secret is shown to anybody.
//
// Input, three lines for each request: whose (0 alice, 1 bob, 2 carol, an administrator, 3 nobody),
// which way (0 a POST, 1 a GET, 2 the command), and the body or query string.
#include <json/reader.h>
#include <tuvoplatform/process.h>
#include <tuvosharing/entry_db.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <memory>
#include <set>
#include <string>
#include <vector>

#include "fixed_time.h"
#include "lines.h"
#include "links_database.h"
#include "owner/argument.h"
#include "owner/moment.h"
#include "owner/text_check.h"
#include "target.h"
#include "webapi/answer.h"
#include "webapi/call.h"
#include "webapi/handler.h"
#include "webapi/registry.h"
#include "webapi/text_arguments.h"

// In place of the platform's: the address tool is a program of its own, with tests of its own, and
// starting a process takes longer than everything else here.
FILE* TLIBCPopen(const char* /*path*/, const char* /*mode*/, ...) {
  errno = ENOENT;
  return nullptr;
}

namespace {

using fuzz::Require;
using fuzz::RequireEqual;
using owner::RepairedUtf8;
using TUVO::sharing::record::Entry;

constexpr std::array<const char*, 3> kAccounts = {"alice", "bob", "carol"};

// All that is nobody's business, and what is not everybody's, bears one of these.
constexpr std::array<const char*, 3> kSecrets = {"SecretOfTheLink", "SecretOfTheSession",
                                                 "SecretSalt"};
constexpr const char* kBobs = "OnlyBobs";

std::string Document(const std::string& more) {
  return R"({"private_data":{"key":"SecretOfTheLink"},"enable_match_ip":true)" + more + "}";
}

std::string EntryRow(int id, const std::string& hash, const std::string& project,
                     const std::string& uid, int expire_at, const std::string& document) {
  return "INSERT INTO entry VALUES (" + std::to_string(id) + "," + fuzz::Literal(hash) + "," +
         fuzz::Literal(project) + ",1," + uid + ",0," + std::to_string(expire_at) + ",9,2,1," +
         fuzz::Literal(document) + ");";
}

std::string VisitorRows(int id, int link) {
  const std::string number = std::to_string(id);
  const std::string timeout = std::to_string(fuzz::kNow + 1000);
  return "INSERT INTO session VALUES (" + number + ",'SecretOfTheSession" + number +
         "',2002,'192.0.2." + number + "'," + timeout + ");INSERT INTO token VALUES (" + number +
         "," + std::to_string(link) + "," + number + "," + timeout + ");";
}

const std::string& FirstState() {
  const std::string open = R"(,"protect_type":"none","redirect_type":"none","app":{"a":[1,"x"]})";
  const std::string password =
      R"(,"protect_type":"password","protect_password":"SecretOfTheLink",)"
      R"("protect_password_algo":"default","protect_password_salt":"SecretSalt",)"
      R"("redirect_type":"url_param","redirect_uri":"/next","app":{},)";
  static const std::string sql =
      "BEGIN;DELETE FROM token;DELETE FROM session;DELETE FROM entry;DELETE FROM sqlite_sequence;" +
      EntryRow(1, "alice-open", "web", "2001", 0, Document(open)) +
      EntryRow(2, "alice-password", "web", "2001", 0,
               Document(password + "\"protect_title\":\"\xff\xc3\xa4\"")) +
      EntryRow(3, "bob-OnlyBobs", "OnlyBobs", "2002", 0,
               Document(password + R"("protect_title":"OnlyBobs")")) +
      EntryRow(4, "carol-users", "web", "2003", 0,
               Document(R"(,"protect_type":"user","protect_uids":[2001,9999],)"
                        R"("protect_extra_users":["gone"],"protect_gids":[3001],)"
                        R"("redirect_type":"none","app":{"OnlyBobs":1})")) +
      EntryRow(5, "alice-ended", "file", "2001", 1, Document(open)) +
      EntryRow(6, "alice-broken", "web", "2001", 0, "{") +
      EntryRow(7, "no-account", "web", "4242", 0, Document(open)) +
      EntryRow(8, "no-owner", "web", "NULL", 0, Document(open)) + VisitorRows(1, 1) +
      VisitorRows(2, 3) + VisitorRows(3, 4) + "COMMIT";
  return sql;
}

struct State {
  std::string entries;
  std::string sessions;
  std::string tokens;
  std::string passwords;
};

// A line for each link that asks for a password.
std::string DumpPasswords() {
  return fuzz::Column(
      "SELECT id || '|' || quote(json_extract(data, '$.protect_password')) || '|' || "
      "quote(json_extract(data, '$.protect_password_salt')) AS c FROM entry WHERE "
      "json_valid(data) AND json_extract(data, '$.protect_type') = 'password' ORDER BY id");
}

State StateNow() {
  return {fuzz::DumpEntries(), fuzz::DumpSessions(), fuzz::DumpTokens(), DumpPasswords()};
}

// The state at first; set up only where an input before has changed something.
const State& Begin() {
  static std::string changes;
  static State state;
  if (changes.empty() || changes != fuzz::ChangesSoFar()) {
    fuzz::Run(FirstState());
    changes = fuzz::ChangesSoFar();
    state = StateNow();
  }
  return state;
}

Json::Value Parsed(const std::string& text) {
  Json::CharReaderBuilder builder;
  Json::CharReaderBuilder::strictMode(&builder.settings_);
  builder["stackLimit"] = 200;
  const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
  Json::Value value;
  std::string errors;
  Require(reader->parse(text.data(), text.data() + text.size(), &value, &errors), errors.c_str());
  return value;
}

Json::Value Texts(const std::vector<std::string>& texts) {
  Json::Value list(Json::arrayValue);
  for (const std::string& text : texts) {
    list.append(RepairedUtf8(text));
  }
  return list;
}

const char* ProtectText(Entry::ProtectType type) {
  return type == Entry::PROTECT_NONE       ? "none"
         : type == Entry::PROTECT_PASSWORD ? "password"
                                           : "user";
}

const char* RedirectText(Entry::RedirectType type) {
  return type == Entry::REDIRECT_NONE       ? "none"
         : type == Entry::REDIRECT_URLPARAM ? "url_param"
                                            : "always";
}

const char* StateText(const Entry& link) {
  const bool used_up =
      link.get_expire_times() > 0 && link.get_use_count() >= link.get_expire_times();
  return !link.get_enabled()                                             ? "disabled"
         : link.get_expire_at() > 0 && fuzz::kNow > link.get_expire_at() ? "expired"
         : used_up                                                       ? "used_up"
         : link.get_start_at() > 0 && link.get_start_at() > fuzz::kNow   ? "not_yet"
                                                                         : "live";
}

// What docs/webapi.md says of a link, and nothing else.
Json::Value Expected(const Entry& link) {
  Json::Value json(Json::objectValue);
  json["id"] = link.get_id();
  json["hash"] = RepairedUtf8(link.get_hash());
  json["project_name"] = RepairedUtf8(link.get_project_name());
  json["owner_user"] = link.get_owner_user();
  json["owner_uid"] = link.get_owner_uid();
  json["state"] = StateText(link);
  json["enabled"] = link.get_enabled();
  json["start_at"] = owner::MomentText(link.get_start_at());
  json["expire_at"] = owner::MomentText(link.get_expire_at());
  json["expire_times"] = link.get_expire_times();
  json["use_count"] = link.get_use_count();
  json["auto_gc"] = link.get_auto_gc();
  json["enable_match_ip"] = link.get_enable_match_ip();
  json["protect_type"] = ProtectText(link.get_protect_type());
  json["protect_title"] = RepairedUtf8(link.get_protect_title());
  json["protect_users"] = Texts(link.get_protect_users());
  json["protect_groups"] = Texts(link.get_protect_groups());
  json["redirect_type"] = RedirectText(link.get_redirect_type());
  json["redirect_uri"] = RepairedUtf8(link.get_redirect_uri());
  json["app"] = link.get_app();
  return json;
}

bool IsHolding(const std::string& text, const std::string& piece) {
  return !piece.empty() && text.find(piece) != std::string::npos;
}

// The numbers of the table in docs/webapi.md that a handler can answer.
bool IsDocumented(int code) {
  static const std::set<int> codes = {101, 102, 103, 104, 105, 106, 107, 110, 200,
                                      201, 202, 203, 204, 205, 206, 207, 208};
  return codes.count(code) != 0;
}

std::set<std::string> LinesOf(const std::string& text) {
  std::set<std::string> lines;
  for (std::size_t begin = 0; begin < text.size();) {
    const std::size_t end = text.find('\n', begin);
    lines.insert(text.substr(begin, end - begin));
    begin = end + 1;
  }
  return lines;
}

// One request and what became of it.
class Exchange {
 public:
  // `told`: this request, or one before it, may have said what would otherwise be a secret.
  Exchange(State before, std::string input, bool told)
      : before_(std::move(before)), input_(std::move(input)), told_(told) {}

  // Answers the state behind the request.
  State Run(std::size_t account, std::size_t way) {
    account_ = account;
    const std::string text = webapi::TextOf(AnswerTo(way));
    after_ = StateNow();
    Require(owner::IsUtf8(text) && text.find('\n') == std::string::npos, "an answer is one line");
    const Json::Value answer = Parsed(text);
    CheckForm(answer);
    CheckChanges(answer);
    CheckLinks(answer["data"]);
    CheckSecrets(text);
    return after_;
  }

 private:
  bool IsAdministrator() const { return account_ == 2; }
  std::string Uid() const { return std::to_string(2001 + account_); }

  webapi::Answer Refusal(const owner::Problem& problem) {
    return {webapi::FailureAnswer(problem), {}};
  }

  webapi::Answer AnswerTo(std::size_t way) {
    Json::Value request;
    owner::MaybeProblem problem;
    if (way == 0) {
      if (!owner::ReadJson(input_, &request)) {
        return Refusal({owner::Error::kMalformedRequest, "not JSON", {}});
      }
    } else {
      problem = webapi::ReadQuery(input_, &request);
    }
    if (!problem) {
      problem = webapi::ReadCall(request, way != 0, &call_);
    }
    if (problem) {
      return Refusal(*problem);
    }
    call_.may_change = way != 1;
    call_.address = "192.0.2.1";
    if (account_ < kAccounts.size()) {
      static const std::array<std::optional<owner::Account>, 3> accounts = {
          owner::AccountOfName(kAccounts[0]), owner::AccountOfName(kAccounts[1]),
          owner::AccountOfName(kAccounts[2])};
      call_.account = accounts.at(account_);
      Require(call_.account.has_value(), "the accounts are those of scripts/private-root");
    }
    return webapi::Handle(call_);
  }

  void CheckForm(const Json::Value& answer) {
    Require(answer.isObject() && answer.size() == 2 && answer["success"].isBool(),
            "an answer says whether the request was done");
    done_ = answer["success"].asBool();
    if (done_) {
      Require(answer["data"].isObject(), "what was done has data");
      Require(account_ < kAccounts.size(), "without an account nothing is done");
      return;
    }
    const Json::Value& error = answer["error"];
    Require(error.isObject() && error["code"].isInt() && error["message"].isString() &&
                error.size() == (error.isMember("field") ? 3U : 2U),
            "a failure has a code and a message");
    Require(IsDocumented(error["code"].asInt()), error["message"].asCString());
    Require(!error.isMember("field") || !error["field"].asString().empty(), "a field has a name");
  }

  bool ChangesSomething() const {
    const webapi::Method* method = nullptr;
    return done_ && !webapi::FindMethod(call_, &method) && method->changes;
  }

  // Only methods that may, only where it was asked, only rows of the account's own.
  void CheckChanges(const Json::Value& answer) {
    if (!ChangesSomething()) {
      RequireEqual(after_.entries + after_.sessions + after_.tokens,
                   before_.entries + before_.sessions + before_.tokens,
                   "what only reads, or fails, changes nothing");
      return;
    }
    Require(call_.may_change, "a GET changes nothing");
    RequireEqual(after_.sessions, before_.sessions, "sessions are no business of the web API");
    const std::set<std::string> before = LinesOf(before_.entries);
    const std::set<std::string> after = LinesOf(after_.entries);
    std::vector<std::string> gone;
    std::vector<std::string> come;
    std::set_difference(before.begin(), before.end(), after.begin(), after.end(),
                        std::back_inserter(gone));
    std::set_difference(after.begin(), after.end(), before.begin(), before.end(),
                        std::back_inserter(come));
    for (const auto* rows : {&gone, &come}) {
      for (const std::string& row : *rows) {
        Require(IsAdministrator() || Owner(row) == Uid(), "only the account's own rows change");
      }
    }
    CheckMethod(answer["data"], gone, come);
  }

  // A dumped row's first cell, and its second.
  static std::string Id(const std::string& row) { return row.substr(0, row.find('|')); }
  static std::string Owner(const std::string& row) {
    const std::size_t begin = row.find('|') + 1;
    return row.substr(begin, row.find('|', begin) - begin);
  }

  // A link that asks for a password which nobody inside has given keeps none of its visitors; all
  // other visitors stay.
  void CheckVisitors(const std::vector<std::string>& changed) {
    const std::set<std::string> before = LinesOf(before_.passwords);
    std::string signed_out;
    for (const std::string& line : LinesOf(after_.passwords)) {
      if (before.count(line) == 0) {
        Require(changed.size() == 1 && Id(line) == Id(changed[0]), "one password is changed");
        signed_out = Id(line);
      }
    }
    std::string staying;
    for (const std::string& row : LinesOf(before_.tokens)) {
      // The token's link is where a link's owner is.
      staying += !signed_out.empty() && Owner(row) == signed_out ? "" : row + "\n";
    }
    RequireEqual(after_.tokens, staying, "a change leaves the visitors, but of a new password");
  }

  void CheckMethod(const Json::Value& data, const std::vector<std::string>& gone,
                   const std::vector<std::string>& come) {
    const std::string& method = call_.method;
    if (method == "create") {
      Require(gone.empty() && come.size() == 1, "a creation adds one row");
    } else if (method == "set") {
      Require(gone.size() == come.size() && gone.size() <= 1, "a change changes one row");
      CheckVisitors(come);
    } else if (method == "delete") {
      Require(gone.size() == 1 && come.empty() && data["deleted"] == 1, "one link is deleted");
    } else if (method == "delete_expired") {
      const bool counted = call_.arguments["dry_run"].asBool() ||
                           call_.arguments["dry_run"].asString() == "true" ||
                           call_.arguments["dry_run"].asString() == "1";
      Require(come.empty() && (counted ? gone.empty() : data["deleted"].asUInt64() == gone.size()),
              "the number of ended links is told");
    } else {
      Require(gone.empty() && come.empty(), "other methods leave the links");
    }
  }

  void CheckLinks(const Json::Value& data) {
    if (data.isMember("link")) {
      CheckLink(data["link"]);
    }
    for (const Json::Value& link : data["links"]) {
      CheckLink(link);
    }
  }

  void CheckLink(const Json::Value& shown) {
    Entry link;
    const TUVO::sharing::db::EntryDB store(fuzz::Links());
    Require(shown["id"].isInt() && store.GetById(shown["id"].asInt(), link),
            "a link that is shown is there");
    Require(IsAdministrator() || std::to_string(link.get_owner_uid()) == Uid(),
            "only the account's own links are shown");
    RequireEqual(owner::WriteJson(shown), owner::WriteJson(Expected(link)),
                 "a link is shown as it is");
  }

  void CheckSecrets(const std::string& text) const {
    for (const char* secret : kSecrets) {
      Require(!IsHolding(text, secret) || told_, "no secrets are shown");
    }
    Require(account_ == 1 || IsAdministrator() || !IsHolding(text, kBobs) || told_,
            "only Bob is shown what is Bob's");
    const std::string digests = fuzz::Column(
        "SELECT json_extract(data, '$.protect_password') AS c FROM entry WHERE json_valid(data) "
        "AND length(json_extract(data, '$.protect_password')) >= 32");
    for (const std::string& digest : LinesOf(digests)) {
      Require(!IsHolding(text, digest) || IsHolding(input_, digest), "no digests are shown");
    }
  }

  State before_;
  State after_;
  std::string input_;
  std::size_t account_ = 0;
  webapi::Call call_;
  bool done_ = false;
  bool told_;
};

bool TellsSecrets(const std::string& text) {
  // With escapes a text can say a word without holding it.
  return IsHolding(text, kBobs) || IsHolding(text, "\\u") || IsHolding(text, "%") ||
         std::any_of(kSecrets.begin(), kSecrets.end(),
                     [&text](const char* secret) { return IsHolding(text, secret); });
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  constexpr int kMostRequests = 8;
  State state = Begin();
  fuzz::Lines lines(data, size);
  bool told = false;
  for (int i = 0; i < kMostRequests && !lines.AtEnd(); ++i) {
    const std::size_t account = lines.Choice(kAccounts.size() + 1);
    const std::size_t way = lines.Choice(3);
    const std::string input = lines.Text();
    told = told || TellsSecrets(input);
    state = Exchange(std::move(state), input, told).Run(account, way);
  }
  return 0;
}
