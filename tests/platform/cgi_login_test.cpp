#include <gtest/gtest.h>
#include <security/pam_appl.h>
#include <sys/stat.h>
#include <sys/syslog.h>
#include <tuvoplatform/cgi.h>
#include <unistd.h>

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <functional>
#include <string>
#include <type_traits>
#include <vector>

#include "support/child.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace {

using tuvo_test::CurrentIds;
using tuvo_test::RunInChildAs;
using tuvo_test::ToText;

int Login(const char* user, const char* password, const char* service = "webui",
          std::string* reply = nullptr) {
  TUVOCGI cgi{};
  EXPECT_EQ(TuvoCgiInit("", &cgi), 1);
  char buffer[123] = {};
  const LoginInfo login{user, password, service, 15, 1};
  const int result = TuvoCgiLogin(&cgi, buffer, sizeof buffer, &login);
  TuvoCgiFree(&cgi);
  if (reply != nullptr) {
    *reply = buffer;
  }
  return result;
}

// A PAM service of the private /etc/pam.d for the time of a scope.
class Service {
 public:
  Service(const std::string& name, const std::string& text) : path_("/etc/pam.d/" + name) {
    std::ofstream(path_) << text;
  }
  ~Service() { unlink(path_.c_str()); }
  Service(const Service&) = delete;
  Service& operator=(const Service&) = delete;

 private:
  const std::string path_;
};

// The one line about a login that could not be checked.
std::vector<std::string> TroubleWith(const std::string& service, const std::string& reason) {
  const int line = tuvo_test::SourceLine("platform/src/cgi_login.cpp", "syslog(LOG_ERR");
  return {"cgi_login:" + std::to_string(line) + " PAM service " + service + ": " + reason};
}

class CgiLogin : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NE(std::getenv("TUVO_PRIVATE_ROOT"), nullptr) << "run under scripts/private-root";
    unsetenv("REQUEST_METHOD");
    unsetenv("REMOTE_ADDR");
  }

  // The lines that this project's own code logged since the last call, PAM's and its modules' left
  // out.
  std::vector<std::string> OwnLines() {
    std::vector<std::string> own;
    for (const tuvo_test::LogLine& line : log_.Take()) {
      if (line.text.rfind("cgi_login:", 0) == 0) {
        EXPECT_EQ(line.facility, LOG_USER);
        EXPECT_EQ(line.priority, LOG_ERR);
        own.push_back(line.text);
      }
    }
    return own;
  }

  tuvo_test::SyslogListener log_;
};

// Callers are compiled against this order; the numbers have 32 bits everywhere.
TEST_F(CgiLogin, InfoHasItsLayout) {
  static_assert(std::is_standard_layout_v<LoginInfo>);
  static_assert(sizeof(LoginInfo::nType) == 4 && sizeof(LoginInfo::nFlag) == 4);
  const std::vector<size_t> layout = {
      offsetof(LoginInfo, szUser), offsetof(LoginInfo, szPassword), offsetof(LoginInfo, szClient),
      offsetof(LoginInfo, nType),  offsetof(LoginInfo, nFlag),      sizeof(LoginInfo)};
  const std::vector<size_t> with_32_bits = {0, 4, 8, 12, 16, 20};
  const std::vector<size_t> with_64_bits = {0, 8, 16, 24, 28, 32};
  EXPECT_EQ(layout, sizeof(char*) == 4 ? with_32_bits : with_64_bits);
}

TEST_F(CgiLogin, RightPasswordIsAllowed) {
  std::string reply;
  EXPECT_EQ(Login("alice", "alice-secret", "webui", &reply), 1);
  EXPECT_EQ(reply, "alice");
  EXPECT_EQ(Login("bob", "bob-secret"), 1);
}

TEST_F(CgiLogin, WrongPasswordIsRefused) {
  std::string reply = "x";
  EXPECT_NE(Login("alice", "bob-secret", "webui", &reply), 1);
  EXPECT_EQ(reply, "");
  EXPECT_NE(Login("alice", "alice-secret "), 1);
  EXPECT_NE(Login("alice", "ALICE-SECRET"), 1);
}

