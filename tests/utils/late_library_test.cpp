// Which libraries come when. Loading is for the life of a process, so each test looks at one of its
// own.
#include <gtest/gtest.h>
#include <internal/late_library.h>
#include <link.h>
#include <tuvosharing/utils.h>

#include <cerrno>
#include <string>
#include <string_view>
#include <vector>

#include "support/child.h"
#include "support/emptied_file.h"
#include "support/source_line.h"
#include "support/syslog_listener.h"

namespace {

using TUVO::sharing::MD5HashPassword;
using TUVO::sharing::Sha1WithSaltHashPassword;
using TUVO::sharing::internal::LateFunctions;
using TUVO::sharing::internal::LateLibrary;
using tuvo_test::EmptiedFile;
using tuvo_test::RunInChild;

// Whether this process has loaded a library of that name, whatever its version.
bool IsLoaded(std::string_view name) {
  struct Search {
    std::string file;
    bool found;
  } search{"/" + std::string(name) + ".so", false};
  dl_iterate_phdr(
      [](dl_phdr_info* library, size_t /*size*/, void* data) {
        auto* wanted = static_cast<Search*>(data);
        wanted->found |=
            std::string_view(library->dlpi_name).find(wanted->file) != std::string_view::npos;
        return 0;
      },
      &search);
  return search.found;
}

// What stands in the log when `soname` was missed so many times.
std::vector<std::string> Missed(const std::string& reason, size_t times) {
  const int line = tuvo_test::SourceLine("include/internal/late_library.h", "SHARING_LOG(");
  return std::vector<std::string>(times, "late_library:" + std::to_string(line) + " " + reason);
}

struct NoLibrary {
  const LateLibrary library{"libtuvo-nowhere.so.1"};
};

struct NoFunction {
  const LateLibrary library{"libc.so.6"};
  int (*const function)() = library.Find<int()>("tuvo_no_function");
};

struct Process {
  const LateLibrary library{"libc.so.6"};
  int (*const function)() = library.Find<int()>("tuvo_own_function");
};

}  // namespace

extern "C" __attribute__((visibility("default"))) int tuvo_own_function() {
  return 7;
}

namespace {

TEST(LateLibrary, EachDigestsLibraryComesWithItsFirstDigest) {
  EXPECT_EQ(0, RunInChild([] {
              EXPECT_FALSE(IsLoaded("libcrypto"));
              EXPECT_FALSE(IsLoaded("libgcrypt"));
              std::string out;
              EXPECT_TRUE(MD5HashPassword("abc", out));
              EXPECT_TRUE(IsLoaded("libcrypto"));
              EXPECT_FALSE(IsLoaded("libgcrypt"));
              EXPECT_TRUE(Sha1WithSaltHashPassword("ab", "c", out));
              EXPECT_TRUE(IsLoaded("libgcrypt"));
              return 0;
            }));
}

TEST(LateLibrary, ADigestWhoseLibraryCannotBeLoadedFailsWithALogLineAndIsTriedAgain) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(0, RunInChild([] {
              std::string out = "kept";
              {
                const EmptiedFile libcrypto(TUVO_LIBCRYPTO_FILE);
                const EmptiedFile libgcrypt(TUVO_LIBGCRYPT_FILE);
                EXPECT_FALSE(MD5HashPassword("abc", out));
                EXPECT_FALSE(Sha1WithSaltHashPassword("ab", "c", out));
                EXPECT_EQ(out, "kept");
              }
              EXPECT_TRUE(MD5HashPassword("abc", out));
              EXPECT_EQ(out, "900150983cd24fb0d6963f7d28e17f72");
              EXPECT_TRUE(Sha1WithSaltHashPassword("ab", "c", out));
              EXPECT_EQ(out, "a9993e364706816aba3e25717850c26c9cd0d89d");
              return 0;
            }));
  const std::vector<std::string> lines = log.TakeTexts();
  ASSERT_EQ(lines.size(), 2U);
  EXPECT_NE(lines[0].find("libcrypto.so"), std::string::npos) << lines[0];
  EXPECT_NE(lines[1].find("libgcrypt.so"), std::string::npos) << lines[1];
}

TEST(LateLibrary, AMissingLibraryIsLoggedEachTime) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(LateFunctions<NoLibrary>(), nullptr);
  EXPECT_EQ(LateFunctions<NoLibrary>(), nullptr);
  EXPECT_EQ(log.TakeTexts(), Missed("libtuvo-nowhere.so.1: cannot open shared object file: No such "
                                    "file or directory",
                                    2));
}

TEST(LateLibrary, AMissingFunctionIsLogged) {
  tuvo_test::SyslogListener log;
  EXPECT_EQ(LateFunctions<NoFunction>(), nullptr);
  const std::vector<std::string> lines = log.TakeTexts();
  ASSERT_EQ(lines.size(), 1U);
  EXPECT_NE(lines[0].find("undefined symbol: tuvo_no_function"), std::string::npos) << lines[0];
}

TEST(LateLibrary, AFunctionOfTheProgramGoesFirst) {
  const auto* functions = LateFunctions<Process>();
  ASSERT_NE(functions, nullptr);
  EXPECT_EQ(functions->function(), 7);
  EXPECT_EQ(LateFunctions<Process>(), functions) << "there is one for the process";
}

TEST(LateLibrary, ErrnoIsLeftAlone) {
  errno = EDOM;
  EXPECT_EQ(LateFunctions<NoLibrary>(), nullptr);
  EXPECT_EQ(errno, EDOM);
  EXPECT_EQ(0, RunInChild([] {
              std::string out;
              errno = EDOM;
              EXPECT_TRUE(MD5HashPassword("abc", out));
              EXPECT_EQ(errno, EDOM);
              return 0;
            }));
}

}  // namespace
