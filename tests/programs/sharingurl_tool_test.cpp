// The whole tool, as a process, in its place in the private /usr/tuvo, alone and behind the
// library's function that runs it.
#include <fcntl.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <spawn.h>
#include <sys/mount.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <syslog.h>
#include <tuvosharing/sharing_url.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <iterator>
#include <string>
#include <system_error>
#include <vector>

#include "support/child.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace {

using Texts = std::vector<std::string>;
using TUVO::sharing::_tag_SHARING_URL_TYPE;
using TUVO::sharing::GetSharingURL;

constexpr char kTool[] = "/usr/tuvo/bin/tuvosharingurl";
constexpr char kConfig[] = "/usr/tuvo/etc/tuvosharing.conf";
constexpr char kOutput[] = "/tmp/output";
constexpr int kCannotTry = 77;

std::string FileText(const std::string& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

struct Ran {
  int status;  // the exit status; -1 when it did not end by itself
  std::string output;
  std::string errors;
};

// What becomes of a new process's descriptors.
class FileActions {
 public:
  FileActions() { posix_spawn_file_actions_init(&actions_); }
  ~FileActions() { posix_spawn_file_actions_destroy(&actions_); }
  FileActions(const FileActions&) = delete;
  FileActions& operator=(const FileActions&) = delete;

  void Write(int fd, const std::string& path) {
    posix_spawn_file_actions_addopen(&actions_, fd, path.c_str(), O_WRONLY | O_CREAT | O_TRUNC,
                                     0600);
  }
  void Close(int fd) { posix_spawn_file_actions_addclose(&actions_, fd); }
  const posix_spawn_file_actions_t* get() const { return &actions_; }

 private:
  posix_spawn_file_actions_t actions_{};
};

using Descriptors = std::vector<int>;

// The process of the program, -1 when it could not be started.
pid_t Start(const Texts& command, const std::string& output, const Descriptors& closed) {
  std::vector<char*> argv;
  for (const std::string& argument : command) {
    argv.push_back(const_cast<char*>(argument.c_str()));
  }
  argv.push_back(nullptr);
  FileActions actions;
  actions.Write(STDOUT_FILENO, output);
  actions.Write(STDERR_FILENO, "/tmp/errors");
  for (const int fd : closed) {
    actions.Close(fd);
  }
  pid_t pid = -1;
  return posix_spawn(&pid, argv[0], actions.get(), nullptr, argv.data(), environ) == 0 ? pid : -1;
}

Ran Wait(pid_t pid, const std::string& output) {
  int status = -1;
  if (pid < 0 || waitpid(pid, &status, 0) != pid) {
    return {-1, "(not started)", ""};
  }
  return {WIFEXITED(status) ? WEXITSTATUS(status) : -1, output == kOutput ? FileText(output) : "",
          FileText("/tmp/errors")};
}

Texts ToolWith(const Texts& arguments) {
  Texts command{kTool};
  command.insert(command.end(), arguments.begin(), arguments.end());
  return command;
}

Ran RunTool(const Texts& arguments, const std::string& output = kOutput,
            const Descriptors& closed = {}) {
  return Wait(Start(ToolWith(arguments), output, closed), output);
}

// What the tool prints when all is well.
std::string Output(const Texts& arguments) {
  const Ran ran = RunTool(arguments);
  EXPECT_EQ(ran.status, 0);
  EXPECT_EQ(ran.errors, "");
  return ran.output;
}

class SharingUrlTool : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    std::filesystem::copy_file(TUVO_SHARINGURL, kTool,
                               std::filesystem::copy_options::overwrite_existing);
  }
  static void TearDownTestSuite() { std::filesystem::remove(kTool); }

  SharingUrlTool() {
    std::filesystem::remove(kConfig);
    umask(022);
  }
  ~SharingUrlTool() override { std::filesystem::remove(kConfig); }

  static void Configure(const std::string& address) {
    std::ofstream(kConfig) << "external_address = " << address << "\n";
  }

  tuvo_test::SyslogListener listener_;
};

TEST_F(SharingUrlTool, AGivenAddressIsKindTwo) {
  EXPECT_EQ(Output({"photo", "0", "1", "nas.example.org", "Zk3_abcde"}),
            "https://nas.example.org/sharing/Zk3_abcde\n2\n");
  EXPECT_EQ(Output({"photo", "9443", "0", "2001:db8::9", "Zk3_abcde"}),
            "http://[2001:db8::9]:9443/sharing/Zk3_abcde\n2\n");
}

