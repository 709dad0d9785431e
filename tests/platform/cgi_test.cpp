#include <fcntl.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <functional>
#include <map>
#include <string>

#include "platform/failing_allocations.h"
#include "support/child.h"

namespace {

using Environment = std::map<std::string, std::string>;

// Makes this process one that serves the request of `environment` and `body`.
void Enter(const Environment& environment, const std::string& body) {
  clearenv();
  for (const auto& [name, value] : environment) {
    setenv(name.c_str(), value.c_str(), 1);
  }
  std::FILE* input = std::tmpfile();
  std::fwrite(body.data(), 1, body.size(), input);
  std::rewind(input);
  dup2(fileno(input), STDIN_FILENO);
}

// Runs `check` in a process of its own that serves the request, since a process reads its request
// only once.
int Serve(const Environment& environment, const std::string& body,
          const std::function<void()>& check) {
  return tuvo_test::RunInChild([&] {
    Enter(environment, body);
    check();
    return 0;
  });
}

Environment Get(const std::string& query) {
  return {{"REQUEST_METHOD", "GET"}, {"QUERY_STRING", query}};
}

Environment Post(const std::string& type, size_t length) {
  return {{"REQUEST_METHOD", "POST"},
          {"CONTENT_TYPE", type},
          {"CONTENT_LENGTH", std::to_string(length)}};
}

// A context for the time of a scope.
struct Context {
  Context() : status(TuvoCgiInit("", &cgi)) {}
  ~Context() { TuvoCgiFree(&cgi); }
  TUVOCGI cgi{};
  const int status;
};

std::string WrittenCookies(TUVOCGI* cgi) {
  char* data = nullptr;
  size_t size = 0;
  std::FILE* out = open_memstream(&data, &size);
  EXPECT_GE(TuvoCgiWriteCookies(cgi, nullptr, out), 0);
  std::fclose(out);
  std::string text(data, size);
  std::free(data);
  return text;
}

TEST(Cgi, ParametersOfTheBodyComeFromStandardInput) {
  const std::string body = "a=1&b=two+words";
  EXPECT_EQ(Serve(Post("application/x-www-form-urlencoded", body.size()), body,
                  [] {
                    Context context;
                    ASSERT_EQ(context.status, 1);
                    EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "b"), "two words");
                    EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "c"), nullptr);
                    EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, nullptr), nullptr);
                  }),
            0);
}

TEST(Cgi, EveryContextSeesTheOneRequest) {
  EXPECT_EQ(Serve(Post("", 3), "a=1",
                  [] {
                    const char* first = nullptr;
                    {
                      Context context;
                      first = TuvoCgiGetRequestParam(&context.cgi, "a");
                    }
                    setenv("REQUEST_METHOD", "GET", 1);
                    setenv("QUERY_STRING", "a=2", 1);
                    Context context;
                    EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "a"), first);
                    EXPECT_STREQ(first, "1");
                  }),
            0);
}

TEST(Cgi, RefusedRequestFailsInEveryContext) {
  EXPECT_EQ(Serve(Get("a=%00"), "",
                  [] {
                    for (int i = 0; i < 2; ++i) {
                      Context context;
                      EXPECT_NE(context.status, 1);
                      EXPECT_NE(TuvoCgiLoadInCookies(&context.cgi), 1);
                      EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "a"), nullptr);
                      EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, "a"), nullptr);
                      EXPECT_NE(TuvoCgiSetCookies(&context.cgi, "a", "1", "/"), 1);
                      EXPECT_EQ(TuvoCgiWriteCookies(&context.cgi, nullptr, stdout), -1);
                      setenv("QUERY_STRING", "a=1", 1);
                    }
                  }),
            0);
}

TEST(Cgi, WithoutWebServerTheRequestIsEmpty) {
  EXPECT_EQ(Serve({{"REMOTE_ADDR", "192.0.2.1"}}, "a=1",
                  [] {
                    Context context;
                    EXPECT_EQ(context.status, 1);
                    EXPECT_EQ(TuvoCgiLoadInCookies(&context.cgi), 1);
                    EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "a"), nullptr);
                    char ip[65] = {};
                    EXPECT_EQ(TuvoCgiGetRemoteIP(ip, sizeof ip), 0);
                    EXPECT_STREQ(ip, "192.0.2.1");
                  }),
            0);
}