TEST_F(CgiLogin, UnknownUserIsRefused) {
  EXPECT_NE(Login("mallory", "alice-secret"), 1);
}

TEST_F(CgiLogin, ExpiredAccountIsRefusedByAccountManagement) {
  EXPECT_NE(Login("dave", "dave-secret"), 1);
  // It is the account's state alone: without account management the password is good.
  const Service service("webui-auth-only",
                        "auth required pam_unix.so nodelay\naccount required pam_permit.so\n");
  EXPECT_EQ(Login("dave", "dave-secret", "webui-auth-only"), 1);
}

TEST_F(CgiLogin, AccountManagementAloneIsNotEnough) {
  const Service service("webui-deny",
                        "auth required pam_deny.so\naccount required pam_permit.so\n");
  EXPECT_NE(Login("alice", "alice-secret", "webui-deny"), 1);
}

TEST_F(CgiLogin, NullAndEmptyTextsAreRefused) {
  // A service that lets everybody in shows that PAM is not even asked.
  const Service service("webui-permit",
                        "auth required pam_permit.so\naccount required pam_permit.so\n");
  ASSERT_EQ(Login("alice", "x", "webui-permit"), 1);
  EXPECT_NE(Login(nullptr, "x", "webui-permit"), 1);
  EXPECT_NE(Login("", "x", "webui-permit"), 1);
  EXPECT_NE(Login("alice", nullptr, "webui-permit"), 1);
  EXPECT_NE(Login("alice", "", "webui-permit"), 1);
  EXPECT_NE(Login("alice", "x", nullptr), 1);
}

// Appends a line to one of the private account files for the time of a scope.
class AccountLine {
 public:
  AccountLine(const std::string& path, const std::string& line) : path_(path) {
    struct stat status {};
    EXPECT_EQ(stat(path_.c_str(), &status), 0);
    former_size_ = status.st_size;
    std::ofstream(path_, std::ios::app) << line << "\n";
  }
  ~AccountLine() { EXPECT_EQ(truncate(path_.c_str(), former_size_), 0); }
  AccountLine(const AccountLine&) = delete;
  AccountLine& operator=(const AccountLine&) = delete;

 private:
  const std::string path_;
  off_t former_size_ = 0;
};

TEST_F(CgiLogin, AccountWithoutPasswordIsRefusedEvenWhereTheServiceAllowsIt) {
  const AccountLine account("/etc/passwd", "eve:x:2005:2005::/nonexistent:/usr/sbin/nologin");
  const Service service("webui-nullok",
                        "auth required pam_unix.so nodelay nullok\naccount required pam_unix.so\n");
  {
    const AccountLine shadow("/etc/shadow", "eve::19000:0:99999:7:::");
    EXPECT_NE(Login("eve", "x", "webui-nullok"), 1);
    EXPECT_NE(Login("eve", "", "webui-nullok"), 1);
  }
  EXPECT_EQ(Login("alice", "alice-secret", "webui-nullok"), 1);
}

TEST_F(CgiLogin, TextsThatPamCannotTakeAreRefused) {
  const Service service("webui-permit",
                        "auth required pam_permit.so\naccount required pam_permit.so\n");
  EXPECT_EQ(Login("alice", std::string(511, 'x').c_str(), "webui-permit"), 1);
  EXPECT_NE(Login("alice", std::string(512, 'x').c_str(), "webui-permit"), 1);
  EXPECT_NE(Login(std::string(65536, 'x').c_str(), "x", "webui-permit"), 1);
  EXPECT_NE(Login("ali\nce", "x", "webui-permit"), 1);
  EXPECT_NE(Login("ali\x7f", "x", "webui-permit"), 1);
}

TEST_F(CgiLogin, OnlyPlainServiceNamesReachPam) {
  const Service service("web.ui", "auth required pam_permit.so\naccount required pam_permit.so\n");
  for (const char* name :
       {"", "web.ui", "../pam.d/webui", "/etc/pam.d/webui", "web ui", "webui\n"}) {
    EXPECT_NE(Login("alice", "alice-secret", name), 1) << name;
  }
  EXPECT_EQ(log_.TakeTexts().size(), 0u);
}

