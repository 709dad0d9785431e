// The exported CGI functions, but for the account login (cgi_login.cpp).
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <optional>
#include <string>
#include <string_view>

#include "cgi_request.h"
#include "client_address.h"
#include "cookie_queue.h"

namespace {

using tuvo_platform::CgiRequest;
using tuvo_platform::CookieQueue;

constexpr int kSuccess = 1;
constexpr int kFailure = -1;

std::optional<std::string_view> RealEnvironment(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? std::nullopt : std::optional<std::string_view>(value);
}

size_t ReadStandardInput(char* data, size_t length) {
  ssize_t count = 0;
  do {
    count = read(STDIN_FILENO, data, length);
  } while (count < 0 && errno == EINTR);
  return count < 0 ? 0 : static_cast<size_t>(count);
}

// A failure is as final as a success: the body can be read only once.
std::optional<CgiRequest> ReadRequest() {
  try {
    return tuvo_platform::ParseCgiRequest(RealEnvironment, ReadStandardInput);
  } catch (const std::exception&) {
    return std::nullopt;
  }
}

// This process's request, nothing when it was refused. Never destroyed: its texts are promised
// until the process ends, and other objects' destructors may still look at them.
std::optional<CgiRequest>& TheRequest() {
  static auto& request = *new std::optional<CgiRequest>(ReadRequest());
  return request;
}

// The process's queue and not a context's: a library may set a cookie in a context of its own,
// which is gone by the time the program sends its headers.
CookieQueue& TheQueue() {
  static auto& queue = *new CookieQueue;
  return queue;
}

const CgiRequest* RequestOf(const TUVOCGI* cgi) {
  return cgi == nullptr ? nullptr : static_cast<const CgiRequest*>(cgi->request);
}

}  // namespace

int TuvoCgiInit(const char* /*name*/, TUVOCGI* cgi) {
  if (cgi == nullptr) {
    return kFailure;
  }
  *cgi = TUVOCGI{};
  try {
    // cppcheck-suppress constVariable  ; its address goes where no const pointer does
    std::optional<CgiRequest>& request = TheRequest();
    if (!request) {
      return kFailure;
    }
    cgi->request = &*request;
    return kSuccess;
  } catch (const std::exception&) {
    return kFailure;
  }
}

int TuvoCgiLoadInCookies(TUVOCGI* cgi) {
  if (RequestOf(cgi) == nullptr) {
    return kFailure;
  }
  cgi->cookies_loaded = 1;
  return kSuccess;
}

const char* TuvoCgiGetRequestParam(const TUVOCGI* cgi, const char* name) {
  const CgiRequest* request = RequestOf(cgi);
  if (request == nullptr || name == nullptr) {
    return nullptr;
  }
  return tuvo_platform::FindCgiField(request->fields, name);
}

const char* TuvoCgiGetCookie(const TUVOCGI* cgi, const char* name) {
  const CgiRequest* request = RequestOf(cgi);
  if (request == nullptr || name == nullptr || cgi->cookies_loaded == 0) {
    return nullptr;
  }
  return tuvo_platform::FindCgiField(request->cookies, name);
}

int TuvoCgiSetCookies(TUVOCGI* cgi, const char* name, const char* value, const char* path) {
  if (RequestOf(cgi) == nullptr || name == nullptr || value == nullptr || path == nullptr) {
    return kFailure;
  }
  try {
    return TheQueue().Set(name, value, path) ? kSuccess : kFailure;
  } catch (const std::exception&) {
    return kFailure;
  }
}

int TuvoCgiWriteCookies(TUVOCGI* cgi, const char* name, FILE* out) {
  const CgiRequest* request = RequestOf(cgi);
  if (request == nullptr || out == nullptr) {
    return kFailure;
  }
  try {
    return TheQueue().Write(name, request->https, out);
  } catch (const std::exception&) {
    return kFailure;
  }
}

int TuvoCgiGetRemoteIP(char* ip, unsigned int size) {
  if (ip == nullptr) {
    return kFailure;
  }
  try {
    const std::optional<std::string> address =
        tuvo_platform::CanonicalAddress(std::getenv("REMOTE_ADDR"));
    if (!address || address->size() >= size) {
      return kFailure;
    }
    std::memcpy(ip, address->c_str(), address->size() + 1);
    return 0;
  } catch (const std::exception&) {
    return kFailure;
  }
}

void TuvoCgiFree(TUVOCGI* cgi) {
  if (cgi != nullptr) {
    *cgi = TUVOCGI{};
  }
}