TEST(Cgi, CookiesAreThereOnceLoaded) {
  Environment environment = Get("");
  environment["HTTP_COOKIE"] = "id=\"abc\"; id=other; x=%41";
  EXPECT_EQ(Serve(environment, "",
                  [] {
                    Context context;
                    EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, "id"), nullptr);
                    ASSERT_EQ(TuvoCgiLoadInCookies(&context.cgi), 1);
                    EXPECT_STREQ(TuvoCgiGetCookie(&context.cgi, "id"), "abc");
                    EXPECT_STREQ(TuvoCgiGetCookie(&context.cgi, "x"), "%41");
                    EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, "ID"), nullptr);
                    EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, nullptr), nullptr);
                  }),
            0);
}

TEST(Cgi, RequestWithoutCookiesLoadsThem) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    Context context;
                    EXPECT_EQ(TuvoCgiLoadInCookies(&context.cgi), 1);
                    EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, "id"), nullptr);
                  }),
            0);
}

TEST(Cgi, CookieSetInOneContextIsWrittenFromAnother) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    {
                      Context context;
                      EXPECT_EQ(TuvoCgiSetCookies(&context.cgi, "id", "abc", "/"), 1);
                    }
                    Context context;
                    EXPECT_EQ(WrittenCookies(&context.cgi),
                              "Set-Cookie: id=abc; Path=/; HttpOnly; SameSite=Lax\r\n");
                    EXPECT_EQ(WrittenCookies(&context.cgi), "");
                  }),
            0);
}

TEST(Cgi, CookieIsSecureUnderHttps) {
  Environment environment = Get("");
  environment["HTTPS"] = "on";
  EXPECT_EQ(Serve(environment, "",
                  [] {
                    Context context;
                    EXPECT_EQ(TuvoCgiSetCookies(&context.cgi, "id", "abc", "/"), 1);
                    EXPECT_EQ(WrittenCookies(&context.cgi),
                              "Set-Cookie: id=abc; Path=/; HttpOnly; SameSite=Lax; Secure\r\n");
                  }),
            0);
}

TEST(Cgi, BadCookieTextsAreRefused) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    Context context;
                    TUVOCGI* cgi = &context.cgi;
                    EXPECT_NE(TuvoCgiSetCookies(cgi, "id", "a\r\nSet-Cookie: x=y", "/"), 1);
                    EXPECT_NE(TuvoCgiSetCookies(cgi, "id", "a;b", "/"), 1);
                    EXPECT_NE(TuvoCgiSetCookies(cgi, nullptr, "a", "/"), 1);
                    EXPECT_NE(TuvoCgiSetCookies(cgi, "id", nullptr, "/"), 1);
                    EXPECT_NE(TuvoCgiSetCookies(cgi, "id", "a", nullptr), 1);
                    EXPECT_NE(TuvoCgiSetCookies(nullptr, "id", "a", "/"), 1);
                    EXPECT_EQ(TuvoCgiWriteCookies(cgi, nullptr, nullptr), -1);
                    EXPECT_EQ(WrittenCookies(cgi), "");
                  }),
            0);
}

TEST(Cgi, NullAndFreedContextsAreHarmless) {
  EXPECT_EQ(Serve(Get("a=1"), "",
                  [] {
                    EXPECT_NE(TuvoCgiInit("", nullptr), 1);
                    EXPECT_NE(TuvoCgiLoadInCookies(nullptr), 1);
                    EXPECT_EQ(TuvoCgiGetRequestParam(nullptr, "a"), nullptr);
                    EXPECT_EQ(TuvoCgiGetCookie(nullptr, "a"), nullptr);
                    TuvoCgiFree(nullptr);
                    TUVOCGI cgi{};
                    ASSERT_EQ(TuvoCgiInit("", &cgi), 1);
                    TuvoCgiFree(&cgi);
                    EXPECT_EQ(TuvoCgiGetRequestParam(&cgi, "a"), nullptr);
                    TuvoCgiFree(&cgi);
                  }),
            0);
}

// The process must not grow by more than 4 MiB, and nothing of a body may have been read.
TEST(Cgi, TextsOfTenMebibytesAreRefusedInBoundedMemory) {
  const std::string huge(10u << 20, 'x');
  Environment cookie = Get("");
  cookie["HTTP_COOKIE"] = "a=" + huge;
  for (const Environment& environment :
       {cookie, Get("a=" + huge), Post("application/x-www-form-urlencoded", huge.size() + 2),
        Post("multipart/form-data; boundary=XyZ", huge.size() + 2)}) {
    EXPECT_EQ(Serve(environment, "a=" + huge,
                    [] {
                      rusage before{};
                      getrusage(RUSAGE_SELF, &before);
                      Context context;
                      EXPECT_NE(context.status, 1);
                      rusage after{};
                      getrusage(RUSAGE_SELF, &after);
                      EXPECT_LT(after.ru_maxrss - before.ru_maxrss, 4096);  // KiB
                      EXPECT_EQ(lseek(STDIN_FILENO, 0, SEEK_CUR), 0);
                    }),
              0);
  }
}

