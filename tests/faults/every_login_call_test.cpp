// Every call into the system, and every allocation, of a login fails once: whom it lets in then,
// what is left behind, and whether the process can go on.
#include <tuvoplatform/auto_block.h>
#include <tuvosharing/entry.h>

#include <set>
#include <string>

#include "faults/every_call.h"

namespace tuvo_test {
namespace {

using TUVO::sharing::record::Entry;

class EveryLoginCall : public EveryCall {
 protected:
  // A login at every failing call: it admits with session and token, or refuses and leaves no
  // token; the use is counted, or the log says that it was not.
  static void SweepLogin(const std::string& name, const Visit& visit, const std::string& hash,
                         const std::set<int>& answers) {
    InLongProcess(visit, [&] {
      Observer observer;
      std::string session_id;
      ASSERT_EQ(1, LogIn(visit, session_id));
      const std::string uses = "SELECT use_count FROM entry WHERE hash = '" + hash + "'";
      const std::string tokens = "SELECT COUNT(*) FROM token";
      long uses_before = observer.Number(uses);
      long tokens_before = observer.Number(tokens);
      Sweep(
          name, kCalls,
          [&] {
            session_id = "";
            return LogIn(visit, session_id);
          },
          [&](const Step& step) {
            EXPECT_EQ(1U, answers.count(step.answer));
            observer.ExpectNothingHeld();
            const bool admitted = step.answer == 1;
            const long counted = observer.Number(uses) - uses_before;
            if (admitted) {
              EXPECT_EQ(step.Logged("update entry use count fail") ? 0 : 1, counted);
            } else {
              EXPECT_TRUE(counted == 0 || counted == 1) << counted;
            }
            EXPECT_EQ(tokens_before + (admitted ? 1 : 0), observer.Number(tokens));
            EXPECT_EQ(admitted ? "1" : "0",
                      observer.Text("SELECT COUNT(*) FROM token JOIN session ON session.id = "
                                    "token.session_id JOIN entry ON entry.id = token.entry_id "
                                    "WHERE session.session_id = '" +
                                    session_id + "' AND hash = '" + hash + "'"));
            EXPECT_EQ(1, LogIn(visit, session_id)) << "the next one";
            uses_before = observer.Number(uses);
            tokens_before = observer.Number(tokens);
          });
      observer.ExpectWhole();
    });
  }
};

TEST_F(EveryLoginCall, ToAnOpenLink) {
  const std::string hash = MakeLink();
  SweepLogin("login, open link", Visit(hash), hash, {1, -3, -4});
}

// -9: without memory for its digest a password is not the right one.
TEST_F(EveryLoginCall, ToALinkWithAPassword) {
  const std::string hash = MakePasswordLink();
  SweepLogin("login, password link", Visit(hash).Password("sesame"), hash, {1, -3, -4, -9});
}

// A fault is no way in.
TEST_F(EveryLoginCall, WithAWrongPassword) {
  const Visit visit = Visit(MakePasswordLink()).Password("simsim");
  SweepRefused("login, wrong password", visit,
               [&] {
                 std::string session_id = kUntouched;
                 const int answer = LogIn(visit, session_id);
                 const NotCounted not_counted;
                 EXPECT_EQ(kUntouched, session_id);
                 TUVOAutoBlockFailLoginReset(kAddress);
                 return answer;
               },
               {-3, -4, -9});
  EXPECT_EQ("0", Value("SELECT COUNT(*) FROM token"));
}

TEST_F(EveryLoginCall, ToAUsedUpLink) {
  const Visit visit(MakeLink([](Entry& entry) { entry.set_expire_times(3).set_use_count(3); }));
  SweepRefused("login, used-up link", visit,
               [&] {
                 std::string session_id;
                 return LogIn(visit, session_id);
               },
               {-3, -4, -11});
  EXPECT_EQ("3", Value("SELECT use_count FROM entry"));
}

// The count fails and the login goes on, as it is to; nothing but the line in the log tells.
TEST_F(EveryLoginCall, ToALinkWithALimitIsCountedOrLogged) {
  const Visit visit(MakeLink([](Entry& entry) { entry.set_expire_times(1); }));
  InLongProcess(visit, [&] {
    Observer observer;
    int admitted_uncounted = 0;
    std::string session_id;
    Sweep(
        "login, link with a limit", kCalls, [&] { return LogIn(visit, session_id); },
        [&](const Step& step) {
          const long uses = observer.Number("SELECT use_count FROM entry");
          if (step.answer == 1 && uses == 0) {
            ++admitted_uncounted;
            EXPECT_TRUE(step.Logged("update entry use count fail"));
          }
          EXPECT_GE(1, uses);
          EXPECT_EQ(uses == 0 ? 1 : -11, LogIn(visit, session_id)) << "the next one";
          observer.Text("UPDATE entry SET use_count = 0");
        });
    EXPECT_LT(0, admitted_uncounted);
  });
}

// Auto-block that cannot be asked blocks nobody, and says so in the log.
TEST_F(EveryLoginCall, FromABlockedAddressIsRefusedOrLogged) {
  const Visit visit = Visit(MakePasswordLink()).Password("sesame");
  FailLogins(100);
  ASSERT_EQ(-8, Login(visit).code);
  InLongProcess(visit, [&] {
    Sweep(
        "login, blocked address", kCalls,
        [&] {
          std::string session_id;
          _tag_sharing_login_params params = visit.Params();
          return TUVO::TuvoSharingLogin(session_id, &params, true);
        },
        [&](const Step& step) {
          if (step.answer != -8) {
            EXPECT_TRUE(step.answer == -4 || step.Logged("auto_block:"));
          }
        });
  });
}

}  // namespace
}  // namespace tuvo_test
