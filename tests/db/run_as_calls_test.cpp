// The id-changing calls of a switch and of the return from it, one by one. This program stands
// between the library and the system's calls, hence it is one of its own.
#include <dlfcn.h>
#include <gtest/gtest.h>
#include <internal/run_as.h>
#include <unistd.h>

#include <string>
#include <vector>

#include "support/child.h"

namespace {

std::vector<std::string> calls;

template <typename Id>
int Pass(const char* name, Id real, Id effective, Id saved) {
  const auto text = [](Id id) { return std::to_string(static_cast<int>(id)); };
  calls.push_back(std::string(name) + " " + text(real) + " " + text(effective) + " " + text(saved));
  const std::string function = std::string("setres") + name;
  return reinterpret_cast<int (*)(Id, Id, Id)>(dlsym(RTLD_NEXT, function.c_str()))(real, effective,
                                                                                   saved);
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

}  // namespace