// What a program does with its request, while allocation number `failing` fails: whether all of it
// went well.
bool UseRequest(long failing) {
  TUVOCGI cgi{};
  std::array<char, 65> ip{};
  tuvo_test::allocations_left = failing;
  const bool begun = TuvoCgiInit("", &cgi) == 1;
  const bool has_address = TuvoCgiGetRemoteIP(ip.data(), ip.size()) == 0;
  const bool queued =
      TuvoCgiSetCookies(&cgi, "id", "a-value-longer-than-a-string-object-holds", "/") == 1;
  tuvo_test::allocations_left = -1;
  return begun && has_address && queued;
}

TEST(Cgi, EveryLackOfMemoryIsAFailureAndNoException) {
  Environment environment = Post("application/x-www-form-urlencoded", 60);
  environment["QUERY_STRING"] = "b=" + std::string(50, 'y');
  environment["HTTP_COOKIE"] = "c=" + std::string(50, 'z');
  environment["REMOTE_ADDR"] = "2001:db8:1111:2222:3333:4444:5555:6666";
  constexpr int kFailed = 1;
  long failing = 0;
  for (int code = kFailed; code == kFailed; ++failing) {
    code = tuvo_test::RunInChild([&] {
      Enter(environment, "a=" + std::string(58, 'x'));
      return UseRequest(failing) ? 0 : kFailed;
    });
    ASSERT_TRUE(code == 0 || code == kFailed) << code << " at allocation " << failing;
  }
  EXPECT_GT(failing, 20);
}

// A body in memory, and how often somebody asked for a piece of it.
struct Body {
  std::string left;
  int calls = 0;

  static size_t Read(void* context, char* data, size_t length) {
    auto* body = static_cast<Body*>(context);
    ++body->calls;
    const size_t count = body->left.copy(data, length);
    body->left.erase(0, count);
    return count;
  }
};

// Begins the next request of this process.
void Next(const Environment& environment, Body* body) {
  clearenv();
  for (const auto& [name, value] : environment) {
    setenv(name.c_str(), value.c_str(), 1);
  }
  TuvoCgiNextRequest(body == nullptr ? nullptr : Body::Read, body);
}

TEST(Cgi, NextRequestIsParsedFromTheEnvironmentOfThen) {
  EXPECT_EQ(Serve(Get("a=1&b=1"), "",
                  [] {
                    {
                      Context context;
                      ASSERT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "1");
                    }
                    Environment next = Get("a=2");
                    next["HTTP_COOKIE"] = "id=2";
                    Next(next, nullptr);
                    {
                      Context context;
                      ASSERT_EQ(TuvoCgiLoadInCookies(&context.cgi), 1);
                      EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "2");
                      EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "b"), nullptr);
                      EXPECT_STREQ(TuvoCgiGetCookie(&context.cgi, "id"), "2");
                    }
                    Next(Get(""), nullptr);
                    Context context;
                    ASSERT_EQ(TuvoCgiLoadInCookies(&context.cgi), 1);
                    EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "a"), nullptr);
                    EXPECT_EQ(TuvoCgiGetCookie(&context.cgi, "id"), nullptr);
                  }),
            0);
}

TEST(Cgi, NextRequestsBodyComesFromItsReader) {
  EXPECT_EQ(Serve(Get(""), "a=input",
                  [] {
                    Body first{"a=1&b=1", 0};
                    Next(Post("", 7), &first);
                    {
                      Context context;
                      EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "1");
                    }
                    Body second{"a=22", 0};
                    Next(Post("", 4), &second);
                    {
                      Context context;
                      EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "22");
                      EXPECT_EQ(TuvoCgiGetRequestParam(&context.cgi, "b"), nullptr);
                    }
                    Next(Post("", 7), nullptr);
                    Context context;
                    EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "input");
                  }),
            0);
}

TEST(Cgi, ReaderIsAskedOnceARequestIsParsedAndNeverAgain) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    Body body{"a=1", 0};
                    Next(Post("", 3), &body);
                    EXPECT_EQ(body.calls, 0);
                    { Context context; }
                    EXPECT_EQ(body.calls, 1);
                    Context again;
                    TuvoCgiGetRequestParam(&again.cgi, "x");
                    EXPECT_EQ(body.calls, 1);
                  }),
            0);
}

