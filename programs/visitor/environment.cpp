#include "visitor/environment.h"

#include <array>
#include <cstdlib>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace visitor {

namespace {

constexpr std::array<const char*, 15> kKept = {
    "REQUEST_METHOD",
    "PATH_INFO",
    "QUERY_STRING",
    "CONTENT_TYPE",
    "CONTENT_LENGTH",
    "REMOTE_ADDR",
    "HTTPS",
    "HTTP_COOKIE",
    "HTTP_RANGE",
    "HTTP_IF_RANGE",
    "HTTP_IF_MATCH",
    "HTTP_IF_NONE_MATCH",
    "HTTP_IF_MODIFIED_SINCE",
    "HTTP_IF_UNMODIFIED_SINCE",
    "HTTP_SEC_FETCH_SITE",
};

}  // namespace

bool KeepOnlyRequestVariables() {
  std::vector<std::pair<const char*, std::string>> kept;
  for (const char* name : kKept) {
    if (const char* value = std::getenv(name)) {
      kept.emplace_back(name, value);
    }
  }
  if (clearenv() != 0) {
    return false;
  }
  for (const auto& [name, value] : kept) {
    if (setenv(name, value.c_str(), 1) != 0) {
      return false;
    }
  }
  const char* method = std::getenv("REQUEST_METHOD");
  return method == nullptr || std::string_view(method) != "POST" || unsetenv("QUERY_STRING") == 0;
}

}  // namespace visitor
