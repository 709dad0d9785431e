// The login API for C programs. Linked to the shared library, as those are.
#include <cstddef>
#include <cstring>
#include <stdexcept>
#include <type_traits>

#include "login/c_visit.h"
#include "login/visit.h"

namespace tuvo_test {
namespace {

using Params = _tag_sharing_login_params;

static_assert(std::is_standard_layout_v<Params> && std::is_trivial_v<Params>);
static_assert(std::is_same_v<decltype(Params::sharing_id), const char*> &&
              std::is_same_v<decltype(Params::password), const char*> &&
              std::is_same_v<decltype(Params::zor_username), const char*> &&
              std::is_same_v<decltype(Params::zor_password), const char*> &&
              std::is_same_v<decltype(Params::sharing_sid), const char*>);

// What programs were compiled against.
static_assert(
    std::is_same_v<decltype(&TuvoSharingLogin), int (*)(char*, unsigned int, Params*, int)> &&
    std::is_same_v<decltype(&TuvoSharingIsAuthorized), int (*)(const Params*)> &&
    std::is_same_v<decltype(&TuvoSharingLogout), int (*)(const char*, const char*)> &&
    std::is_same_v<decltype(&TuvoSharingIncreaseUseCount), int (*)(const char*)>);
static_assert(
    std::is_same_v<decltype(&TUVO::TuvoSharingLogin), int (*)(std::string&, Params*, bool)> &&
    std::is_same_v<decltype(&TUVO::TuvoSharingIsAuthorized), int (*)(const Params*)> &&
    std::is_same_v<decltype(&TUVO::TuvoSharingLogout),
                   bool (*)(const std::string&, const std::string&)> &&
    std::is_same_v<decltype(&TUVO::TuvoSharingIncreaseUseCount), bool (*)(const std::string&)>);

constexpr char kFill = '#';

class CExports : public VisitTest {
 protected:
  // Logs in with a buffer of `size` bytes, all kFill before, within one that has kFill on both
  // sides. What is then in the buffer is the reply's text, zeros shown as '0'.
  Reply LoginInto(unsigned int size, const Visit& visit, int flag = 0) {
    return Run(visit, [=](std::string& shown) {
      std::string memory(size + 2, kFill);
      Params params = visit.Params();
      const int code = TuvoSharingLogin(&memory[1], size, &params, flag);
      EXPECT_EQ(kFill, memory.front());
      EXPECT_EQ(kFill, memory.back());
      shown = memory.substr(1, size);
      for (char& c : shown) {
        c = c == '\0' ? '0' : c;
      }
      return code;
    });
  }

