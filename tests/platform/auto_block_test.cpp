#include <fcntl.h>
#include <gtest/gtest.h>
#include <sqlite3.h>
#include <sys/stat.h>
#include <sys/syslog.h>
#include <sys/wait.h>
#include <tuvoplatform/auto_block.h>
#include <unistd.h>

#include <cstdlib>
#include <ctime>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "support/child.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace {

using tuvo_test::RunInChildAs;

constexpr char kStore[] = "/usr/tuvo/etc/private/session/autoblock.db";
constexpr char kConfig[] = "/usr/tuvo/etc/autoblock.conf";
constexpr char kIp[] = "192.0.2.1";

int KeepFirst(void* out, int /*columns*/, char** texts, char** /*names*/) {
  auto* text = static_cast<std::string*>(out);
  if (text->empty() && texts[0] != nullptr) {
    *text = texts[0];
  }
  return 0;
}

std::string Sql(const std::string& sql) {
  sqlite3* database = nullptr;
  EXPECT_EQ(sqlite3_open(kStore, &database), SQLITE_OK);
  std::string first;
  EXPECT_EQ(sqlite3_exec(database, sql.c_str(), KeepFirst, &first, nullptr), SQLITE_OK)
      << sqlite3_errmsg(database);
  sqlite3_close(database);
  return first;
}

constexpr char kCounting[] = "int AutoBlockFailLoginSet(";
constexpr char kClearing[] = "int TUVOAutoBlockFailLoginReset(";
constexpr char kAsking[] = "int TuvoCgiIsDeniedIP(";

// The line that one of the functions above logs: it names the place where the function begins its
// work.
std::string LineOf(const char* function, const std::string& reason) {
  const int line = tuvo_test::SourceLine("platform/src/auto_block.cpp", "__LINE__", function);
  return "auto_block:" + std::to_string(line) + " " + reason;
}

void Fail(const char* ip, int times, const char* service = "SHARING") {
  for (int i = 0; i < times; ++i) {
    EXPECT_EQ(AutoBlockFailLoginSet(ip, service), 0);
  }
}

class AutoBlock : public testing::Test {
 protected:
  void SetUp() override {
    ASSERT_NE(std::getenv("TUVO_PRIVATE_ROOT"), nullptr) << "run under scripts/private-root";
    unlink(kStore);
    unlink(kConfig);
  }

  // The lines logged since the last call.
  std::vector<std::string> Lines() {
    std::vector<std::string> texts;
    for (const tuvo_test::LogLine& line : log_.Take()) {
      EXPECT_EQ(line.facility, LOG_USER);
      EXPECT_EQ(line.priority, LOG_ERR);
      texts.push_back(line.text);
    }
    return texts;
  }

  // The only one of them; "2 lines" when there are two.
  std::string OnlyLine() {
    const std::vector<std::string> lines = Lines();
    return lines.size() == 1 ? lines[0] : std::to_string(lines.size()) + " lines";
  }

  tuvo_test::SyslogListener log_;
};

TEST_F(AutoBlock, TenthFailureDenies) {
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 9);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP("192.0.2.2"), 0);
  EXPECT_TRUE(log_.Take().empty());
}

TEST_F(AutoBlock, FailuresOutsideTheWindowDoNotCount) {
  Fail(kIp, 9);
  Sql("UPDATE failure SET at = at - 302");
  Fail(kIp, 9);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
}

TEST_F(AutoBlock, DenialEnds) {
  Fail(kIp, 10);
  Sql("UPDATE denial SET until = until - 1801");
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
}

TEST_F(AutoBlock, FailuresWhileDeniedKeepTheDenial) {
  Fail(kIp, 30);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
}

TEST_F(AutoBlock, ServicesCountApart) {
  Fail(kIp, 9, "SHARING");
  Fail(kIp, 9, "FTP");
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1, "FTP");
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
}

TEST_F(AutoBlock, ResetClearsCountAndDenial) {
  Fail(kIp, 9);
  EXPECT_EQ(TUVOAutoBlockFailLoginReset(kIp), 0);
  Fail(kIp, 9);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
  EXPECT_EQ(TUVOAutoBlockFailLoginReset(kIp), 0);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
}

TEST_F(AutoBlock, ResetWithoutFailuresSucceeds) {
  EXPECT_EQ(TUVOAutoBlockFailLoginReset(kIp), 0);
  EXPECT_TRUE(log_.Take().empty());
}

TEST_F(AutoBlock, Ipv6CountsPerNetwork) {
  Fail("2001:db8:1:2::1", 5);
  Fail("2001:db8:1:2:aaaa:bbbb:cccc:dddd", 5);
  EXPECT_EQ(TuvoCgiIsDeniedIP("2001:DB8:1:2:0:0:0:99"), 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP("2001:db8:1:3::1"), 0);
}

