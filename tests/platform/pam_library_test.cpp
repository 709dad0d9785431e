// libpam comes with the first account login. Loading is for the life of a process, hence a program
// of its own, whose tests look at children.
#include <gtest/gtest.h>
#include <link.h>
#include <sys/syslog.h>
#include <tuvoplatform/cgi.h>

#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "support/child.h"
#include "support/emptied_file.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace {

int Login(const char* user, const char* password, std::string& reply) {
  TUVOCGI cgi{};
  EXPECT_EQ(TuvoCgiInit("", &cgi), 1);
  char buffer[123] = {};
  const LoginInfo login{user, password, "webui", 15, 1};
  const int result = TuvoCgiLogin(&cgi, buffer, sizeof buffer, &login);
  TuvoCgiFree(&cgi);
  reply = buffer;
  return result;
}

bool IsLibpamLoaded() {
  bool found = false;
  dl_iterate_phdr(
      [](dl_phdr_info* library, size_t /*size*/, void* data) {
        *static_cast<bool*>(data) |=
            std::string_view(library->dlpi_name).find("/libpam.so") != std::string_view::npos;
        return 0;
      },
      &found);
  return found;
}

TEST(PamLibrary, ComesWithTheFirstLoginThatPamHearsOf) {
  EXPECT_EQ(0, tuvo_test::RunInChild([] {
              std::string reply;
              EXPECT_EQ(Login("alice", "", reply), -1);
              EXPECT_FALSE(IsLibpamLoaded());
              EXPECT_EQ(Login("alice", "alice-secret", reply), 1);
              EXPECT_TRUE(IsLibpamLoaded());
              return 0;
            }));
}

TEST(PamLibrary, WithoutItALoginIsRefusedWithALogLineAndTheNextTriesAgain) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(0, tuvo_test::RunInChild([] {
              std::string reply;
              {
                const tuvo_test::EmptiedFile libpam(TUVO_LIBPAM_FILE);
                EXPECT_EQ(Login("alice", "alice-secret", reply), -1);
                EXPECT_EQ(reply, "");
              }
              EXPECT_EQ(Login("alice", "alice-secret", reply), 1);
              EXPECT_EQ(reply, "alice");
              return 0;
            }));
  const int line = tuvo_test::SourceLine("platform/src/pam_library.cpp", "syslog(LOG_ERR");
  const std::string begin = "pam_library:" + std::to_string(line) + " PAM service webui: ";
  const std::vector<tuvo_test::LogLine> lines = log.Take();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_EQ(lines[0].priority, LOG_ERR);
  EXPECT_EQ(lines[0].text.rfind(begin, 0), 0U) << lines[0].text;
  EXPECT_NE(lines[0].text.find("libpam.so"), std::string::npos) << lines[0].text;
}

}  // namespace