  // The identifier of the newest session.
  std::string NewestId() { return Value("SELECT session_id FROM session ORDER BY id DESC"); }
};

using Offsets = std::vector<size_t>;

// Five pointers in the order that programs were compiled against, without gaps.
Offsets ExpectedLayout() {
  return sizeof(char*) == 4 ? Offsets{0, 4, 8, 12, 16, 20} : Offsets{0, 8, 16, 24, 32, 40};
}

TEST(LoginParams, HaveTheirLayout) {
  EXPECT_EQ(ExpectedLayout(),
            (Offsets{offsetof(Params, sharing_id), offsetof(Params, password),
                     offsetof(Params, zor_username), offsetof(Params, zor_password),
                     offsetof(Params, sharing_sid), sizeof(Params)}));
}

TEST(LoginParams, HaveTheSameLayoutInC) {
  const c_params_layout layout = get_c_params_layout();
  EXPECT_EQ(ExpectedLayout(), (Offsets{layout.sharing_id, layout.password, layout.zor_username,
                                       layout.zor_password, layout.sharing_sid, layout.size}));
}

TEST_F(CExports, LoginWritesTheIdentifierAndAZero) {
  const Reply reply = LoginInto(33, Visit(MakeLink()));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(NewestId() + "0", reply.session_id);
}

TEST_F(CExports, LoginEndsTheTextInALargerBuffer) {
  const Reply reply = LoginInto(40, Visit(MakeLink()));
  EXPECT_EQ(1, reply.code);
  EXPECT_EQ(NewestId() + "0######0", reply.session_id);
}

TEST_F(CExports, LoginCutsTheIdentifierToTheBuffer) {
  const std::string hash = MakeLink();
  for (const unsigned int size : {32U, 31U, 10U, 2U, 1U}) {
    const Reply reply = LoginInto(size, Visit(hash));
    EXPECT_EQ(1, reply.code);
    EXPECT_EQ(NewestId().substr(0, size - 1) + "0", reply.session_id);
    EXPECT_EQ(32U, NewestId().size());
  }
}

TEST_F(CExports, ARefusedLoginLeavesAnEmptyText) {
  const std::string hash = MakePasswordLink();
  Reply reply = LoginInto(33, Visit(hash).Password("wrong"));
  EXPECT_EQ(-9, reply.code);
  EXPECT_EQ('0', reply.session_id.front());
  EXPECT_EQ('0', reply.session_id.back());
  reply = LoginInto(1, Visit("unknown"));
  EXPECT_EQ(-3, reply.code);
  EXPECT_EQ("0", reply.session_id);
}

TEST_F(CExports, ABufferThatIsNoneIsLeftAlone) {
  const Visit visit(MakeLink());
  const Reply reply = Run(visit, [&](std::string& text) {
    Params params = visit.Params();
    char out = kFill;
    EXPECT_EQ(1, TuvoSharingLogin(nullptr, 33, &params, 0));
    EXPECT_EQ(1, TuvoSharingLogin(&out, 0, &params, 0));
    text = out;
    return 0;
  });
  EXPECT_EQ("#", reply.session_id);
}

TEST_F(CExports, LoginGivesBackTheResultCode) {
  const std::string accounts = MakeAccountLink();
  EXPECT_EQ(-2, LoginInto(33, Visit(accounts).Account("alice", "wrong")).code);
  EXPECT_EQ(-10, LoginInto(33, Visit(accounts).Account("bob", "bob-secret")).code);
  EXPECT_EQ(-4, LoginInto(33, Visit()).code);
  const Reply reply = Run(Visit(), [](std::string& text) {
    char out[4] = {kFill, kFill, kFill, kFill};
    const int code = TuvoSharingLogin(out, sizeof out, nullptr, 0);
    text = out;
    EXPECT_EQ('\0', out[3]);
    return code;
  });
  EXPECT_EQ(-4, reply.code);
  EXPECT_EQ("", reply.session_id);
}

TEST_F(CExports, OnlyTheFlagOneSkipsTheAutoBlock) {
  const std::string accounts = MakeAccountLink();
  const std::string open = MakeLink();
  const Visit not_listed = Visit(accounts).Account("bob", "bob-secret");
  EXPECT_EQ(-10, LoginInto(33, not_listed, 1).code);
  EXPECT_EQ(0, FailedLogins());
  int failures = 0;
  for (const int flag : {0, 2, -1, 257}) {
    EXPECT_EQ(-10, LoginInto(33, not_listed, flag).code);
    EXPECT_EQ(++failures, FailedLogins());
  }
  EXPECT_EQ(1, LoginInto(33, Visit(open), 1).code);
  EXPECT_EQ(failures, FailedLogins());
  EXPECT_EQ(1, LoginInto(33, Visit(open), 2).code);
  EXPECT_EQ(0, FailedLogins());
}

TEST_F(CExports, TheCheckGivesBackTheResultCode) {
  const std::string hash = MakePasswordLink();
  const std::string id = LoggedIn(Visit(hash).Password("sesame"));
  const auto check = [&](const Visit& visit) {
    return Run(visit,
               [&](std::string&) {
                 const Params params = visit.Params();
                 return TuvoSharingIsAuthorized(&params);
               })
        .code;
  };
  EXPECT_EQ(1, check(Visit(hash).Session(id)));
  EXPECT_EQ(-5, check(Visit(hash).Session("unknown")));
  EXPECT_EQ(-7, check(Visit("unknown").Session(id)));
  EXPECT_EQ(-8, check(Visit(hash).Session(id).From(kOtherAddress)));
  EXPECT_EQ(-4, Run(Visit(), [](std::string&) { return TuvoSharingIsAuthorized(nullptr); }).code);
}

TEST_F(CExports, LogoutAndUseCountAnswerOneOrZero) {
  const std::string hash = MakeLink();
  const std::string id = LoggedIn(Visit(hash));
  const auto answer = [&](const std::function<int()>& operation) {
    return Run(Visit(), [&](std::string&) { return operation(); }).code;
  };
  EXPECT_EQ(1, answer([&] { return TuvoSharingIncreaseUseCount(hash.c_str()); }));
  EXPECT_EQ("2", Value("SELECT use_count FROM entry"));
  EXPECT_EQ(0, answer([&] { return TuvoSharingIncreaseUseCount("unknown"); }));
  // The link comes first, then the session.
  EXPECT_EQ(0, answer([&] { return TuvoSharingLogout(id.c_str(), hash.c_str()); }));
  EXPECT_EQ(1, answer([&] { return TuvoSharingLogout(hash.c_str(), id.c_str()); }));
  EXPECT_EQ(0, answer([&] { return TuvoSharingLogout(hash.c_str(), id.c_str()); }));
}

// What `operation` throws; empty when it does not.
std::string LogicErrorOf(const std::function<void()>& operation) {
  try {
    operation();
  } catch (const std::logic_error& error) {
    return error.what();
  }
  return "";
}

TEST_F(CExports, NullTextsRaiseTheLogicErrorThatTheyAlwaysDid) {
  Run(Visit(), [](std::string&) {
    const char* const expected = "basic_string::_M_construct null not valid";
    EXPECT_EQ(expected, LogicErrorOf([] { TuvoSharingLogout(nullptr, "id"); }));
    EXPECT_EQ(expected, LogicErrorOf([] { TuvoSharingLogout("hash", nullptr); }));
    EXPECT_EQ(expected, LogicErrorOf([] { TuvoSharingLogout(nullptr, nullptr); }));
    EXPECT_EQ(expected, LogicErrorOf([] { TuvoSharingIncreaseUseCount(nullptr); }));
    EXPECT_EQ("", LogicErrorOf([] { TuvoSharingLogout("", ""); }));
    return 0;
  });
}

TEST_F(CExports, AProgramInCMakesAWholeVisit) {
  const std::string hash = MakePasswordLink();
  const Reply reply = Run(Visit(), [&](std::string& session_id) {
    const c_visit visit = make_c_visit(hash.c_str(), "sesame");
    EXPECT_EQ(1, visit.login);
    EXPECT_EQ(1, visit.check);
    EXPECT_EQ(1, visit.count);
    EXPECT_EQ(1, visit.logout);
    EXPECT_EQ(-7, visit.check_after_logout);
    session_id = visit.session_id;
    return 0;
  });
  EXPECT_EQ(NewestId(), reply.session_id);
  EXPECT_EQ("2", Value("SELECT use_count FROM entry"));
}

}  // namespace
}  // namespace tuvo_test
