// tuvosharing unblock
#include <arpa/inet.h>
#include <tuvoplatform/auto_block.h>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/failure.h"

namespace cli {

namespace {

bool IsAddress(const std::string& text) {
  in6_addr address{};
  return inet_pton(AF_INET, text.c_str(), &address) == 1 ||
         inet_pton(AF_INET6, text.c_str(), &address) == 1;
}

ExitStatus UnblockAll(const UnblockOptions& options) {
  for (const std::string& address : options.addresses) {
    if (!IsAddress(address)) {
      throw Failure(ExitStatus::kUsage, address + ": is no address");
    }
  }
  for (const std::string& address : options.addresses) {
    const bool done = TUVOAutoBlockFailLoginReset(address.c_str()) == 0;
    LogChange("unblock", 0, done ? std::nullopt : owner::InternalFault());
    if (!done) {
      throw Failure(ExitStatus::kFailed,
                    address + ": could not be let in again; the system log says why");
    }
  }
  return ExitStatus::kDone;
}

}  // namespace

ExitStatus Unblock(const UnblockOptions& options) {
  return LogRefusal("unblock", [&options] { return UnblockAll(options); });
}

}  // namespace cli
