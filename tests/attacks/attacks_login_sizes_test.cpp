// Texts of ten mebibytes in the login API, as a program might pass them on that checks nothing.
#include <gtest/gtest.h>
#include <sys/resource.h>

#include <string>

#include "login/visit.h"

namespace tuvo_test {
namespace {

const std::string kHuge(10U << 20U, 'x');

// A text in a statement is there a few times: escaped, in the statement, as SQLite has it, and in
// the log line of the statement that failed. It is never a multiple that grows with anything else.
constexpr long kMostKilobytes = 256 * 1024;

long PeakKilobytes() {
  rusage usage{};
  getrusage(RUSAGE_CHILDREN, &usage);  // every visit is a process of its own
  return usage.ru_maxrss;
}

bool IsSanitized() {
#ifdef __SANITIZE_ADDRESS__
  return true;  // keeps what was freed
#else
  return false;
#endif
}

class LoginSizes : public VisitTest {
 protected:
  void TearDown() override {
    if (!IsSanitized()) {
      EXPECT_LT(PeakKilobytes(), kMostKilobytes);
    }
    VisitTest::TearDown();
  }
};

TEST_F(LoginSizes, HugeHashIsNoLink) {
  EXPECT_EQ(-3, Login(Visit(kHuge)).code);
  const std::string session_id = LoggedIn(Visit(MakeLink()));
  EXPECT_EQ(-7, Check(Visit(kHuge).Session(session_id)).code);
  EXPECT_EQ(0, Logout(kHuge, session_id).code);
  EXPECT_EQ(0, CountUse(kHuge).code);
  (void)TakeLog();
}

TEST_F(LoginSizes, HugeSessionIdentifierIsNoSession) {
  const std::string hash = MakeLink();
  const Reply reply = Login(Visit(hash).Session(kHuge));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(32U, reply.session_id.size());
  EXPECT_EQ(-5, Check(Visit(hash).Session(kHuge)).code);
  EXPECT_EQ(0, Logout(hash, kHuge).code);
  (void)TakeLog();
}

TEST_F(LoginSizes, HugePasswordIsAWrongOne) {
  EXPECT_EQ(-9, Login(Visit(MakePasswordLink()).Password(kHuge)).code);
  EXPECT_EQ(1, FailedLogins());
}

TEST_F(LoginSizes, HugeAccountIsRefused) {
  const std::string hash = MakeAccountLink();
  EXPECT_EQ(-2, Login(Visit(hash).Account(kHuge, "x")).code);
  EXPECT_EQ(-2, Login(Visit(hash).Account("alice", kHuge)).code);
  EXPECT_EQ(2, FailedLogins());
  (void)TakeLog();
}

TEST_F(LoginSizes, HugeAddressIsNone) {
  const std::string hash = MakeLink();
  EXPECT_EQ(-4, Login(Visit(hash).From(kHuge)).code);
  EXPECT_EQ(-4, Check(Visit(hash).Session("x").From(kHuge)).code);
  (void)TakeLog();
}

TEST_F(LoginSizes, HugeQueryIsRefused) {
  const std::string hash = MakeAccountLink();
  EXPECT_NE(1, Login(Visit(hash).Account("alice", "alice-secret").Query("_sid=" + kHuge)).code);
  (void)TakeLog();
}

}  // namespace
}  // namespace tuvo_test
