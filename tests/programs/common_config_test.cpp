#include "common/config.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <syslog.h>
#include <unistd.h>

#include <cerrno>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "support/child.h"
#include "support/syslog_listener.h"

namespace {

// Which of the next reads fails; 0: none.
int failing_read = 0;

}  // namespace

// In place of the system's: no file here fails in its middle by itself. Calls from within the
// standard libraries do not come here.
extern "C" ssize_t read(int fd, void* buffer, size_t size) {
  if (failing_read > 0 && --failing_read == 0) {
    errno = EIO;
    return -1;
  }
  return syscall(SYS_read, fd, buffer, size);
}

namespace common {
namespace {

using Texts = std::vector<std::string>;

constexpr char kPath[] = "/tmp/tuvosharing.conf";

class CommonConfig : public testing::Test {
 protected:
  CommonConfig() {
    std::filesystem::remove(kPath);
    umask(022);
  }

  static void Write(const std::string& text) { std::ofstream(kPath, std::ios::binary) << text; }

  static Config Read(const std::string& text) {
    Write(text);
    return ReadConfig(kPath);
  }

  // What was logged since the last look, without the source's line.
  Texts Logged() {
    Texts texts;
    for (const tuvo_test::LogLine& line : listener_.Take()) {
      EXPECT_EQ(line.facility, LOG_USER);
      EXPECT_EQ(line.priority,
                line.text.find(" line ") != std::string::npos ? LOG_WARNING : LOG_ERR);
      texts.push_back(tuvo_test::Normalized(line.text));
    }
    return texts;
  }

  static std::string Complaint(int line, const std::string& problem) {
    return "config:LINE line " + std::to_string(line) + " of " + kPath + " " + problem;
  }

