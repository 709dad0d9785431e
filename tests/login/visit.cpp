#include "login/visit.h"

#include <json/value.h>
#include <sys/mman.h>
#include <syslog.h>
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/sharing_db.h>

#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>
#include <regex>
#include <stdexcept>

#include "support/source_line.h"

namespace tuvo_test {

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::record::Entry;

constexpr char kService[] = "SHARING";

// Where the child leaves what came of its request; shared with the parent.
struct Slot {
  bool finished;
  int code;
  char session_id[128];
};

struct Unmap {
  void operator()(Slot* slot) const { munmap(slot, sizeof *slot); }
};

std::unique_ptr<Slot, Unmap> NewSlot() {
  void* memory =
      mmap(nullptr, sizeof(Slot), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
  if (memory == MAP_FAILED) {
    throw std::runtime_error("mmap");
  }
  return std::unique_ptr<Slot, Unmap>(new (memory) Slot{});
}

const char* OrNull(const std::optional<std::string>& text) {
  return text ? text->c_str() : nullptr;
}

bool IsAboutIdentity(const LogLine& line) {
  return line.text.find("ERROR: ") != std::string::npos;
}

// Whether a line of the login API names the line of its source that writes this message: messages
// stand there once, and hold digits only where an address is filled in.
bool NamesItsOwnLine(const std::string& line, const std::string& message) {
  const std::string beginning = message.substr(0, message.find_first_of("0123456789"));
  return line == std::to_string(SourceLine("login/sharinglogin.cpp", "SHARING_LOG(\"" + beginning));
}

std::string WithoutChangingParts(std::string text) {
  std::smatch own;
  if (std::regex_match(text, own, std::regex(R"(sharinglogin:(\d+) ([^]*))")) &&
      !NamesItsOwnLine(own[1], own[2])) {
    return text;  // with its number, and so like no line that a test expects
  }
  text = std::regex_replace(text, std::regex(R"(^(\w+):\d+ )"), "$1:LINE ");
  text = std::regex_replace(text, std::regex(R"(^(\w+:LINE )\(\d+\))"), "$1(PID)");
  return std::regex_replace(text, std::regex(R"(err=[^\n]+)"), "err=ERRNO");
}

}  // namespace

Visit& Visit::Password(const std::string& password) {
  password_ = password;
  return *this;
}

Visit& Visit::Account(const std::string& name, const std::string& password) {
  zor_username_ = name;
  zor_password_ = password;
  return *this;
}

Visit& Visit::AccountName(const std::string& name) {
  zor_username_ = name;
  return *this;
}

Visit& Visit::Session(const std::string& session_id) {
  sharing_sid_ = session_id;
  return *this;
}

Visit& Visit::From(const std::string& address) {
  return Environment("REMOTE_ADDR", address);
}

Visit& Visit::FromNowhere() {
  environment_.erase("REMOTE_ADDR");
  return *this;
}

Visit& Visit::Environment(const std::string& name, const std::string& value) {
  environment_[name] = value;
  return *this;
}

Visit& Visit::Query(const std::string& query) {
  return Environment("REQUEST_METHOD", "GET").Environment("QUERY_STRING", query);
}

Visit& Visit::As(const Ids& ids) {
  ids_ = ids;
  return *this;
}

_tag_sharing_login_params Visit::Params() const {
  return {OrNull(sharing_id_), OrNull(password_), OrNull(zor_username_), OrNull(zor_password_),
          OrNull(sharing_sid_)};
}

void Visit::EnterEnvironment() const {
  clearenv();
  for (const auto& [name, value] : environment_) {
    setenv(name.c_str(), value.c_str(), 1);
  }
}

VisitTest::VisitTest() {
  for (const auto& file : std::filesystem::directory_iterator(kFolder)) {
    std::filesystem::remove(file.path());
  }
  std::filesystem::remove(kMovedDatabase);
}

std::string VisitTest::MakeLink(const std::function<void(Entry&)>& change) {
  SharingDB db;
  EntryDB entries(db);
  Entry entry;
  entry.set_project_name("photo").set_owner_uid(kAlice).set_app(Json::Value(Json::objectValue));
  change(entry);
  if (!entries.CreateWithHash(entry)) {
    throw std::runtime_error("no link: " + db.GetLastError());
  }
  return entry.get_hash();
}

std::string VisitTest::MakePasswordLink() {
  return MakeLink([](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_PASSWORD);
    entry.set_protect_password("sesame", true, Entry::ENCRYPT_ALGO_DEFAULT);
  });
}