TEST_F(AutoBlock, MappedIpv4CountsAsIpv4) {
  Fail("::ffff:192.0.2.1", 5);
  Fail("192.0.2.1", 5);
  EXPECT_EQ(TuvoCgiIsDeniedIP("192.0.2.1"), 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP("::ffff:c000:201"), 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP("::ffff:192.0.2.2"), 0);
  EXPECT_EQ(TUVOAutoBlockFailLoginReset("::ffff:192.0.2.1"), 0);
  EXPECT_EQ(TuvoCgiIsDeniedIP("192.0.2.1"), 0);
}

TEST_F(AutoBlock, ConfigurationIsHonoured) {
  std::ofstream(kConfig) << "failures = 3\nwindow_seconds = 20\nblock_seconds = 100\n";
  Fail(kIp, 2);
  Sql("UPDATE failure SET at = at - 22");
  Fail(kIp, 2);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
  Sql("UPDATE denial SET until = until - 101");
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
}

TEST_F(AutoBlock, BadConfigurationMeansDefaults) {
  std::ofstream(kConfig) << "failures = 0\nwindow_seconds = soon\nblock_seconds\n";
  Fail(kIp, 9);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
  EXPECT_TRUE(log_.Take().empty());
}

// The system's own user reads it, whoever asks.
TEST_F(AutoBlock, ConfigurationThatTheSystemCannotReadCountsAsMissing) {
  std::ofstream(kConfig) << "failures = 1\n";
  ASSERT_EQ(chmod(kConfig, 0600), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  ASSERT_EQ(chmod(kConfig, 0644), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
}

TEST_F(AutoBlock, ShorterLimitsShortenARunningDenialAtTheNextFailure) {
  Fail(kIp, 10);
  std::ofstream(kConfig) << "block_seconds = 5\n";
  const std::string left = "SELECT until - strftime('%s', 'now') <= 5 FROM denial";
  EXPECT_EQ(Sql(left), "0");
  Fail("192.0.2.2", 1);
  EXPECT_EQ(Sql(left), "1");
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
}

TEST_F(AutoBlock, TextsThatAreNoAddressesFailWithALine) {
  for (const char* ip : {static_cast<const char*>(nullptr), "", "host", "192.0.2.1 "}) {
    EXPECT_EQ(AutoBlockFailLoginSet(ip, "SHARING"), -1);
    EXPECT_EQ(OnlyLine(), LineOf(kCounting, "not an address"));
    EXPECT_EQ(TUVOAutoBlockFailLoginReset(ip), -1);
    EXPECT_EQ(OnlyLine(), LineOf(kClearing, "not an address"));
    EXPECT_EQ(TuvoCgiIsDeniedIP(ip), -1);
    EXPECT_EQ(OnlyLine(), LineOf(kAsking, "not an address"));
  }
}

TEST_F(AutoBlock, ServiceNeedsAName) {
  for (const char* service : {static_cast<const char*>(nullptr), ""}) {
    EXPECT_EQ(AutoBlockFailLoginSet(kIp, service), -1);
    EXPECT_EQ(OnlyLine(), LineOf(kCounting, "not a service's name"));
  }
  EXPECT_EQ(AutoBlockFailLoginSet(kIp, std::string(64, 'x').c_str()), 0);
  EXPECT_EQ(AutoBlockFailLoginSet(kIp, std::string(65, 'x').c_str()), -1);
}

TEST_F(AutoBlock, CorruptFileFailsWithALine) {
  std::ofstream(kStore) << std::string(8192, 'x');
  ASSERT_EQ(chown(kStore, 1, 1), 0);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), -1);
  EXPECT_EQ(OnlyLine(), LineOf(kAsking, "file is not a database"));
  EXPECT_EQ(AutoBlockFailLoginSet(kIp, "SHARING"), -1);
  EXPECT_EQ(OnlyLine(), LineOf(kCounting, "file is not a database"));
  EXPECT_EQ(TUVOAutoBlockFailLoginReset(kIp), -1);
  EXPECT_EQ(OnlyLine(), LineOf(kClearing, "file is not a database"));
}

// One failure in a process that starts as `ids`; its ids must be the same afterwards.
int FailAs(const tuvo_test::Ids& ids) {
  return RunInChildAs(ids, [&] {
    umask(077);
    const int result = AutoBlockFailLoginSet(kIp, "SHARING");
    EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), result);
    EXPECT_EQ(tuvo_test::ToText(tuvo_test::CurrentIds()), tuvo_test::ToText(ids));
    return result == 0 ? 0 : 7;  // no exit code that others use
  });
}