TEST(Cgi, ReaderThatEndsEarlyRefusesItsRequestAlone) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    Body cut{"a=1", 0};
                    Next(Post("", 5), &cut);
                    { EXPECT_NE(Context().status, 1); }
                    Body whole{"a=1&b", 0};
                    Next(Post("", 5), &whole);
                    Context context;
                    ASSERT_EQ(context.status, 1);
                    EXPECT_STREQ(TuvoCgiGetRequestParam(&context.cgi, "a"), "1");
                  }),
            0);
}

TEST(Cgi, NextRequestHasNoCookieOfTheFormer) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    {
                      Context context;
                      ASSERT_EQ(TuvoCgiSetCookies(&context.cgi, "id", "secret", "/"), 1);
                    }
                    Next(Get(""), nullptr);
                    Context context;
                    EXPECT_EQ(WrittenCookies(&context.cgi), "");
                  }),
            0);
}

TEST(Cgi, NextRequestSaysAnewWhetherItCameOverHttps) {
  EXPECT_EQ(Serve({{"REQUEST_METHOD", "GET"}, {"HTTPS", "on"}}, "",
                  [] {
                    { ASSERT_EQ(Context().status, 1); }
                    Next(Get(""), nullptr);
                    Context context;
                    ASSERT_EQ(TuvoCgiSetCookies(&context.cgi, "id", "abc", "/"), 1);
                    EXPECT_EQ(WrittenCookies(&context.cgi),
                              "Set-Cookie: id=abc; Path=/; HttpOnly; SameSite=Lax\r\n");
                  }),
            0);
}

// The heap gives the memory out again as it is: what is looked at is where the text was.
TEST(Cgi, TextsOfTheFormerRequestAreOverwritten) {
  EXPECT_EQ(Serve(Get(""), "",
                  [] {
                    const std::string secret(4000, 's');
                    Body body{"password=" + secret, 0};
                    Next(Post("", 9 + secret.size()), &body);
                    const char* text = nullptr;
                    {
                      Context context;
                      text = TuvoCgiGetRequestParam(&context.cgi, "password");
                    }
                    ASSERT_EQ(text, secret);
                    tuvo_test::watched = text;
                    tuvo_test::watched_size = secret.size();
                    TuvoCgiNextRequest(nullptr, nullptr);
                    EXPECT_TRUE(tuvo_test::watched_was_freed);
                    EXPECT_TRUE(tuvo_test::watched_was_zero);
                  }),
            0);
}

// What TuvoCgiGetRemoteIP writes with these variables set; "(none)" for a failure.
std::string RemoteIp(const Environment& environment, unsigned int size = 65) {
  std::string result;
  for (const auto& [name, value] : environment) {
    setenv(name.c_str(), value.c_str(), 1);
  }
  std::array<char, 65> ip{};
  result = TuvoCgiGetRemoteIP(ip.data(), size) == 0 ? ip.data() : "(none)";
  for (const auto& [name, value] : environment) {
    unsetenv(name.c_str());
  }
  return result;
}

TEST(Cgi, RemoteAddressIsCanonical) {
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "192.0.2.1"}}), "192.0.2.1");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "2001:DB8:0::1"}}), "2001:db8::1");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "::ffff:192.0.2.1"}}), "192.0.2.1");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "fe80::1%eth0"}}), "fe80::1");
}

TEST(Cgi, RemoteAddressMustBeAnAddress) {
  EXPECT_EQ(RemoteIp({}), "(none)");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", ""}}), "(none)");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "192.0.2.1, 192.0.2.2"}}), "(none)");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "host"}}), "(none)");
}

TEST(Cgi, HeadersOfTheClientDoNotMakeTheAddress) {
  const Environment headers = {{"HTTP_X_FORWARDED_FOR", "198.51.100.1"},
                               {"HTTP_FORWARDED", "for=198.51.100.1"},
                               {"HTTP_X_REAL_IP", "198.51.100.1"},
                               {"HTTP_CLIENT_IP", "198.51.100.1"},
                               {"HTTP_REMOTE_ADDR", "198.51.100.1"}};
  EXPECT_EQ(RemoteIp(headers), "(none)");
  Environment with_address = headers;
  with_address["REMOTE_ADDR"] = "192.0.2.1";
  EXPECT_EQ(RemoteIp(with_address), "192.0.2.1");
}

TEST(Cgi, RemoteAddressNeedsRoomForItsZero) {
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "192.0.2.1"}}, 10), "192.0.2.1");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "192.0.2.1"}}, 9), "(none)");
  EXPECT_EQ(RemoteIp({{"REMOTE_ADDR", "192.0.2.1"}}, 0), "(none)");
  setenv("REMOTE_ADDR", "192.0.2.1", 1);
  EXPECT_EQ(TuvoCgiGetRemoteIP(nullptr, 65), -1);
  unsetenv("REMOTE_ADDR");
}

}  // namespace
