// The exported auto-block functions.
#include <syslog.h>
#include <tuvoplatform/auto_block.h>
#include <unistd.h>

#include <cstring>
#include <exception>
#include <functional>
#include <optional>
#include <stdexcept>
#include <string>

#include "auto_block_config.h"
#include "auto_block_store.h"
#include "client_address.h"
#include "scoped_identity.h"

namespace {

using tuvo_platform::AutoBlockStore;

constexpr char kStorePath[] = "/usr/tuvo/etc/private/session/autoblock.db";
constexpr char kConfigPath[] = "/usr/tuvo/etc/autoblock.conf";
constexpr uid_t kRootUid = 0;
constexpr uid_t kSystemUid = 1;
constexpr gid_t kSystemGid = 1;
constexpr size_t kMaxServiceName = 64;

// Runs `work` on the store with the network that `ip` stands for, as the system's own user, whom
// the file belongs to whichever program comes first. Returns what `work` returned; -1, with one
// line logged for `line`, when it threw.
int WithStore(const char* ip, int line,
              const std::function<int(AutoBlockStore*, const std::string&)>& work) {
  try {
    const std::optional<std::string> network = tuvo_platform::VisitorNetwork(ip);
    if (!network) {
      throw std::invalid_argument("not an address");
    }
    // A process that cannot switch tries as it is, and the file's permissions decide; root's file
    // would be closed to everybody else.
    const tuvo_platform::ScopedIdentity system(kSystemUid, kSystemGid);
    if (!system.ok() && geteuid() == kRootUid) {
      throw std::runtime_error("cannot become the system's user");
    }
    AutoBlockStore store(kStorePath);
    return work(&store, *network);
  } catch (const std::exception& error) {
    syslog(LOG_ERR, "auto_block:%d %s", line, error.what());
    return -1;
  }
}

bool IsServiceName(const char* service) {
  return service != nullptr && *service != '\0' &&
         strnlen(service, kMaxServiceName + 1) <= kMaxServiceName;
}

}  // namespace

int AutoBlockFailLoginSet(const char* ip, const char* service) {
  return WithStore(ip, __LINE__, [service](AutoBlockStore* store, const std::string& network) {
    if (!IsServiceName(service)) {
      throw std::invalid_argument("not a service's name");
    }
    store->CountFailure(network, service, tuvo_platform::ReadAutoBlockLimits(kConfigPath));
    return 0;
  });
}

int TUVOAutoBlockFailLoginReset(const char* ip) {
  return WithStore(ip, __LINE__, [](AutoBlockStore* store, const std::string& network) {
    store->Forget(network);
    return 0;
  });
}

int TuvoCgiIsDeniedIP(const char* ip) {
  return WithStore(ip, __LINE__, [](AutoBlockStore* store, const std::string& network) {
    return store->IsDenied(network) ? 1 : 0;
  });
}
