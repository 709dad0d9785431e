// The id-changing calls of a switch and of the return from it, one by one. This program stands
// between the library and the system's calls, hence it is one of its own.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <internal/run_as.h>
#include <unistd.h>

#include <map>
#include <string>
#include <utility>
#include <vector>

#include "support/child.h"

namespace {

std::vector<std::string> calls;
std::map<std::string, int> answers;  // to a call, which is made, in place of the system's
bool no_uid = false;                 // the next question for the effective one tells all ones
bool no_gid = false;

template <typename Id>
int Pass(const char* name, Id real, Id effective, Id saved) {
  const auto text = [](Id id) { return std::to_string(static_cast<int>(id)); };
  calls.push_back(std::string(name) + " " + text(real) + " " + text(effective) + " " + text(saved));
  const std::string function = std::string("setres") + name;
  const int done = reinterpret_cast<int (*)(Id, Id, Id)>(dlsym(RTLD_NEXT, function.c_str()))(
      real, effective, saved);
  const auto answer = answers.find(calls.back());
  return answer == answers.end() ? done : answer->second;
}

template <typename Id>
Id Tell(bool& none, const char* function) {
  return std::exchange(none, false) ? static_cast<Id>(-1)
                                    : reinterpret_cast<Id (*)()>(dlsym(RTLD_NEXT, function))();
}

}  // namespace

extern "C" {

__attribute__((visibility("default"))) int setresuid(uid_t real, uid_t effective,
                                                     uid_t saved) noexcept {
  return Pass("uid", real, effective, saved);
}

__attribute__((visibility("default"))) int setresgid(gid_t real, gid_t effective,
                                                     gid_t saved) noexcept {
  return Pass("gid", real, effective, saved);
}

__attribute__((visibility("default"))) uid_t geteuid() noexcept {
  return Tell<uid_t>(no_uid, "geteuid");
}

__attribute__((visibility("default"))) gid_t getegid() noexcept {
  return Tell<gid_t>(no_gid, "getegid");
}

}  // extern "C"

namespace {

using tuvo_test::Ids;
using Calls = std::vector<std::string>;

// What a switch from `start` calls, and what the return from it does.
void ExpectCalls(const Ids& start, uid_t uid, gid_t gid, const Calls& going, const Calls& coming) {
  EXPECT_EQ(tuvo_test::RunInChildAs(start,
                                    [&] {
                                      calls.clear();
                                      IF_RUN_AS(uid, gid) {
                                        EXPECT_EQ(calls, going);
                                        calls.clear();
                                      }
                                      else {
                                        EXPECT_EQ(calls, going);
                                        calls.clear();
                                      }
                                      EXPECT_EQ(calls, coming);
                                      return 0;
                                    }),
            0);
}

// Expects saved root's switch to the system identity to succeed or fail when one of its calls
// answers so.
void ExpectOutcome(const std::string& call, int answer, bool succeeds) {
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kSavedRoot,
                                    [&] {
                                      answers = {{call, answer}};
                                      bool done = false;
                                      IF_RUN_AS(1, 1) {
                                        done = true;
                                      }
                                      EXPECT_EQ(done, succeeds) << call << ": " << answer;
                                      return 0;
                                    }),
            0);
}

TEST(RunAsCalls, TheSystemIdentityNeedsNone) {
  ExpectCalls(tuvo_test::kSystem, 1, 1, {}, {});
}

TEST(RunAsCalls, RootToRootNeedsNone) {
  ExpectCalls(tuvo_test::kRoot, 0, 0, {}, {});
}

TEST(RunAsCalls, RootTakesTheGroupFirstAndComesBackThroughRoot) {
  ExpectCalls(tuvo_test::kRoot, 1, 1, {"gid -1 1 -1", "uid -1 1 -1"},
              {"uid -1 0 -1", "gid -1 0 -1", "uid -1 0 -1"});
}

TEST(RunAsCalls, SavedRootRegainsRootFirst) {
  ExpectCalls(tuvo_test::kSavedRoot, 1, 1, {"uid -1 0 -1", "gid -1 1 -1", "uid -1 1 -1"},
              {"uid -1 0 -1", "gid -1 65534 -1", "uid -1 65534 -1"});
}

TEST(RunAsCalls, AGroupInForceIsNotSetAgain) {
  ExpectCalls({0, 0, 0, 1, 1, 1}, 1, 1, {"uid -1 1 -1"}, {"uid -1 0 -1", "uid -1 0 -1"});
}

TEST(RunAsCalls, AUserInForceIsNotSetAgain) {
  ExpectCalls({1, 1, 1, 65534, 65534, 1}, 1, 1, {"gid -1 1 -1"}, {"gid -1 65534 -1"});
}

TEST(RunAsCalls, SavedRootTakesRootsGroupAsRoot) {
  ExpectCalls(tuvo_test::kSavedRoot, 0, 0, {"uid -1 0 -1", "gid -1 0 -1", "uid -1 0 -1"},
              {"gid -1 65534 -1", "uid -1 65534 -1"});
}

TEST(RunAsCalls, AProcessWithoutRootGivesUpAfterTheFirst) {
  ExpectCalls(tuvo_test::kNobody, 1, 1, {"uid -1 0 -1"}, {});
}

TEST(RunAsCalls, EveryAnswerButZeroToTheGroupsAndTheUsersCallIsAFailure) {
  for (const char* call : {"gid -1 1 -1", "uid -1 1 -1"}) {
    ExpectOutcome(call, 0, true);
    ExpectOutcome(call, 1, false);
    ExpectOutcome(call, -1, false);
  }
}

TEST(RunAsCalls, OnlyANegativeAnswerToRootsCallIsAFailure) {
  ExpectOutcome("uid -1 0 -1", 0, true);
  ExpectOutcome("uid -1 0 -1", 1, true);
  ExpectOutcome("uid -1 0 -1", -1, false);
}

// A call would leave that id as it is.
TEST(RunAsCalls, AnIdOfAllOnesIsNotGivenBack) {
  const Calls going{"uid -1 0 -1", "gid -1 1 -1", "uid -1 1 -1"};
  const auto expect_back = [&](bool user, bool group, const Calls& coming) {
    EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kSavedRoot,
                                      [&] {
                                        calls.clear();
                                        no_uid = user;
                                        no_gid = group;
                                        IF_RUN_AS(1, 1) {
                                          EXPECT_EQ(calls, going);
                                          calls.clear();
                                        }
                                        EXPECT_EQ(calls, coming);
                                        return 0;
                                      }),
              0);
  };
  expect_back(true, false, {"uid -1 0 -1", "gid -1 65534 -1"});
  expect_back(false, true, {"uid -1 0 -1", "uid -1 65534 -1"});
}

}  // namespace
