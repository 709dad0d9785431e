#include "visitor/events.h"

#include "common/client_address.h"
#include "common/event_log.h"
#include "visitor/link.h"

namespace visitor {

namespace {

constexpr int kAddressLockedOut = -8;

// Whoever may read the log is not to open links: they are named by their row.
int RowOf(const std::string& hash) {
  TUVO::sharing::record::Entry entry;
  return LoadLink(hash, &entry) ? entry.get_id() : 0;
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