TEST_F(CgiLogin, ReplyIsCutShortWithItsZero) {
  TUVOCGI cgi{};
  ASSERT_EQ(TuvoCgiInit("", &cgi), 1);
  const LoginInfo login{"alice", "alice-secret", "webui", 15, 1};
  char reply[] = "##########";
  EXPECT_EQ(TuvoCgiLogin(&cgi, reply, 4, &login), 1);
  EXPECT_EQ(std::memcmp(reply, "ali\0######", 11), 0);
  EXPECT_EQ(TuvoCgiLogin(&cgi, reply, 0, &login), 1);
  EXPECT_EQ(TuvoCgiLogin(&cgi, nullptr, 10, &login), 1);
  EXPECT_EQ(std::memcmp(reply, "ali\0######", 11), 0);
  TuvoCgiFree(&cgi);
}

TEST_F(CgiLogin, NullLoginAndContextAreRefused) {
  TUVOCGI cgi{};
  const LoginInfo login{"alice", "alice-secret", "webui", 15, 1};
  char reply[123];
  EXPECT_NE(TuvoCgiLogin(&cgi, reply, sizeof reply, &login), 1);
  EXPECT_NE(TuvoCgiLogin(nullptr, reply, sizeof reply, &login), 1);
  ASSERT_EQ(TuvoCgiInit("", &cgi), 1);
  EXPECT_NE(TuvoCgiLogin(&cgi, reply, sizeof reply, nullptr), 1);
  TuvoCgiFree(&cgi);
}

// Logs in with a right and a wrong password in a process that starts as `ids`.
int LoginAs(const tuvo_test::Ids& ids, bool right_is_allowed) {
  return RunInChildAs(ids, [&] {
    EXPECT_EQ(Login("alice", "alice-secret") == 1, right_is_allowed);
    EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
    EXPECT_NE(Login("alice", "wrong"), 1);
    EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
    EXPECT_NE(Login("dave", "dave-secret"), 1);
    EXPECT_EQ(ToText(CurrentIds()), ToText(ids));
    return 0;
  });
}

TEST_F(CgiLogin, RootKeepsItsIds) {
  EXPECT_EQ(LoginAs(tuvo_test::kRoot, true), 0);
}

TEST_F(CgiLogin, SavedRootIsRegainedForTheCheckOnly) {
  EXPECT_EQ(LoginAs(tuvo_test::kSavedRoot, true), 0);
}

TEST_F(CgiLogin, RealRootIsRegainedForTheCheckOnly) {
  EXPECT_EQ(LoginAs({0, 65534, 65534, 0, 65534, 65534}, true), 0);
}

TEST_F(CgiLogin, NobodyIsRefusedAndKeepsItsIds) {
  EXPECT_EQ(LoginAs(tuvo_test::kNobody, false), 0);
}

TEST_F(CgiLogin, WithoutRootOtherModulesStillWork) {
  const Service service("webui-permit",
                        "auth required pam_permit.so\naccount required pam_permit.so\n");
  EXPECT_EQ(RunInChildAs(tuvo_test::kNobody,
                         [] { return Login("alice", "x", "webui-permit") == 1 ? 0 : 1; }),
            0);
}

TEST_F(CgiLogin, PamLearnsTheClientsAddress) {
  setenv("REMOTE_ADDR", "::ffff:192.0.2.7", 1);
  setenv("HTTP_X_FORWARDED_FOR", "198.51.100.1", 1);
  EXPECT_NE(Login("alice", "wrong"), 1);
  unsetenv("HTTP_X_FORWARDED_FOR");
  const auto lines = log_.TakeTexts();
  ASSERT_EQ(lines.size(), 1u);
  EXPECT_NE(lines[0].find("rhost=192.0.2.7 "), std::string::npos) << lines[0];
  EXPECT_EQ(lines[0].find("wrong"), std::string::npos) << lines[0];
}

// Where the module leaves a trace when it is asked for more than a check.
constexpr char kPamTrace[] = "/tmp/pam-prompt-module";

// A service whose authentication is the module of pam_prompt_module.cpp with these arguments.
std::string PromptService(const std::string& arguments) {
  return "auth required " TUVO_PAM_PROMPT_MODULE " " + arguments +
         "\naccount required pam_permit.so\n";
}

