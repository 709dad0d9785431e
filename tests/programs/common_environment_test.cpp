#include "common/environment.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <map>
#include <string>
#include <utility>
#include <vector>

#include "support/child.h"

namespace common {
namespace {

using Variables = std::map<std::string, std::string>;

const std::vector<std::string_view> kNames = {"REQUEST_METHOD", "QUERY_STRING", "PATH_INFO",
                                              "REMOTE_ADDR"};

// The environment as the libraries see it.
Variables Seen() {
  Variables seen;
  for (char** variable = environ; variable != nullptr && *variable != nullptr; ++variable) {
    const std::string text = *variable;
    const size_t mark = text.find('=');
    seen[text.substr(0, mark)] = text.substr(mark + 1);
  }
  for (const auto& [name, value] : seen) {
    EXPECT_STREQ(std::getenv(name.c_str()), value.c_str());
  }
  return seen;
}

// A request's variables as a web server hands them over.
class Given {
 public:
  explicit Given(const Variables& variables) {
    for (const auto& [name, value] : variables) {
      texts_.push_back(name + "=" + value);
    }
    for (const std::string& text : texts_) {
      pointers_.push_back(text.c_str());
    }
    pointers_.push_back(nullptr);
  }
  const char* const* get() const { return pointers_.data(); }

 private:
  std::vector<std::string> texts_;
  std::vector<const char*> pointers_;
};

// Runs `check` in a process of its own, whose environment may be changed.
template <typename Check>
int InChild(Check check) {
  return tuvo_test::RunInChild([&] {
    check();
    return 0;
  });
}

TEST(CommonEnvironment, NamedVariablesStay) {
  EXPECT_EQ(InChild([] {
              const Variables request = {{"REQUEST_METHOD", "GET"},
                                         {"PATH_INFO", "/a=b=c"},
                                         {"QUERY_STRING", "redirect=1"},
                                         {"REMOTE_ADDR", ""}};
              RequestEnvironment environment(kNames);
              environment.Become(Given(request).get());
              EXPECT_EQ(Seen(), request);
            }),
            0);
}

TEST(CommonEnvironment, EverythingElseGoes) {
  EXPECT_EQ(InChild([] {
              const Given given({{"REQUEST_METHOD", "GET"},
                                 {"REQUEST_METHODS", "GET"},
                                 {"REQUEST", "GET"},
                                 {"TZ", "/tmp/zone"},
                                 {"TMPDIR", "/tmp/evil"},
                                 {"SQLITE_TMPDIR", "/tmp/evil"},
                                 {"PATH", "/tmp/evil"},
                                 {"HTTP_X_FORWARDED_FOR", "192.0.2.1"},
                                 {"HTTP_PROXY", "evil"}});
              RequestEnvironment environment(kNames);
              environment.Become(given.get());
              EXPECT_EQ(Seen(), (Variables{{"REQUEST_METHOD", "GET"}}));
            }),
            0);
}

TEST(CommonEnvironment, ProcessesOwnEnvironmentCanBeReduced) {
  EXPECT_EQ(InChild([] {
              clearenv();
              setenv("PATH_INFO", "/abc", 1);
              setenv("LD_LIBRARY_PATH", "/tmp/evil", 1);
              RequestEnvironment environment(kNames);
              environment.Become(environ);
              EXPECT_EQ(Seen(), (Variables{{"PATH_INFO", "/abc"}}));
              environment.Become(environ);
              EXPECT_EQ(Seen(), (Variables{{"PATH_INFO", "/abc"}}));
            }),
            0);
}

TEST(CommonEnvironment, PostHasNoQueryString) {
  EXPECT_EQ(InChild([] {
              RequestEnvironment environment(kNames);
              environment.Become(
                  Given({{"QUERY_STRING", "password=x"}, {"REQUEST_METHOD", "POST"}}).get());
              EXPECT_EQ(Seen(), (Variables{{"REQUEST_METHOD", "POST"}}));
            }),
            0);
}

TEST(CommonEnvironment, NothingOfARequestIsLeftForTheNext) {
  EXPECT_EQ(
      InChild([] {
        RequestEnvironment environment(kNames);
        environment.Become(Given({{"REQUEST_METHOD", "GET"}, {"QUERY_STRING", "long text"}}).get());
        environment.Become(Given(Variables{{"REMOTE_ADDR", "::1"}}).get());
        EXPECT_EQ(Seen(), (Variables{{"REMOTE_ADDR", "::1"}}));
        environment.Become(nullptr);
        EXPECT_EQ(Seen(), Variables());
      }),
      0);
}

TEST(CommonEnvironment, TextsAreNotTheWebServersAnyMore) {
  EXPECT_EQ(InChild([] {
              RequestEnvironment environment(kNames);
              std::string text = "PATH_INFO=/abc";
              const char* variables[] = {text.c_str(), nullptr};
              environment.Become(variables);
              text = "PATH_INFO=/xyz";
              variables[0] = nullptr;
              EXPECT_EQ(Seen(), (Variables{{"PATH_INFO", "/abc"}}));
            }),
            0);
}

TEST(CommonEnvironment, WhatIsNoVariableIsPassedOver) {
  EXPECT_EQ(InChild([] {
              const char* variables[] = {"PATH_INFO", "", "=x", "REMOTE_ADDR=::1", nullptr};
              RequestEnvironment environment(kNames);
              environment.Become(variables);
              EXPECT_EQ(Seen(), (Variables{{"REMOTE_ADDR", "::1"}}));
            }),
            0);
}

TEST(CommonEnvironment, IsEmptyAtTheEnd) {
  EXPECT_EQ(InChild([] {
              {
                RequestEnvironment environment(kNames);
                environment.Become(Given(Variables{{"REMOTE_ADDR", "::1"}}).get());
              }
              EXPECT_EQ(Seen(), Variables());
            }),
            0);
}

}  // namespace
}  // namespace common
