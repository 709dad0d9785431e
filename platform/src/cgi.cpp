// The exported CGI functions, but for the account login (cgi_login.cpp).
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <exception>
#include <new>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

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

size_t ReadStandardInput(void* /*context*/, char* data, size_t length) {
  ssize_t count = 0;
  do {
    count = read(STDIN_FILENO, data, length);
  } while (count < 0 && errno == EINTR);
  return count < 0 ? 0 : static_cast<size_t>(count);
}

// What the process knows of the request it serves.
struct Turn {
  TuvoCgiBodyReader read = ReadStandardInput;
  void* context = nullptr;
  bool was_read = false;
  std::optional<CgiRequest> request;  // nothing when it was refused
  // The process's and not a context's: a library may set a cookie in a context of its own, which is
  // gone by the time the program sends its headers.
  CookieQueue queue;
};

// Never destroyed: other objects' destructors may still look at its texts. Made without the heap,
// so that it is always there.
Turn& TheTurn() {
  alignas(Turn) static std::array<unsigned char, sizeof(Turn)> place;
  static Turn& turn = *new (place.data()) Turn;
  return turn;
}

std::optional<CgiRequest> ReadRequest(const Turn& turn) {
  try {
    return tuvo_platform::ParseCgiRequest(RealEnvironment, [&turn](char* data, size_t length) {
      return turn.read(turn.context, data, length);
    });
  } catch (const std::exception&) {
    return std::nullopt;
  }
}

// A failure is as final as a success: the body can be read only once.
std::optional<CgiRequest>& TheRequest() {
  Turn& turn = TheTurn();
  if (!turn.was_read) {
    turn.was_read = true;
    turn.request = ReadRequest(turn);
  }
  return turn.request;
}

CookieQueue& TheQueue() {
  return TheTurn().queue;
}

// Passwords and session identifiers of one visitor have no business in the memory that the next
// one's request is read into.
void Overwrite(std::vector<tuvo_platform::CgiField>* fields) {
  for (tuvo_platform::CgiField& field : *fields) {
    explicit_bzero(field.second.data(), field.second.size());
  }
}

const CgiRequest* RequestOf(const TUVOCGI* cgi) {
  return cgi == nullptr ? nullptr : static_cast<const CgiRequest*>(cgi->request);
}

}  // namespace

void TuvoCgiNextRequest(TuvoCgiBodyReader read, void* context) {
  Turn& turn = TheTurn();
  if (turn.request) {
    Overwrite(&turn.request->fields);
    Overwrite(&turn.request->cookies);
  }
  turn.request.reset();
  turn.queue = CookieQueue();
  turn.was_read = false;
  turn.read = read == nullptr ? ReadStandardInput : read;
  turn.context = context;
}

int TuvoCgiInit(const char* /*name*/, TUVOCGI* cgi) {
  if (cgi == nullptr) {
    return kFailure;
  }
  *cgi = TUVOCGI{};
  // cppcheck-suppress constVariable  ; its address goes where no const pointer does
  std::optional<CgiRequest>& request = TheRequest();
  if (!request) {
    return kFailure;
  }
  cgi->request = &*request;
  return kSuccess;
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