TEST_F(SharingUrlTool, TheConfiguredAddressIsKindOne) {
  Configure("https://nas.example.org:8443/files/");
  EXPECT_EQ(Output({"photo", "9080", "0", "", "abc"}),
            "https://nas.example.org:8443/files/sharing/abc\n1\n");
  Configure("nas.example.org");
  EXPECT_EQ(Output({"photo", "9080", "0", "", "abc"}),
            "http://nas.example.org:9080/sharing/abc\n1\n");
  EXPECT_EQ(listener_.TakeTexts(), Texts{});
}

TEST_F(SharingUrlTool, AGivenAddressGoesBeforeTheConfiguredOne) {
  Configure("https://nas.example.org");
  EXPECT_EQ(Output({"photo", "0", "0", "other", "abc"}), "http://other/sharing/abc\n2\n");
}

TEST_F(SharingUrlTool, AConfiguredAddressThatIsNoneIsToldAndPassedOver) {
  Configure("https://nas.example.org/?x");
  const std::string output = Output({"photo", "0", "1", "", "abc"});
  EXPECT_EQ(output.substr(output.size() - 3), "\n0\n");
  EXPECT_EQ(output.find("nas.example.org"), std::string::npos);
  const std::vector<tuvo_test::LogLine> lines = listener_.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].facility, LOG_USER);
  EXPECT_EQ(lines[0].priority, LOG_WARNING);
  EXPECT_EQ(tuvo_test::Normalized(lines[0].text),
            "sharingurl:LINE external_address in /usr/tuvo/etc/tuvosharing.conf is no address");
}

TEST_F(SharingUrlTool, BadArgumentsPrintNothingAndEndWithTwo) {
  for (const Texts& arguments :
       {Texts{}, Texts{"photo"}, Texts{"photo", "0", "1", "", "abc", "x"},
        Texts{"photo", "65536", "1", "", "abc"}, Texts{"photo", "-1", "1", "", "abc"},
        Texts{"photo", "0", "2", "", "abc"}, Texts{"photo", "0", "1", "nas/x", "abc"},
        Texts{"photo", "0", "1", "nas\nhttps://evil", "abc"}, Texts{"photo", "0", "1", "", "ab"},
        Texts{"photo", "0", "1", "", "abc\nx"}, Texts{"pho\nto", "0", "1", "", "abc"},
        Texts{"--help", "x"}}) {
    const Ran ran = RunTool(arguments);
    EXPECT_EQ(ran.status, 2);
    EXPECT_EQ(ran.output, "");
    EXPECT_EQ(ran.errors.substr(0, 16), "tuvosharingurl: ");
    EXPECT_EQ(ran.errors.find('\n'), ran.errors.size() - 1) << "one line, whatever was given";
    EXPECT_EQ(ran.errors.find("evil"), std::string::npos);
  }
}

TEST_F(SharingUrlTool, HelpSaysHowToCallIt) {
  EXPECT_EQ(Output({"--help"}).substr(0, 54),
            "Usage: tuvosharingurl PROJECT PORT HTTPS ADDRESS HASH\n");
}

TEST_F(SharingUrlTool, HelpThatCouldNotBeWrittenIsAFailure) {
  EXPECT_EQ(RunTool({"--help"}, "/dev/full").status, 1);
}

TEST_F(SharingUrlTool, LinesOfTheConfigurationThatItDoesNotNeedAreNotToldByIt) {
  std::ofstream(kConfig) << "share_folder = /..\nunknown = x\nexternal_address = nas\nwords\n";
  EXPECT_EQ(Output({"photo", "0", "1", "", "abc"}), "https://nas/sharing/abc\n1\n");
  EXPECT_EQ(listener_.TakeTexts(), Texts{});
}

TEST_F(SharingUrlTool, AConfigurationThatOthersMayWriteToIsToldAndPassedOver) {
  Configure("https://evil.example");
  ASSERT_EQ(chmod(kConfig, 0666), 0);
  const std::string output = Output({"photo", "0", "1", "", "abc"});
  EXPECT_EQ(output.substr(output.size() - 3), "\n0\n");
  EXPECT_EQ(output.find("evil"), std::string::npos);
  const std::vector<tuvo_test::LogLine> lines = listener_.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].priority, LOG_ERR);
}