std::string VisitTest::MakeAccountLink(const std::vector<unsigned int>& gids) {
  return MakeLink([&](Entry& entry) {
    entry.set_protect_type(Entry::PROTECT_USER).set_protect_uids({kAlice}).set_protect_gids(gids);
  });
}

Reply VisitTest::Login(const Visit& visit, bool skip_autoblock) {
  return Run(visit, [&](std::string& session_id) {
    _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingLogin(session_id, &params, skip_autoblock);
  });
}

Reply VisitTest::Check(const Visit& visit) {
  return Run(visit, [&](std::string&) {
    const _tag_sharing_login_params params = visit.Params();
    return TUVO::TuvoSharingIsAuthorized(&params);
  });
}

Reply VisitTest::Logout(const std::string& hash, const std::string& session_id, const Ids& ids) {
  return Run(Visit().As(ids),
             [&](std::string&) { return TUVO::TuvoSharingLogout(hash, session_id) ? 1 : 0; });
}

Reply VisitTest::CountUse(const std::string& hash, const Ids& ids) {
  return Run(Visit().As(ids),
             [&](std::string&) { return TUVO::TuvoSharingIncreaseUseCount(hash) ? 1 : 0; });
}

Reply VisitTest::Run(const Visit& visit,
                     const std::function<int(std::string& session_id)>& operation) {
  TakeLog();
  const auto slot = NewSlot();
  EXPECT_EQ(0, RunInChildAs(visit.ids(), [&] {
              visit.EnterEnvironment();
              std::string session_id = kUntouched;
              slot->code = operation(session_id);
              EXPECT_EQ(ToText(visit.ids()), ToText(CurrentIds()));
              EXPECT_LT(session_id.size(), sizeof slot->session_id);
              std::strncpy(slot->session_id, session_id.c_str(), sizeof slot->session_id - 1);
              slot->finished = true;
              return 0;
            }));
  EXPECT_TRUE(slot->finished);
  return {slot->code, slot->session_id, TakeLog()};
}

std::string VisitTest::LoggedIn(const Visit& visit) {
  const Reply reply = Login(visit);
  if (reply.code != 1) {
    throw std::runtime_error("the login answered " + std::to_string(reply.code));
  }
  return reply.session_id;
}

Lines VisitTest::TakeLog() {
  Lines lines;
  for (const LogLine& line : syslog_.Take()) {
    if (line.facility == LOG_AUTHPRIV) {
      continue;
    }
    lines.push_back(WithoutChangingParts(line.text));
    if (!IsAboutIdentity(line)) {
      EXPECT_EQ(LOG_USER, line.facility) << line.text;
      EXPECT_EQ(LOG_ERR, line.priority) << line.text;
    }
  }
  return lines;
}

std::vector<TextRow> VisitTest::Rows(const std::string& sql) {
  return SqliteFile(kDatabase).Rows(sql);
}

std::string VisitTest::Value(const std::string& sql) {
  return SqliteFile(kDatabase).Value(sql);
}

void VisitTest::Change(const std::string& sql) {
  SqliteFile(kDatabase).Execute(sql);
}

void VisitTest::Break(const std::string& operation, const std::string& table) {
  Change("CREATE TRIGGER broken_" + operation + "_" + table + " BEFORE " + operation + " ON " +
         table + " BEGIN SELECT RAISE(ABORT, 'broken'); END");
}

int VisitTest::FailedLogins(const std::string& address) {
  if (!std::filesystem::exists(kAutoBlock)) {
    return 0;
  }
  return std::stoi(SqliteFile(kAutoBlock)
                       .Value("SELECT COUNT(*) FROM failure WHERE network = '" + address +
                              "' AND service = '" + kService + "'"));
}

void VisitTest::FailLogins(int count, const std::string& address) {
  for (int i = 0; i < count; ++i) {
    ASSERT_EQ(0, AutoBlockFailLoginSet(address.c_str(), kService));
  }
}

void InChild(const std::function<void()>& body) {
  EXPECT_EQ(0, RunInChild([&] {
              body();
              return 0;
            }));
}

void ExpectDayAfter(std::time_t before, const std::string& timeout) {
  EXPECT_GE(std::stol(timeout), before + kDay);
  EXPECT_LE(std::stol(timeout), std::time(nullptr) + kDay);
}

}  // namespace tuvo_test