  tuvo_test::SyslogListener listener_;
};

constexpr char kNoForm[] = "is not of the form \"name = value\"";
constexpr char kUnknown[] = "has an unknown name";
constexpr char kControl[] = "has a control character in its value";
constexpr char kNoFolder[] = "names no folder that can be opened for sharing";

TEST_F(CommonConfig, ValuesAreRead) {
  const Config config = Read(
      "external_address = https://nas.example.org:8443/x\n"
      "share_folder = /exports/public\nshare_folder = /exports2\n");
  EXPECT_EQ(config.external_address, "https://nas.example.org:8443/x");
  EXPECT_EQ(config.share_folders, (Texts{"/exports/public", "/exports2"}));
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, AMissingFileMeansDefaultsWithoutALine) {
  const Config config = ReadConfig("/tmp/nonexistent/tuvosharing.conf");
  EXPECT_EQ(config.external_address, "");
  EXPECT_EQ(config.share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, AnEmptyFileMeansDefaults) {
  EXPECT_EQ(Read("").share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, TheFileIsTheSystems) {
  EXPECT_STREQ(kConfigPath, "/usr/tuvo/etc/tuvosharing.conf");
  std::ofstream(kConfigPath) << "external_address = nas\n";
  EXPECT_EQ(ReadConfig().external_address, "nas");
  std::filesystem::remove(kConfigPath);
}

TEST_F(CommonConfig, BlanksLineEndsAndCommentsAreForgiven) {
  const Config config = Read(
      "# a comment\r\n\r\n \t \n\t# another\n"
      "  share_folder=/a\t # a folder\r\n\tshare_folder\t=\t/b c  \n  external_address =nas  #");
  EXPECT_EQ(config.share_folders, (Texts{"/a", "/b c"}));
  EXPECT_EQ(config.external_address, "nas");
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, ANumberSignWithinAWordIsPartOfIt) {
  EXPECT_EQ(Read("share_folder = /music/c#d#\n").share_folders, Texts{"/music/c#d#"});
}

TEST_F(CommonConfig, AnEqualsSignInAValueIsPartOfIt) {
  EXPECT_EQ(Read("share_folder = /a=b\n").share_folders, Texts{"/a=b"});
}

TEST_F(CommonConfig, TheLastExternalAddressCounts) {
  EXPECT_EQ(Read("external_address = a\nexternal_address = b\n").external_address, "b");
  EXPECT_EQ(Read("external_address = a\nexternal_address =\n").external_address, "");
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, AFolderHasOneSpellingAndStandsOnce) {
  EXPECT_EQ(Read("share_folder = /a/\nshare_folder = //b///c//\nshare_folder = /a\n").share_folders,
            (Texts{"/a", "/b/c"}));
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, FoldersThatOpenTooMuchOrNothingAreRefused) {
  for (const char* folder : {"/", "//", "/.", "/./", "/..", "/a/..", "/a/../b", "/a/./b", "/a/.",
                             "a", "./a", "../a", "~/a", ""}) {
    EXPECT_EQ(Read(std::string("share_folder = ") + folder + "\n").share_folders, Texts{})
        << folder;
    EXPECT_EQ(Logged(), Texts{Complaint(1, kNoFolder)}) << folder;
  }
}

TEST_F(CommonConfig, DotsWithinANameAreFine) {
  EXPECT_EQ(Read("share_folder = /.a/b../...\n").share_folders, Texts{"/.a/b../..."});
}

TEST_F(CommonConfig, LinesOfNoUseAreToldByNumberAndPassedOver) {
  const Config config = Read(
      "share_folder = /a\nshare_folder\n= /b\nshare_folders = /c\nSHARE_FOLDER = /d\n"
      "secret words\nshare_folder = e\nshare_folder = /f\n");
  EXPECT_EQ(config.share_folders, (Texts{"/a", "/f"}));
  EXPECT_EQ(Logged(),
            (Texts{Complaint(2, kNoForm), Complaint(3, kUnknown), Complaint(4, kUnknown),
                   Complaint(5, kUnknown), Complaint(6, kNoForm), Complaint(7, kNoFolder)}));
}

TEST_F(CommonConfig, ControlCharactersInAValueAreRefused) {
  for (const char c : {'\0', '\1', '\t', '\r', '\x1b', '\x1f', '\x7f'}) {
    const std::string value = std::string("/a") + c + "b";
    const Config config =
        Read("share_folder = " + value + "\nexternal_address = nas" + std::string(1, c) + "x\n");
    EXPECT_EQ(config.share_folders, Texts{}) << static_cast<int>(c);
    EXPECT_EQ(config.external_address, "") << static_cast<int>(c);
    EXPECT_EQ(Logged(), (Texts{Complaint(1, kControl), Complaint(2, kControl)}))
        << static_cast<int>(c);
  }
}

TEST_F(CommonConfig, TextsThatAreNotAsciiAreKept) {
  EXPECT_EQ(Read("share_folder = /\xc3\xbc\xff\n").share_folders, Texts{"/\xc3\xbc\xff"});
}

TEST_F(CommonConfig, AFileThatCannotBeReadIsToldAndMeansDefaults) {
  Write("share_folder = /a\n");
  ASSERT_EQ(chmod(kPath, 0600), 0);
  EXPECT_EQ(tuvo_test::RunInChildAs(tuvo_test::kNobody,
                                    [] { return ReadConfig(kPath).share_folders.empty() ? 0 : 1; }),
            0);
  EXPECT_EQ(Logged(), Texts{"config:LINE cannot read /tmp/tuvosharing.conf: Permission denied"});
}

TEST_F(CommonConfig, AFolderInThePlaceOfTheFileIsToldAndMeansDefaults) {
  EXPECT_EQ(ReadConfig("/tmp").share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{"config:LINE /tmp is not used: it is no regular file"});
}

TEST_F(CommonConfig, APathThroughAFileIsToldUnlikeAMissingFile) {
  Write("share_folder = /a\n");
  EXPECT_EQ(ReadConfig(std::string(kPath) + "/x").share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{"config:LINE cannot read /tmp/tuvosharing.conf/x: Not a directory"});
}

TEST_F(CommonConfig, AFileThatFailsHalfwayIsToldAndMeansDefaults) {
  failing_read = 2;
  const Config config = Read("external_address = nas\nshare_folder = /a\n" +
                             std::string(8000, '#') + "\nshare_folder = /b\n");
  EXPECT_EQ(failing_read, 0) << "there was no second read";
  EXPECT_EQ(config.share_folders, Texts{});
  EXPECT_EQ(config.external_address, "");
  EXPECT_EQ(Logged(), Texts{"config:LINE cannot read /tmp/tuvosharing.conf: Input/output error"});
}

TEST_F(CommonConfig, AFileOfSeveralPiecesIsReadWhole) {
  EXPECT_EQ(Read("#" + std::string(4090, ' ') + "\nshare_folder = /a\n" + std::string(9000, '\n') +
                 "share_folder = /b\n")
                .share_folders,
            (Texts{"/a", "/b"}));
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, APipeInThePlaceOfTheFileIsNotWaitedFor) {
  ASSERT_EQ(mkfifo(kPath, 0644), 0);
  EXPECT_EQ(tuvo_test::RunInChild([] {
              alarm(10);  // ends the child that waits
              return ReadConfig(kPath).share_folders.empty() ? 0 : 1;
            }),
            0);
  EXPECT_EQ(Logged(),
            Texts{"config:LINE /tmp/tuvosharing.conf is not used: it is no regular file"});
}

TEST_F(CommonConfig, AFileOfAnotherUserIsNotUsed) {
  Write("share_folder = /a\n");
  for (const uid_t uid : {1U, 2001U}) {
    ASSERT_EQ(chown(kPath, uid, 0), 0);
    EXPECT_EQ(ReadConfig(kPath).share_folders, Texts{});
    EXPECT_EQ(
        Logged(),
        Texts{
            "config:LINE /tmp/tuvosharing.conf is not used: it belongs to another user than root"});
  }
}

TEST_F(CommonConfig, AFileThatOthersMayWriteToIsNotUsed) {
  Write("share_folder = /a\n");
  for (const mode_t mode : {0664U, 0646U, 0666U, 0620U, 0602U}) {
    ASSERT_EQ(chmod(kPath, mode), 0);
    EXPECT_EQ(ReadConfig(kPath).share_folders, Texts{});
    EXPECT_EQ(Logged(), Texts{"config:LINE /tmp/tuvosharing.conf is not used: it can be written to "
                              "by others than root"});
  }
}

TEST_F(CommonConfig, AFileOfRootsIsUsedWhateverOthersMayReadInIt) {
  Write("share_folder = /a\n");
  for (const mode_t mode : {0600U, 0640U, 0444U, 0755U}) {
    ASSERT_EQ(chmod(kPath, mode), 0);
    ASSERT_EQ(chown(kPath, 0, 2001), 0);
    EXPECT_EQ(ReadConfig(kPath).share_folders, Texts{"/a"});
  }
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, AByteOrderMarkAtTheBeginningDoesNotCount) {
  EXPECT_EQ(Read("\xef\xbb\xbfshare_folder = /a\n").share_folders, Texts{"/a"});
  EXPECT_EQ(Logged(), Texts{});
  EXPECT_EQ(Read("\n\xef\xbb\xbfshare_folder = /a\n").share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{Complaint(2, kUnknown)});
}

TEST_F(CommonConfig, TheExternalAddressAloneIsReadWithoutAWordAboutOtherLines) {
  Write(
      "secret words\nshare_folder = e\nexternal_address = a\nunknown = x\n"
      "external_addresses\n \texternal_address=https://b\nmy external_address = c\n");
  EXPECT_EQ(ReadExternalAddress(kPath), "https://b");
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, WhatIsWrongWithTheExternalAddressIsToldWhenItAloneIsRead) {
  Write("\nexternal_address https://a\nexternal_address = a\x1b\nexternal_address\n# x\n");
  EXPECT_EQ(ReadExternalAddress(kPath), "");
  EXPECT_EQ(Logged(),
            (Texts{Complaint(2, kNoForm), Complaint(3, kControl), Complaint(4, kNoForm)}));
  ASSERT_EQ(chmod(kPath, 0666), 0);
  EXPECT_EQ(ReadExternalAddress(kPath), "");
  EXPECT_EQ(Logged().size(), 1U);
}

// The packaged file is what an administrator begins with: as it stands it opens nothing.
TEST_F(CommonConfig, ThePackagedFileIsOneWithoutComplaintsAndOpensNothing) {
  const std::string packaged = std::string(TUVO_PROJECT_FOLDER) + "/packaging/tuvosharing.conf";
  std::ostringstream text;
  text << std::ifstream(packaged).rdbuf();
  ASSERT_GT(text.str().size(), 500U);
  const Config config = Read(text.str());  // a checkout may belong to anybody
  EXPECT_EQ(config.external_address, "");
  EXPECT_EQ(config.share_folders, Texts{});
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(CommonConfig, TheExamplesInThePackagedFileAreOnes) {
  const std::string packaged = std::string(TUVO_PROJECT_FOLDER) + "/packaging/tuvosharing.conf";
  std::ifstream file(packaged);
  std::string examples;
  for (std::string line; std::getline(file, line);) {
    if (line.find(" = ") != std::string::npos && line.find('`') == std::string::npos) {
      examples += line.substr(2) + "\n";
    }
  }
  const Config config = Read(examples);
  EXPECT_EQ(config.external_address, "https://nas.example.org");
  EXPECT_EQ(config.share_folders, Texts{"/srv/public"});
  EXPECT_EQ(Logged(), Texts{});
}

}  // namespace
}  // namespace common
