// The login API when memory runs out: at every single allocation of C++ that an operation makes.
// A program in C could not catch what would then be thrown, so every operation has to come back.
#include "login/visit.h"
#include "support/failing_new.h"

namespace {

constexpr long kUnlimited = -1;
long allocations_left = kUnlimited;
bool later_ones_succeed = false;

}  // namespace

namespace tuvo_test {

bool MayAllocate() noexcept {
  if (allocations_left > 0) {
    --allocations_left;
    return true;
  }
  if (allocations_left == 0 && later_ones_succeed) {
    allocations_left = kUnlimited;
    return false;
  }
  return allocations_left == kUnlimited;
}

namespace {

// What a process of the sweep below found out.
enum Outcome { kCameBack = 0, kHadEnough = 1, kWasLetIn = 2 };

class OutOfMemory : public VisitTest, public testing::WithParamInterface<bool> {
 protected:
  // Runs `operation` again and again, each time in a process of its own where one allocation more
  // succeeds, until it needs no more. Expects that it comes back every time, and that it never
  // answers 1 unless `may_succeed`.
  void RunOut(const Visit& visit, bool may_succeed, const std::function<int()>& operation) {
    constexpr long kFarTooMany = 20000;
    int outcome = kCameBack;
    long limit = 0;
    for (; outcome == kCameBack && limit < kFarTooMany; ++limit) {
      outcome = RunInChildAs(kRoot, [&] {
        visit.EnterEnvironment();
        later_ones_succeed = GetParam();
        allocations_left = limit;
        const int code = operation();
        const bool enough = allocations_left > 0;
        allocations_left = kUnlimited;
        EXPECT_EQ(ToText(kRoot), ToText(CurrentIds()));
        if (code == 1 && !may_succeed) {
          return kWasLetIn;
        }
        return enough ? kHadEnough : kCameBack;
      });
    }
    EXPECT_EQ(kHadEnough, outcome) << "with " << limit - 1 << " allocations";
    EXPECT_LT(20, limit);
  }

  void LogIn(const Visit& visit, bool may_succeed) {
    RunOut(visit, may_succeed, [&] {
      std::string session_id;
      _tag_sharing_login_params params = visit.Params();
      return TUVO::TuvoSharingLogin(session_id, &params, true);
    });
  }

  void AskForMore(const Visit& visit, bool may_succeed) {
    RunOut(visit, may_succeed, [&] {
      const _tag_sharing_login_params params = visit.Params();
      return TUVO::TuvoSharingIsAuthorized(&params);
    });
  }

  std::string hash_ = MakeAccountLink();
  std::string id_ = LoggedIn(Visit(hash_).Account("alice", "alice-secret"));
};

TEST_P(OutOfMemory, LoginComesBack) {
  LogIn(Visit(MakePasswordLink()).Password("sesame").Session(id_), true);
}

TEST_P(OutOfMemory, TheCheckComesBack) {
  AskForMore(Visit(hash_).Session(id_), true);
}

TEST_P(OutOfMemory, LogoutComesBack) {
  Break("DELETE", "token");  // so that every attempt finds the token
  RunOut(Visit(), false, [&] { return TUVO::TuvoSharingLogout(hash_, id_) ? 1 : 0; });
}

TEST_P(OutOfMemory, CountingAUseComesBack) {
  RunOut(Visit(), true, [&] { return TUVO::TuvoSharingIncreaseUseCount(hash_) ? 1 : 0; });
}

TEST_P(OutOfMemory, ALoginThatIsToBeRefusedNeverSucceeds) {
  Change("UPDATE entry SET data = replace(data, '[2001]', '[2002]')");
  LogIn(Visit(hash_).Account("alice", "alice-secret"), false);
  EXPECT_EQ("1", Value("SELECT COUNT(*) FROM token"));
}

TEST_P(OutOfMemory, ARequestThatIsToBeRefusedNeverSucceeds) {
  AskForMore(Visit(hash_).Session(id_).From(kOtherAddress), false);
  Change("UPDATE session SET uid = 2002");
  AskForMore(Visit(hash_).Session(id_), false);
}

std::string NameOf(const testing::TestParamInfo<bool>& info) {
  return info.param ? "ForOneAllocation" : "ForGood";
}

INSTANTIATE_TEST_SUITE_P(All, OutOfMemory, testing::Bool(), NameOf);

}  // namespace
}  // namespace tuvo_test
