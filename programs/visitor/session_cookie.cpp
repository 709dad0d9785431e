#include "visitor/session_cookie.h"

#include <tuvosharing/keys.h>

#include <cstdio>
#include <cstdlib>
#include <memory>

#include "visitor/route.h"

namespace visitor {

bool QueueSessionCookie(TUVOCGI* cgi, const std::string& session_id) {
  return TuvoCgiSetCookies(cgi, TUVO::sharing::SZK_SHARING_SID, session_id.c_str(),
                           std::string(kMountPath).c_str()) == 1;
}

std::optional<std::string> SessionCookieLine(TUVOCGI* cgi) {
  char* data = nullptr;
  size_t size = 0;
  std::FILE* text = open_memstream(&data, &size);
  if (text == nullptr) {
    return std::nullopt;
  }
  const bool written = TuvoCgiWriteCookies(cgi, TUVO::sharing::SZK_SHARING_SID, text) >= 0;
  const bool closed = std::fclose(text) == 0;
  const std::unique_ptr<char, decltype(&std::free)> owner(data, std::free);
  if (!written || !closed) {
    return std::nullopt;
  }
  return std::string(data, size);
}

}  // namespace visitor
