#include "cookie_queue.h"

#include <algorithm>

namespace tuvo_platform {

namespace {

constexpr std::string_view kNotInTokens = "()<>@,;:\\\"/[]?={}";
constexpr std::string_view kNotInValues = "\",;\\";

bool IsPrintableAscii(char c) {
  return c > ' ' && c < '\x7f';
}

bool HoldsOnlyPrintableBut(std::string_view text, std::string_view excluded) {
  return std::all_of(text.begin(), text.end(), IsPrintableAscii) &&
         text.find_first_of(excluded) == std::string_view::npos;
}

bool IsPath(std::string_view text) {
  return !text.empty() && text.front() == '/' && std::all_of(text.begin(), text.end(), [](char c) {
    return (c == ' ' || IsPrintableAscii(c)) && c != ';';
  });
}

}  // namespace

bool CookieQueue::Set(std::string_view name, std::string_view value, std::string_view path) {
  if (name.empty() || !HoldsOnlyPrintableBut(name, kNotInTokens) ||
      !HoldsOnlyPrintableBut(value, kNotInValues) || !IsPath(path)) {
    return false;
  }
  const auto same = std::find_if(cookies_.begin(), cookies_.end(), [&](const Cookie& cookie) {
    return cookie.name == name && cookie.path == path;
  });
  if (same != cookies_.end()) {
    same->value = value;
  } else {
    cookies_.push_back({std::string(name), std::string(value), std::string(path)});
  }
  return true;
}

int CookieQueue::Write(const char* name, bool secure, std::FILE* out) {
  const auto wanted = [name](const Cookie& cookie) {
    return name == nullptr || cookie.name == name;
  };
  int count = 0;
  for (const Cookie& cookie : cookies_) {
    if (!wanted(cookie)) {
      continue;
    }
    if (std::fprintf(out, "Set-Cookie: %s=%s; Path=%s; HttpOnly; SameSite=Lax%s\r\n",
                     cookie.name.c_str(), cookie.value.c_str(), cookie.path.c_str(),
                     secure ? "; Secure" : "") < 0) {
      return -1;
    }
    ++count;
  }
  // Flushed, because an error would otherwise show only after the cookies are forgotten.
  if (std::fflush(out) != 0) {
    return -1;
  }
  cookies_.erase(std::remove_if(cookies_.begin(), cookies_.end(), wanted), cookies_.end());
  return count;
}

}  // namespace tuvo_platform
