#include "common/event_log.h"

#include <syslog.h>

#include <algorithm>

namespace common {

namespace {

// Those of addresses, and of the word "local".
bool IsAddressCharacter(char c) {
  return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'z') || c == '.' || c == ':';
}

// Only the web server writes addresses; should that ever be otherwise, a line stays one line of
// these fields.
const char* AddressText(const std::string& address) {
  const bool fit = !address.empty() && address.size() <= 64 &&
                   std::all_of(address.begin(), address.end(), IsAddressCharacter);
  return fit ? address.c_str() : "-";
}

}  // namespace

void LogEvent(const Event& event) {
  const std::string by = event.by ? " by=" + std::to_string(*event.by) : "";
  syslog(LOG_INFO, "sharing event=%s link=%d address=%s result=%d%s", event.name, event.link,
         AddressText(event.address), event.result, by.c_str());
}

}  // namespace common