// With nothing in their place, the log's socket would be the descriptor that is printed to.
TEST_F(SharingUrlTool, WithAClosedStandardOutputItFailsAndTheLogSeesNoHash) {
  Configure("no address");
  for (const Descriptors& closed : {Descriptors{1}, Descriptors{0, 1}}) {
    for (const Texts& arguments : {Texts{"photo", "0", "1", "", "Zk3_abcde"}, Texts{"--help"}}) {
      const Ran ran = RunTool(arguments, kOutput, closed);
      EXPECT_EQ(ran.status, 1);
      EXPECT_EQ(ran.errors, "tuvosharingurl: the standard output is closed\n");
    }
  }
  EXPECT_EQ(RunTool({"photo", "0", "1", "", "Zk3_abcde"}, kOutput, {0, 1, 2}).status, 1);
  EXPECT_EQ(listener_.TakeTexts(), Texts{});
}

TEST_F(SharingUrlTool, AClosedStandardInputOrErrorChangesNothing) {
  Configure("no address");
  for (const Descriptors& closed : {Descriptors{0}, Descriptors{2}, Descriptors{0, 2}}) {
    const Ran ran = RunTool({"photo", "0", "1", "", "Zk3_abcde"}, kOutput, closed);
    EXPECT_EQ(ran.status, 0);
    EXPECT_NE(ran.output.find("/sharing/Zk3_abcde\n0\n"), std::string::npos);
    EXPECT_EQ(listener_.Take().size(), 1U) << "about the configured address";
    EXPECT_EQ(RunTool({"photo"}, kOutput, closed).status, 2);
    EXPECT_EQ(listener_.Take().size(), 0U);
  }
}

// The copies of the arguments find no memory when the tool itself still finds enough. How much it
// needs differs, so every limit is tried, in steps that are smaller than those copies.
TEST_F(SharingUrlTool, WithoutMemoryItFailsAndSaysSo) {
#ifdef __SANITIZE_ADDRESS__
  GTEST_SKIP() << "the address sanitizer needs more memory than this test leaves";
#endif
  const Texts large(12, std::string(120000, 'x'));
  int without_memory = 0;
  for (int limit = 908000; limit < 20000000; limit += 908000) {
    Texts command{"/usr/bin/prlimit", "--data=" + std::to_string(limit), kTool};
    command.insert(command.end(), large.begin(), large.end());
    const Ran ran = Wait(Start(command, kOutput, {}), kOutput);
    EXPECT_NE(ran.status, 0) << limit;
    EXPECT_EQ(ran.output, "") << limit;
    if (ran.errors == "tuvosharingurl: std::bad_alloc\n") {
      ++without_memory;
      EXPECT_EQ(ran.status, 1) << limit;
    }
  }
  EXPECT_GT(without_memory, 0);
}

TEST_F(SharingUrlTool, AnAddressThatCouldNotBeWrittenIsAFailure) {
  const Ran ran = RunTool({"photo", "0", "1", "nas", "abc"}, "/dev/full");
  EXPECT_EQ(ran.status, 1);
  EXPECT_EQ(ran.errors, "tuvosharingurl: cannot write the address: No space left on device\n");
}

TEST_F(SharingUrlTool, AnybodyMayAsk) {
  Configure("https://nas.example.org");
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kNobody,
                                    [] {
                                      std::string url;
                                      _tag_SHARING_URL_TYPE type{};
                                      const bool answered =
                                          GetSharingURL("photo", 0, true, "abc", url, type);
                                      EXPECT_EQ(url, "https://nas.example.org/sharing/abc");
                                      return answered ? 0 : 1;
                                    }),
            0);
}

// Behind the library.

TEST_F(SharingUrlTool, TheLibrarysFunctionGivesAddressAndKind) {
  Configure("https://nas.example.org");
  std::string url;
  _tag_SHARING_URL_TYPE type{};
  EXPECT_TRUE(GetSharingURL("photo", 0, true, "Zk3_abcde", url, type));
  EXPECT_EQ(url, "https://nas.example.org/sharing/Zk3_abcde");
  EXPECT_EQ(type, 1);
  EXPECT_TRUE(GetSharingURL("photo", 8080, false, "192.0.2.7", "Zk3_abcde", url, type));
  EXPECT_EQ(url, "http://192.0.2.7:8080/sharing/Zk3_abcde");
  EXPECT_EQ(type, 2);
  EXPECT_EQ(listener_.TakeTexts(), Texts{});
}

TEST_F(SharingUrlTool, TheLibrarysFunctionFailsForWhatTheToolRefuses) {
  std::string url = "untouched";
  _tag_SHARING_URL_TYPE type{};
  EXPECT_FALSE(GetSharingURL("photo", -1, true, "abc", url, type));
  EXPECT_FALSE(GetSharingURL("photo", 0, true, "../abc", url, type));
  EXPECT_FALSE(GetSharingURL("photo", 0, true, "nas/x", "abc", url, type));
  EXPECT_EQ(url, "untouched");
  EXPECT_EQ(listener_.Take().size(), 3U);
}

