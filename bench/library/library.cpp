// The library, measured as a client of its public headers.
#include <malloc.h>
#include <tuvosharing/entry_db.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/login.h>
#include <tuvosharing/session_db.h>
#include <tuvosharing/sharing_db.h>
#include <tuvosharing/token_db.h>

#include <cstdlib>
#include <string>
#include <vector>

#include "common/content.h"
#include "common/measure.h"

namespace {

using TUVO::sharing::db::EntryDB;
using TUVO::sharing::db::SessionDB;
using TUVO::sharing::db::SharingDB;
using TUVO::sharing::db::TokenDB;
using TUVO::sharing::record::Entry;

constexpr int kSuccess = 1;
constexpr float kCertainly = 1.0F;

int Status(bool done) {
  return done ? 0 : -1;
}

std::string HashOf(const bench_target* target) {
  char hash[BENCH_HASH_SIZE];
  bench_hash(target->link, hash);
  return hash;
}

std::string SessionOf(const bench_target* target) {
  char session[BENCH_SESSION_SIZE];
  bench_session(target->link, session);
  return session;
}

int Check(const bench_target* target) {
  const std::string hash = HashOf(target);
  const std::string session = SessionOf(target);
  _tag_sharing_login_params params{};
  params.sharing_id = hash.c_str();
  params.sharing_sid = session.c_str();
  return Status(TUVO::TuvoSharingIsAuthorized(&params) == kSuccess);
}

int Login(const bench_target* target, const char* password) {
  const std::string hash = HashOf(target);
  _tag_sharing_login_params params{};
  params.sharing_id = hash.c_str();
  params.password = password;
  std::string session;
  return Status(TUVO::TuvoSharingLogin(session, &params, false) == kSuccess);
}

int LoginOpen(const bench_target* target) {
  return Login(target, nullptr);
}

int LoginPassword(const bench_target* target) {
  return Login(target, BENCH_PASSWORD);
}

int CountUse(const bench_target* target) {
  return Status(TUVO::TuvoSharingIncreaseUseCount(HashOf(target)));
}

int Logout(const bench_target* target) {
  return Status(TUVO::TuvoSharingLogout(HashOf(target), SessionOf(target)));
}

int Create(const bench_target* target) {
  EntryDB entries(SharingDB::Instance());
  Json::Value app(Json::objectValue);
  app["path"] = "/exports/public/report.pdf";
  Entry entry;
  entry.set_project_name(BENCH_PROJECT);
  entry.set_owner_uid(bench_owner(target->turn, target->links));
  entry.set_app(app);
  return Status(entries.CreateWithHash(entry));
}

int Page(const bench_target* target) {
  const EntryDB entries(SharingDB::Instance());
  entries.GetCondition().Where(TUVO::sharing::SZK_OWNER_UID,
                               std::to_string(bench_owner(target->link, target->links)));
  entries.GetCondition().OrderBy(TUVO::sharing::SZK_ID_, true);
  entries.GetCondition().Page(3, 50);
  std::vector<Entry> page;
  return Status(entries.Query(page) && page.size() == 50);
}

uint64_t HeapBytes() {
  const struct mallinfo2 heap = mallinfo2();
  return heap.uordblks + heap.hblkhd;
}

int Query(const bench_target* target) {
  const EntryDB entries(SharingDB::Instance());
  std::vector<Entry> all;
  if (!entries.Query(all) || all.size() != target->links) {
    return -1;
  }
  // What the records take is what their end gives back.
  const uint64_t with_records = HeapBytes();
  std::vector<Entry>().swap(all);
  bench_kept_bytes = with_records - HeapBytes();
  return 0;
}

int PurgeEntries(const bench_target* /*target*/) {
  return Status(EntryDB(SharingDB::Instance()).PurgeExpired(kCertainly));
}

int PurgeSessions(const bench_target* /*target*/) {
  return Status(SessionDB(SharingDB::Instance()).PurgeExpired(kCertainly));
}

int PurgeTokens(const bench_target* /*target*/) {
  return Status(TokenDB(SharingDB::Instance()).PurgeExpired(kCertainly));
}

constexpr bench_row kRows[] = {
    {"check", BENCH_ANY, BENCH_OPEN, Check},
    {"login_open", BENCH_ANY, BENCH_OPEN, LoginOpen},
    {"login_password", BENCH_ANY, BENCH_WITH_PASSWORD, LoginPassword},
    {"count_use", BENCH_ANY, BENCH_OPEN, CountUse},
    {"logout", BENCH_EACH_ONCE, BENCH_OPEN, Logout},
    {"create", BENCH_ANY, BENCH_OPEN, Create},
    {"page", BENCH_ANY, BENCH_OPEN, Page},
    {"query", BENCH_ANY, BENCH_OPEN, Query},
    {"purge_entries", BENCH_ANY, BENCH_OPEN, PurgeEntries},
    {"purge_sessions", BENCH_ANY, BENCH_OPEN, PurgeSessions},
    {"purge_tokens", BENCH_ANY, BENCH_OPEN, PurgeTokens},
    {nullptr, BENCH_ANY, BENCH_OPEN, nullptr},
};

int Prepare() {
  return Status(setenv("REMOTE_ADDR", BENCH_ADDRESS, 1) == 0 && SharingDB::Instance().IsGood());
}

}  // namespace

int main(int argc, char** argv) {
  return bench_main(argc, argv, kRows, Prepare);
}
