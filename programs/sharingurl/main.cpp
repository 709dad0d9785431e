// tuvosharingurl: prints the full address of a link, and where its beginning is from.
#include <fcntl.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <cstring>
#include <exception>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "common/arguments.h"
#include "common/config.h"
#include "common/process_start.h"
#include "sharingurl/address.h"
#include "sharingurl/own_name.h"
#include "sharingurl/request.h"

namespace {

using sharingurl::Address;
using sharingurl::Request;

constexpr int kFailed = 1;
constexpr int kMisused = 2;

constexpr char kUsage[] =
    "Usage: tuvosharingurl PROJECT PORT HTTPS ADDRESS HASH\n"
    "Prints the full address of the link HASH and, on a second line, where it is from.\n\n"
    "  PROJECT  the application that the link belongs to\n"
    "  PORT     0 to 65535; 0 is the usual one\n"
    "  HTTPS    1 for https, 0 for http\n"
    "  ADDRESS  host or address to use instead of the configured one, or an empty text\n"
    "  HASH     the random part of the link's address\n\n"
    "See tuvosharingurl(1).\n";

// The numbers that programs know.
enum Origin { kOwn = 0, kConfigured = 1, kGiven = 2 };

struct Beginning {
  Address address;
  Origin origin;  // cppcheck-suppress unusedStructMember  ; Answer prints it
};

void Complain(const std::string& text) {
  // There is no other place to complain about a failure here.
  static_cast<void>(std::fprintf(stderr, "tuvosharingurl: %s\n", text.c_str()));
}

std::optional<Address> ConfiguredAddress() {
  const std::string text = common::ReadExternalAddress();
  if (text.empty()) {
    return std::nullopt;
  }
  std::optional<Address> address = sharingurl::ReadAddress(text);
  if (!address) {
    syslog(LOG_WARNING, "sharingurl:%d external_address in %s is no address", __LINE__,
           common::kConfigPath);
  }
  return address;
}

// Nothing when the machine has no name at all.
std::optional<Beginning> FindBeginning(const Request& request) {
  if (request.instead) {
    return Beginning{*request.instead, kGiven};
  }
  if (const std::optional<Address> configured = ConfiguredAddress(); configured) {
    return Beginning{*configured, kConfigured};
  }
  Address own;
  own.host = sharingurl::OwnName();
  if (own.host.empty()) {
    return std::nullopt;
  }
  return Beginning{own, kOwn};
}

int Answer(const Request& request) {
  const std::optional<Beginning> beginning = FindBeginning(request);
  if (!beginning) {
    Complain("this machine has no name that can stand in an address");
    return kFailed;
  }
  const std::string address =
      sharingurl::LinkAddress(beginning->address, request.https, request.port, request.hash);
  if (std::printf("%s\n%d\n", address.c_str(), beginning->origin) < 0 || std::fflush(stdout) != 0) {
    Complain(std::string("cannot write the address: ") + std::strerror(errno));
    return kFailed;
  }
  return 0;
}

// The arguments behind the program's name, and nothing of them left where it was: everybody on the
// machine can read that in /proc, and the hash is all that a stranger needs to open the link.
std::vector<std::string> TakeArguments(int count, char** arguments) {
  std::vector<std::string> taken(arguments + (count > 0 ? 1 : 0), arguments + count);
  common::WipeArguments(count, arguments);
  return taken;
}

int Run(const std::vector<std::string>& arguments) {
  if (arguments.size() == 1 && arguments[0] == "--help") {
    return std::fputs(kUsage, stdout) < 0 || std::fflush(stdout) != 0 ? kFailed : 0;
  }
  const std::variant<Request, std::string> request = sharingurl::ReadRequest(arguments);
  if (const std::string* problem = std::get_if<std::string>(&request); problem != nullptr) {
    Complain(*problem + " (tuvosharingurl --help tells more)");
    return kMisused;
  }
  return Answer(std::get<Request>(request));
}

}  // namespace

int main(int count, char** arguments) {
  try {
    const std::vector<std::string> taken = TakeArguments(count, arguments);
    const bool has_output = fcntl(STDOUT_FILENO, F_GETFD) >= 0;
    if (!common::StartProcess() || !has_output) {
      Complain("the standard output is closed");
      return kFailed;
    }
    return Run(taken);
  } catch (const std::exception& error) {
    Complain(error.what());
    return kFailed;
  }
}