TEST_F(AutoBlock, FileBelongsToTheSystemWhoeverCreatesIt) {
  for (const tuvo_test::Ids& ids : {tuvo_test::kRoot, tuvo_test::kSavedRoot, tuvo_test::kSystem}) {
    unlink(kStore);
    EXPECT_EQ(FailAs(ids), 0) << tuvo_test::ToText(ids);
    struct stat status {};
    ASSERT_EQ(stat(kStore, &status), 0);
    EXPECT_EQ(status.st_uid, 1u);
    EXPECT_EQ(status.st_gid, 1u);
    EXPECT_EQ(status.st_mode & 07777, 0660u);
  }
}

TEST_F(AutoBlock, AllIdentitiesShareOneCount) {
  for (const tuvo_test::Ids& ids : {tuvo_test::kSavedRoot, tuvo_test::kRoot, tuvo_test::kSystem}) {
    EXPECT_EQ(FailAs(ids), 0);
  }
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "3");
}

TEST_F(AutoBlock, NobodyFailsWithALine) {
  using Texts = std::vector<std::string>;
  const std::string no_new_file = std::string(kStore) + ": Permission denied";
  EXPECT_EQ(FailAs(tuvo_test::kNobody), 7);
  EXPECT_EQ(Lines(), (Texts{LineOf(kCounting, no_new_file), LineOf(kAsking, no_new_file)}));
  Fail(kIp, 1);
  const std::string no_access = "unable to open database file";
  EXPECT_EQ(FailAs(tuvo_test::kNobody), 7);
  EXPECT_EQ(Lines(), (Texts{LineOf(kCounting, no_access), LineOf(kAsking, no_access)}));
}

TEST_F(AutoBlock, ProcessesCountingAtOnceLoseNoCount) {
  constexpr int kProcesses = 16;
  constexpr int kFailures = 25;
  std::ofstream(kConfig) << "failures = " << kProcesses * kFailures
                         << "\nwindow_seconds = 100000\n";
  std::vector<pid_t> children;
  for (int i = 0; i < kProcesses; ++i) {
    const pid_t child = fork();
    if (child == 0) {
      bool good = true;
      // The very last failure of all is left for below.
      for (int n = i == 0 ? 1 : 0; n < kFailures; ++n) {
        good = AutoBlockFailLoginSet(kIp, "SHARING") == 0 && good;
      }
      _exit(good ? 0 : 1);
    }
    children.push_back(child);
  }
  for (const pid_t child : children) {
    int status = 0;
    ASSERT_EQ(waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
  }
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), std::to_string(kProcesses * kFailures - 1));
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  Fail(kIp, 1);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 1);
  EXPECT_TRUE(log_.Take().empty());
}

// Another process that holds a lock of the store for two seconds.
class Holder {
 public:
  // Returns once the lock is taken; `begin` is the statement that takes it.
  explicit Holder(const char* begin) {
    int ready[2];
    EXPECT_EQ(pipe(ready), 0);
    child_ = fork();
    if (child_ == 0) {
      sqlite3* database = nullptr;
      sqlite3_open(kStore, &database);
      sqlite3_exec(database, begin, nullptr, nullptr, nullptr);
      (void)!write(ready[1], "x", 1);
      sleep(2);
      sqlite3_exec(database, "COMMIT", nullptr, nullptr, nullptr);
      _exit(0);
    }
    char byte = 0;
    EXPECT_EQ(read(ready[0], &byte, 1), 1);
    close(ready[0]);
    close(ready[1]);
  }
  ~Holder() { waitpid(child_, nullptr, 0); }
  Holder(const Holder&) = delete;
  Holder& operator=(const Holder&) = delete;

 private:
  pid_t child_ = -1;
};

TEST_F(AutoBlock, LongLockOfAnotherProcessIsWaitedFor) {
  Fail(kIp, 1);
  {
    const Holder holder("BEGIN EXCLUSIVE");
    Fail(kIp, 1);
    EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  }
  EXPECT_EQ(Sql("SELECT COUNT(*) FROM failure"), "2");
}

// Else a process that waits would count its failure as one of the past, or of before a reset.
TEST_F(AutoBlock, AFailureIsOneOfTheMomentAtWhichItIsWritten) {
  Fail("192.0.2.2", 1);
  const std::string begin = std::to_string(time(nullptr));
  {
    const Holder holder("BEGIN IMMEDIATE");  // lets others read meanwhile
    Fail(kIp, 1);
  }
  EXPECT_EQ(Sql("SELECT MAX(at) > " + begin + " FROM failure"), "1");
}

TEST_F(AutoBlock, NoDescriptorStaysOpen) {
  const auto open_descriptors = [] {
    const std::filesystem::directory_iterator folder("/proc/self/fd");
    return std::distance(begin(folder), end(folder));
  };
  const auto before = open_descriptors();
  Fail(kIp, 2);
  EXPECT_EQ(TuvoCgiIsDeniedIP(kIp), 0);
  EXPECT_EQ(TUVOAutoBlockFailLoginReset(kIp), 0);
  EXPECT_EQ(open_descriptors(), before);
}

}  // namespace