TEST_F(CgiLogin, HiddenPromptsGetThePasswordAndVisibleOnesTheName) {
  const Service service("webui-prompt", PromptService("off=p@ss on=alice"));
  EXPECT_EQ(Login("alice", "p@ss", "webui-prompt"), 1);
  EXPECT_NE(Login("alice", "p@sS", "webui-prompt"), 1);
  EXPECT_NE(Login("bob", "p@ss", "webui-prompt"), 1);
}

TEST_F(CgiLogin, MessagesArePassedOver) {
  const Service service("webui-prompt", PromptService("info off=p@ss error"));
  EXPECT_EQ(Login("alice", "p@ss", "webui-prompt"), 1);
}

TEST_F(CgiLogin, OtherPromptsAreRefused) {
  for (const char* arguments : {"radio", "binary", "off=p@ss radio", "none"}) {
    const Service service("webui-prompt", PromptService(arguments));
    EXPECT_NE(Login("alice", "p@ss", "webui-prompt"), 1) << arguments;
    EXPECT_EQ(OwnLines(), TroubleWith("webui-prompt", "Conversation error")) << arguments;
  }
}

TEST_F(CgiLogin, ReplyIsTheNameThatPamEndsWith) {
  const Service service("webui-prompt", PromptService("off=p@ss name=Alice.Real"));
  std::string reply;
  EXPECT_EQ(Login("alice", "p@ss", "webui-prompt", &reply), 1);
  EXPECT_EQ(reply, "Alice.Real");
}

TEST_F(CgiLogin, PamRunsAsRootWhenRootIsKept) {
  const Service service("webui-prompt", PromptService("ids=0:0"));
  const tuvo_test::Ids real_root{0, 65534, 65534, 0, 65534, 65534};
  const tuvo_test::Ids root_alone{65534, 0, 65534, 65534, 65534, 65534};
  for (const tuvo_test::Ids& ids :
       {tuvo_test::kRoot, tuvo_test::kSavedRoot, real_root, root_alone}) {
    EXPECT_EQ(RunInChildAs(ids, [] { return Login("alice", "x", "webui-prompt") == 1 ? 0 : 1; }),
              0);
  }
  EXPECT_EQ(RunInChildAs(tuvo_test::kNobody,
                         [] { return Login("alice", "x", "webui-prompt") == 1 ? 0 : 7; }),
            7);
}

TEST_F(CgiLogin, ModulesAreToldToBeSilentAndToRefuseEmptyPasswords) {
  const std::string flags = std::to_string(PAM_SILENT | PAM_DISALLOW_NULL_AUTHTOK);
  const Service service("webui-prompt", PromptService("flags=" + flags));
  EXPECT_EQ(Login("alice", "x", "webui-prompt"), 1);
  const Service other("webui-other", PromptService("flags=0"));
  EXPECT_NE(Login("alice", "x", "webui-other"), 1);
}

// The account is checked and not used: nothing is to be closed again afterwards.
TEST_F(CgiLogin, NeitherSessionNorCredentialsAreAskedFor) {
  const Service service(
      "webui-prompt", PromptService("off=p@ss") + "session required " TUVO_PAM_PROMPT_MODULE "\n");
  unlink(kPamTrace);
  EXPECT_EQ(Login("alice", "p@ss", "webui-prompt"), 1);
  EXPECT_NE(access(kPamTrace, F_OK), 0);
}

TEST_F(CgiLogin, BrokenServiceIsLogged) {
  const Service service("webui-broken", "auth required pam_no_such_module.so\n");
  EXPECT_NE(Login("alice", "alice-secret", "webui-broken"), 1);
  EXPECT_EQ(OwnLines(), TroubleWith("webui-broken", "Module is unknown"));
}

TEST_F(CgiLogin, RefusalsAreLeftToTheModulesToLog) {
  EXPECT_NE(Login("alice", "wrong"), 1);
  EXPECT_NE(Login("mallory", "wrong"), 1);
  EXPECT_NE(Login("dave", "dave-secret"), 1);
  EXPECT_EQ(OwnLines(), std::vector<std::string>{});
}

}  // namespace