TEST_F(SharingUrlTool, TheLongestAddressReachesTheLibrarysCaller) {
  const std::string label(63, 'h');
  const std::string host = label + "." + label + "." + label + "." + std::string(61, 'h') +
                           ":10000/" + std::string(1023, 'p');
  Configure("https://" + host);
  const std::string hash(64, 'a');
  std::string url;
  _tag_SHARING_URL_TYPE type{};
  EXPECT_TRUE(GetSharingURL("photo", 0, true, hash, url, type));
  EXPECT_EQ(url, "https://" + host + "/sharing/" + hash);
  EXPECT_EQ(type, 1);
}

// The machine's own name, in a child with a host name, hosts and interfaces of its own.

// Runs `body` in such a child; without interfaces that are up, unless `body` adds some. False, with
// the test skipped, where that is not allowed.
bool RunAsHost(const std::string& name, const std::string& hosts,
               const std::function<int()>& body) {
  const int status = tuvo_test::RunInChild([&] {
    std::ofstream("/tmp/hosts") << hosts;
    if (unshare(CLONE_NEWUTS | CLONE_NEWNET | CLONE_NEWNS) != 0 ||
        mount("/tmp/hosts", "/etc/hosts", nullptr, MS_BIND, nullptr) != 0 ||
        sethostname(name.c_str(), name.size()) != 0) {
      return kCannotTry;
    }
    return body();
  });
  EXPECT_TRUE(status == 0 || status == kCannotTry);
  return status != kCannotTry;
}

int ExpectOutput(const std::string& host) {
  EXPECT_EQ(Output({"photo", "0", "1", "", "abc"}), "https://" + host + "/sharing/abc\n0\n");
  return 0;
}

