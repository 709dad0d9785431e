#include "visitor/events.h"

#include <tuvosharing/result.h>
#include <tuvosharing/row.h>
#include <tuvosharing/sharing_db.h>

#include "common/client_address.h"
#include "common/event_log.h"

namespace visitor {

namespace {

using TUVO::sharing::db::Result;
using TUVO::sharing::db::Row;
using TUVO::sharing::db::SharingDB;

constexpr int kAddressLockedOut = -8;

// Whoever may read the log is not to open links: they are named by their row.
// Asked for by itself: a row that does not load as a link has a number, too.
int RowOf(const std::string& hash) {
  SharingDB& db = SharingDB::Instance();
  Result result;
  Row row;
  if (!db.IsGood() ||
      !db.Execute("SELECT id FROM entry WHERE hash = '" + db.Escape(hash) + "'", result) ||
      !result.NextRow(row)) {
    return 0;
  }
  return row.GetField("id").AsInt(0);
}

void Log(const char* name, int link, int result) {
  common::LogEvent({name, link, common::ClientAddress(), result, {}});
}

}  // namespace

void LogLogin(const std::string& hash, int code) {
  Log(code == kAddressLockedOut ? "refusal" : "login", RowOf(hash), code);
}

void LogRefusal(const std::string& hash, int code) {
  Log("refusal", RowOf(hash), code);
}

void LogDownload(int link, bool whole) {
  Log("download", link, whole ? 1 : 0);
}

void LogLogout(const std::string& hash, bool ended) {
  Log("logout", RowOf(hash), ended ? 1 : 0);
}

}  // namespace visitor
