#include "login/platform_spy.h"

#include <dlfcn.h>
#include <pthread.h>
#include <tuvoplatform/account.h>
#include <tuvoplatform/auto_block.h>
#include <tuvoplatform/cgi.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <new>

namespace tuvo_test {

PlatformSpy& Spy() {
  static PlatformSpy spy;
  return spy;
}

namespace {

bool within_platform = false;

// The platform's own function of that name.
template <typename Function>
Function* Real(Function* /*mine*/, const char* name) {
  void* real = dlsym(RTLD_NEXT, name);
  if (real == nullptr) {
    std::fprintf(stderr, "no %s\n", name);
    std::abort();
  }
  return reinterpret_cast<Function*>(real);
}

bool MustFail(const char* name) {
  PlatformSpy& spy = Spy();
  if (spy.failing != name || spy.successes-- > 0) {
    return false;
  }
  if (spy.throws) {
    throw std::bad_alloc();
  }
  return true;
}

template <typename Answer, typename Function, typename... Arguments>
Answer Forward(const std::string& note, Answer failure, Function* mine, const char* name,
               Arguments... arguments) {
  if (within_platform) {
    return Real(mine, name)(arguments...);
  }
  Spy().calls.push_back(note);
  if (MustFail(name)) {
    return failure;
  }
  within_platform = true;
  const Answer answer = Real(mine, name)(arguments...);
  within_platform = false;
  return answer;
}

bool IsZero(const char* text, unsigned int size) {
  return std::all_of(text, text + size, [](char c) { return c == '\0'; });
}

}  // namespace
}  // namespace tuvo_test

using tuvo_test::Forward;
using tuvo_test::Spy;

extern "C" {

int TuvoCgiInit(const char* name, TUVOCGI* cgi) {
  return Forward(std::string("TuvoCgiInit ") + name, Spy().answer, &TuvoCgiInit, "TuvoCgiInit",
                 name, cgi);
}

int TuvoCgiLoadInCookies(TUVOCGI* cgi) {
  return Forward("TuvoCgiLoadInCookies", Spy().answer, &TuvoCgiLoadInCookies,
                 "TuvoCgiLoadInCookies", cgi);
}

const char* TuvoCgiGetRequestParam(const TUVOCGI* cgi, const char* name) {
  return Forward(std::string("TuvoCgiGetRequestParam ") + name, static_cast<const char*>(nullptr),
                 &TuvoCgiGetRequestParam, "TuvoCgiGetRequestParam", cgi, name);
}

int TuvoCgiSetCookies(TUVOCGI* cgi, const char* name, const char* value, const char* path) {
  return Forward(std::string("TuvoCgiSetCookies ") + name + " " + value + " " + path, -1,
                 &TuvoCgiSetCookies, "TuvoCgiSetCookies", cgi, name, value, path);
}

int TuvoCgiLogin(TUVOCGI* cgi, char* reply, unsigned int size, const LoginInfo* login) {
  Spy().login = {login->szUser,
                 login->szPassword != nullptr ? login->szPassword : "(null)",
                 login->szClient,
                 login->nType,
                 login->nFlag,
                 size,
                 tuvo_test::IsZero(reply, size)};
  if (Spy().at_login) {
    Spy().at_login();
  }
  return Forward("TuvoCgiLogin", Spy().answer, &TuvoCgiLogin, "TuvoCgiLogin", cgi, reply, size,
                 login);
}

int TuvoCgiGetRemoteIP(char* ip, unsigned int size) {
  if (!tuvo_test::within_platform) {
    Spy().address_size = size;
    Spy().address_was_zero = tuvo_test::IsZero(ip, size);
  }
  return Forward("TuvoCgiGetRemoteIP", Spy().answer, &TuvoCgiGetRemoteIP, "TuvoCgiGetRemoteIP", ip,
                 size);
}

void TuvoCgiFree(TUVOCGI* cgi) {
  Spy().calls.emplace_back("TuvoCgiFree");
  tuvo_test::Real(&TuvoCgiFree, "TuvoCgiFree")(cgi);
}

int TuvoCgiIsDeniedIP(const char* ip) {
  return Forward(std::string("TuvoCgiIsDeniedIP ") + ip, Spy().answer, &TuvoCgiIsDeniedIP,
                 "TuvoCgiIsDeniedIP", ip);
}

// Where there is no other name the platform is not asked: on plain Linux it answers 0 for all.
int TUVOUserLoginNameConvert(const char* name, char* real, unsigned int size) {
  const auto found = Spy().real_names.find(name);
  if (found == Spy().real_names.end()) {
    return 0;
  }
  std::strncpy(real, found->second.c_str(), size - 1);
  return static_cast<int>(found->second.size());
}

int TUVOUserGet(const char* name, TUVOUSER** user) {
  return Forward(std::string("TUVOUserGet ") + name, Spy().answer, &TUVOUserGet, "TUVOUserGet",
                 name, user);
}

int TUVOUserGetByUID(unsigned int uid, TUVOUSER** user) {
  return Forward("TUVOUserGetByUID " + std::to_string(uid), Spy().answer, &TUVOUserGetByUID,
                 "TUVOUserGetByUID", uid, user);
}

void TUVOUserFree(TUVOUSER* user) {
  if (!tuvo_test::within_platform) {
    Spy().calls.emplace_back("TUVOUserFree");
  }
  tuvo_test::Real(&TUVOUserFree, "TUVOUserFree")(user);
}

TLIBSZHASH* TLIBGroupInfoHashGet(const char* user, int kind, int flags) {
  return Forward(std::string("TLIBGroupInfoHashGet ") + user, static_cast<TLIBSZHASH*>(nullptr),
                 &TLIBGroupInfoHashGet, "TLIBGroupInfoHashGet", user, kind, flags);
}

int pthread_create(pthread_t* thread, const pthread_attr_t* attributes, void* (*body)(void*),
                   void* argument) noexcept {
  ++Spy().threads;
  return tuvo_test::Real(&pthread_create, "pthread_create")(thread, attributes, body, argument);
}

std::time_t time(std::time_t* out) noexcept {
  std::time_t now = 0;
  if (Spy().now) {
    now = *Spy().now;
    *Spy().now += Spy().step;
  } else {
    timespec clock{};
    clock_gettime(CLOCK_REALTIME, &clock);
    now = clock.tv_sec;
  }
  if (out != nullptr) {
    *out = now;
  }
  return now;
}

}  // extern "C"