TEST_F(SharingUrlTool, AFullHostNameThatResolvesIsTheOwnName) {
  if (!RunAsHost("nas.example.org", "192.0.2.7 nas.example.org\n",
                 [] { return ExpectOutput("nas.example.org"); })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, TheFullNameOfAShortHostNameIsTheOwnName) {
  if (!RunAsHost("nas", "127.0.1.1 nas.example.org nas\n",
                 [] { return ExpectOutput("nas.example.org"); })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, WithoutFullNameAndAddressTheHostNameIsTheOwnName) {
  if (!RunAsHost("nas", "127.0.0.1 localhost nas\n", [] { return ExpectOutput("nas"); }) ||
      !RunAsHost("nas.example.org", "127.0.0.1 localhost\n",
                 [] { return ExpectOutput("nas.example.org"); })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, WithoutAnyNameItFailsAndPrintsNothing) {
  if (!RunAsHost("(none)", "127.0.0.1 localhost\n", [] {
        const Ran ran = RunTool({"photo", "0", "1", "", "abc"});
        EXPECT_EQ(ran.status, 1);
        EXPECT_EQ(ran.output, "");
        EXPECT_EQ(ran.errors,
                  "tuvosharingurl: this machine has no name that can stand in an address\n");
        return 0;
      })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, WithoutFullNameTheFirstGlobalAddressIsTheOwnName) {
  const bool tried = RunAsHost("nas", "127.0.0.1 localhost\n", [] {
    if (std::system("ip link set lo up && ip link add tuvo0 type veth peer name tuvo1 && "
                    "ip link set tuvo0 up && ip addr add 169.254.1.1/16 dev tuvo0 && "
                    "ip addr add 2001:db8::9/64 dev tuvo0 nodad") != 0) {
      return kCannotTry;
    }
    ExpectOutput("[2001:db8::9]");
    EXPECT_EQ(std::system("ip addr add 192.0.2.9/24 dev tuvo0"), 0);
    ExpectOutput("192.0.2.9");
    EXPECT_EQ(std::system("ip link set tuvo0 down"), 0);
    return ExpectOutput("nas");
  });
  if (!tried) {
    GTEST_SKIP() << "network interfaces cannot be made here";
  }
}

TEST_F(SharingUrlTool, AFullHostNameThatIsAnAliasIsTheOwnNameAllTheSame) {
  if (!RunAsHost("nas.example.org", "192.0.2.7 other.example.org nas.example.org\n",
                 [] { return ExpectOutput("nas.example.org"); })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, AResolvedNameThatOthersDoNotKnowItByIsPassedOver) {
  for (const char* full : {"localhost.localdomain", "nas.local<b>", "nas.local/x", "nas."}) {
    if (!RunAsHost("nas", std::string("127.0.0.1 ") + full + " nas\n",
                   [] { return ExpectOutput("nas"); })) {
      GTEST_SKIP() << "namespaces for host name and network are not allowed here";
    }
  }
}

TEST_F(SharingUrlTool, AHostNameOf64CharactersIsReadWhole) {
  const std::string name = "nas." + std::string(60, 'n');
  if (!RunAsHost(name, "192.0.2.7 " + name + "\n", [&] { return ExpectOutput(name); })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
}

TEST_F(SharingUrlTool, WithoutAnyNameAndStandardErrorTheLogSeesNoneOfIt) {
  Configure("no address");
  if (!RunAsHost("(none)", "127.0.0.1 localhost\n", [] {
        EXPECT_EQ(RunTool({"photo", "0", "1", "", "abc"}, kOutput, {2}).status, 1);
        return 0;
      })) {
    GTEST_SKIP() << "namespaces for host name and network are not allowed here";
  }
  EXPECT_EQ(listener_.Take().size(), 1U) << "about the configured address";
}

// In the child of RunAsHost: an interface, and a name server behind it that says nothing.
bool HasSilentServer() {
  std::ofstream("/tmp/resolv.conf") << "nameserver 192.0.2.53\n";
  return std::system(
             "ip link add tuvo0 type veth peer name tuvo1 && ip link set tuvo0 up && "
             "ip link set tuvo1 up && ip addr add 192.0.2.9/24 dev tuvo0 && "
             "mount --bind /tmp/resolv.conf /etc/resolv.conf") == 0;
}

int ExpectOutputSoon() {
  const auto begin = std::chrono::steady_clock::now();
  ExpectOutput("192.0.2.9");
  EXPECT_LE(std::chrono::steady_clock::now() - begin, std::chrono::seconds(8));
  return 0;
}

// With its only server silent the resolver would take ten seconds by itself.
TEST_F(SharingUrlTool, ASilentResolverDoesNotHoldItUpForLong) {
  if (!RunAsHost("nas", "127.0.0.1 localhost\n",
                 [] { return HasSilentServer() ? ExpectOutputSoon() : kCannotTry; })) {
    GTEST_SKIP() << "network interfaces cannot be made here";
  }
}

TEST_F(SharingUrlTool, ACallersPatienceWithTheResolverDoesNotCount) {
  const bool tried = RunAsHost("nas", "127.0.0.1 localhost\n", [] {
    setenv("RES_OPTIONS", "timeout:10 attempts:3", 1);
    return HasSilentServer() ? ExpectOutputSoon() : kCannotTry;
  });
  if (!tried) {
    GTEST_SKIP() << "network interfaces cannot be made here";
  }
}

// Whether the process has asked a server: it has a socket then.
bool HasSocket(pid_t pid) {
  std::error_code gone;
  for (const auto& entry :
       std::filesystem::directory_iterator("/proc/" + std::to_string(pid) + "/fd", gone)) {
    if (std::filesystem::read_symlink(entry.path(), gone).string().substr(0, 7) == "socket:") {
      return true;
    }
  }
  return false;
}

// A silent server gives every local user time to look.
TEST_F(SharingUrlTool, WhileItRunsNobodySeesTheHashAmongItsArguments) {
  const bool tried = RunAsHost("nas", "127.0.0.1 localhost\n", [] {
    if (!HasSilentServer()) {
      return kCannotTry;
    }
    const pid_t pid = Start(ToolWith({"photo", "0", "1", "", "Zk3_abcde"}), kOutput, {});
    EXPECT_GT(pid, 0);
    std::string seen;
    siginfo_t end{};
    for (bool asked = false; !asked && end.si_pid == 0;) {
      waitid(P_PID, static_cast<id_t>(pid), &end, WEXITED | WNOHANG | WNOWAIT);
      asked = HasSocket(pid);
      seen = FileText("/proc/" + std::to_string(pid) + "/cmdline");
    }
    EXPECT_EQ(end.si_pid, 0) << "it did not wait for the server";
    EXPECT_EQ(seen.substr(0, sizeof kTool), std::string(kTool, sizeof kTool));
    EXPECT_EQ(seen.find_first_not_of('\0', sizeof kTool), std::string::npos) << seen;
    const Ran ran = Wait(pid, kOutput);
    EXPECT_EQ(ran.output, "https://192.0.2.9/sharing/Zk3_abcde\n0\n");
    return 0;
  });
  if (!tried) {
    GTEST_SKIP() << "network interfaces cannot be made here";
  }
}

}  // namespace
