#include "sharingurl/request.h"

#include <algorithm>

#include "common/hash_text.h"

namespace sharingurl {

namespace {

constexpr size_t kProject = 0;
constexpr size_t kPort = 1;
constexpr size_t kHttps = 2;
constexpr size_t kInstead = 3;
constexpr size_t kHash = 4;
constexpr size_t kCount = 5;

bool HasControlCharacter(const std::string& text) {
  return std::any_of(text.begin(), text.end(),
                     [](char c) { return static_cast<unsigned char>(c) < 0x20 || c == 0x7f; });
}

}  // namespace

// The messages show none of what was given: it may be anything, and they may end up in a log.
std::variant<Request, std::string> ReadRequest(const std::vector<std::string>& arguments) {
  if (arguments.size() != kCount) {
    return "five arguments are needed";
  }
  if (HasControlCharacter(arguments[kProject])) {
    return "the project has a control character in its name";
  }
  const std::optional<int> port = ReadPort(arguments[kPort], true);
  if (!port) {
    return "the port is none of 0 to 65535";
  }
  const std::string& https = arguments[kHttps];
  if (https != "0" && https != "1") {
    return "the third argument is neither 0 nor 1";
  }
  std::optional<Address> instead;
  if (!arguments[kInstead].empty()) {
    instead = ReadAddress(arguments[kInstead]);
    if (!instead) {
      return "the fourth argument is neither empty nor a host or address";
    }
  }
  if (!common::IsHashText(arguments[kHash])) {
    return "the hash is not 3 to 64 letters, digits, - and _";
  }
  return Request{*port, https == "1", instead, arguments[kHash]};
}

}  // namespace sharingurl
