#include "visitor/environment.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <map>
#include <string>

#include "support/child.h"

namespace visitor {
namespace {

using Variables = std::map<std::string, std::string>;

// What is left of `before`: 0 when it is `after`.
int Keep(const Variables& before, const Variables& after) {
  return tuvo_test::RunInChild([&] {
    clearenv();
    for (const auto& [name, value] : before) {
      setenv(name.c_str(), value.c_str(), 1);
    }
    if (!KeepOnlyRequestVariables()) {
      return 1;
    }
    Variables left;
    for (char** variable = environ; variable != nullptr && *variable != nullptr; ++variable) {
      const std::string text = *variable;
      left[text.substr(0, text.find('='))] = text.substr(text.find('=') + 1);
    }
    return left == after ? 0 : 2;
  });
}

TEST(VisitorEnvironment, RequestStays) {
  const Variables request = {{"REQUEST_METHOD", "GET"},
                             {"PATH_INFO", "/abc"},
                             {"QUERY_STRING", "redirect=1"},
                             {"REMOTE_ADDR", "::1"},
                             {"HTTPS", "on"},
                             {"HTTP_COOKIE", "a=b"},
                             {"HTTP_RANGE", "bytes=0-"},
                             {"HTTP_SEC_FETCH_SITE", "none"}};
  EXPECT_EQ(Keep(request, request), 0);
}

TEST(VisitorEnvironment, EverythingElseGoes) {
  EXPECT_EQ(Keep({{"REQUEST_METHOD", "GET"},
                  {"TZ", "/tmp/zone"},
                  {"TMPDIR", "/tmp/evil"},
                  {"SQLITE_TMPDIR", "/tmp/evil"},
                  {"PATH", "/tmp/evil"},
                  {"HTTP_X_FORWARDED_FOR", "192.0.2.1"},
                  {"HTTP_PROXY", "evil"}},
                 {{"REQUEST_METHOD", "GET"}}),
            0);
}

TEST(VisitorEnvironment, PostHasNoQueryString) {
  EXPECT_EQ(Keep({{"REQUEST_METHOD", "POST"}, {"QUERY_STRING", "password=x"}},
                 {{"REQUEST_METHOD", "POST"}}),
            0);
}

TEST(VisitorEnvironment, NothingIsFine) {
  EXPECT_EQ(Keep({}, {}), 0);
}

}  // namespace
}  // namespace visitor
