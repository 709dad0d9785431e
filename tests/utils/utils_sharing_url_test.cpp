// What GetSharingURL asks of the tool and makes of its answer. The tools are real programs.
#include <gtest/gtest.h>
#include <sys/time.h>
#include <tuvosharing/sharing_url.h>
#include <unistd.h>

#include <cerrno>
#include <climits>
#include <csignal>
#include <string>
#include <vector>

#include "support/source_line.h"
#include "support/syslog_listener.h"
#include "support/written_line.h"
#include "utils/tool.h"

namespace {

using TUVO::sharing::_tag_SHARING_URL_TYPE;
using TUVO::sharing::GetSharingURL;
using tuvo_test::OpenLogNow;
using tuvo_test::SourceLine;
using tuvo_test::Tool;
using tuvo_test::ToolArguments;
using Texts = std::vector<std::string>;

constexpr char kSource[] = "utils/utils_sharing_url.cpp";
constexpr int kUntouchedType = -77;

// A line of the library, up to its text.
std::string Prefix(const std::string& name, const std::string& file, const std::string& text) {
  return "user.err " + name + ":" + std::to_string(SourceLine(file, text)) + " (" +
         std::to_string(getpid()) + ") ";
}

std::string FailedLine(const std::string& condition) {
  return Prefix("utils_sharing_url", kSource, "SHARING_RETURN_FALSE_IF(" + condition) + "Failed [" +
         condition + "], err=Success\n\n";
}

std::string NoUrlLine() {
  return FailedLine("NULL == fgets(szUrl, BUF_SIZE_, file.file)");
}

std::string NoTypeLine() {
  return FailedLine("NULL == fgets(szType, TYPE_BUF_SIZE_, file.file)");
}

// The guard's line first, then the function's own.
Texts NotStartedLines() {
  return {Prefix("include/internal/popen", "include/internal/popen.h", "TLIBCPopenv failed.") +
              "TLIBCPopenv failed.\n",
          Prefix("utils_sharing_url", kSource, "popen failed") + "popen failed\n\n"};
}

class SharingURL : public testing::Test {
 protected:
  bool Ask() { return GetSharingURL("photo", 443, true, "host", "abc", url_, type_); }

  Texts Logged() { return tuvo_test::TakeWritten(listener_); }

  int type() const { return static_cast<int>(type_); }

  tuvo_test::SyslogListener listener_;
  Tool tool_{"/usr/tuvo/bin/tuvosharingurl"};
  std::string url_ = "untouched";
  _tag_SHARING_URL_TYPE type_ = static_cast<_tag_SHARING_URL_TYPE>(kUntouchedType);
};

TEST_F(SharingURL, TheFirstLineIsTheAddressAndTheSecondTheType) {
  tool_.Prints("https://nas.example/sharing/abc\n1\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "https://nas.example/sharing/abc");
  EXPECT_EQ(type(), 1);
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(SharingURL, TheToolIsGivenItsNameAndFiveArgumentsInOrder) {
  tool_.Prints("u\n0\n");
  ASSERT_TRUE(Ask());
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", "photo", "443", "1", "host", "abc"}));
}

TEST_F(SharingURL, TheShorterFormGivesAnEmptyTextForTheFourth) {
  tool_.Prints("u\n2\n");
  ASSERT_TRUE(GetSharingURL("photo", 5001, false, "abc", url_, type_));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", "photo", "5001", "0", "", "abc"}));
  EXPECT_EQ(url_, "u");
  EXPECT_EQ(type(), 2);
}

TEST_F(SharingURL, TextsReachTheToolAsTheyAre) {
  tool_.Prints("u\n0\n");
  const std::string odd = " a  b\n'\"`id`$HOME;*\\=\t\xc3\xbc\xff";
  ASSERT_TRUE(GetSharingURL(odd, 0, false, "-x", odd + odd, url_, type_));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", odd, "0", "0", "-x", odd + odd}));
}

TEST_F(SharingURL, EmptyTextsAreArgumentsToo) {
  tool_.Prints("u\n0\n");
  ASSERT_TRUE(GetSharingURL("", 0, false, "", "", url_, type_));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", "", "0", "0", "", ""}));
}

TEST_F(SharingURL, AnArgumentEndsAtItsFirstNulByte) {
  tool_.Prints("u\n0\n");
  ASSERT_TRUE(GetSharingURL(std::string("a\0b", 3), 0, false, "h", "c", url_, type_));
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", "a", "0", "0", "h", "c"}));
}

TEST_F(SharingURL, TheNumberIsDecimalWithAMinusSign) {
  tool_.Prints("u\n0\n");
  for (const int number : {INT_MAX, INT_MIN, -1}) {
    ASSERT_TRUE(GetSharingURL("p", number, true, "h", url_, type_));
    EXPECT_EQ(ToolArguments().at(2), std::to_string(number));
  }
}

TEST_F(SharingURL, ALineOf4094CharactersIsReadWhole) {
  const std::string line(4094, 'u');
  tool_.Prints(line + "\n7\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, line);
  EXPECT_EQ(type(), 7);
}

// 4095 characters with their line feed fill one more than the buffer holds.
TEST_F(SharingURL, ALineOf4095CharactersLosesItsLastAndTheRestIsTheNextLine) {
  tool_.Prints(std::string(4094, 'u') + "x\n7\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, std::string(4094, 'u'));
  EXPECT_EQ(type(), 0) << "the line feed that was left, not the number behind it";
}

TEST_F(SharingURL, ALongerLineIsCutAndTheTypeReadFromItsRest) {
  tool_.Prints(std::string(4094, 'u') + "x42\n7\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, std::string(4094, 'u'));
  EXPECT_EQ(type(), 42);
}

TEST_F(SharingURL, AVeryLongLineIsCutTheSameWay) {
  tool_.Prints(std::string(size_t{1} << 20, 'u') + "\n7\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, std::string(4094, 'u'));
  EXPECT_EQ(type(), 0);
}

TEST_F(SharingURL, TheLastCharacterIsDroppedEvenWithoutALineFeed) {
  tool_.Prints("https://nas");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "https://na");
}

TEST_F(SharingURL, AFirstLineWithoutTextIsAnEmptyAddress) {
  tool_.Prints("\n3\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "");
  EXPECT_EQ(type(), 3);
}

TEST_F(SharingURL, ALineEndsForTheAddressAtItsFirstNulByte) {
  tool_.Prints(std::string("abc\0def\n4\n", 10));
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "ab") << "the last character before it is the one dropped";
  EXPECT_EQ(type(), 4);
}

TEST_F(SharingURL, ALineThatBeginsWithANulByteIsAnEmptyAddress) {
  tool_.Prints(std::string("\0abc\n4\n", 7));
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "");
  EXPECT_EQ(type(), 4);
}

TEST_F(SharingURL, OnlyTheLineFeedIsTakenAway) {
  tool_.Prints(" u \r\n1\n");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, " u \r");
}

struct TypeLine {
  const char* output;
  int type;
};

class SharingURLType : public SharingURL, public testing::WithParamInterface<TypeLine> {};

TEST_P(SharingURLType, IsTheNumberAtTheBeginningOfThreeCharacters) {
  tool_.Prints(std::string("u\n") + GetParam().output);
  EXPECT_TRUE(Ask());
  EXPECT_EQ(type(), GetParam().type);
  EXPECT_EQ(Logged(), Texts{});
}

INSTANTIATE_TEST_SUITE_P(Lines, SharingURLType,
                         testing::Values(TypeLine{"12\n", 12}, TypeLine{"123\n", 123},
                                         TypeLine{"123456\n", 123}, TypeLine{"1234", 123},
                                         TypeLine{" 7\n", 7}, TypeLine{"  7\n", 7},
                                         TypeLine{"   7\n", 0}, TypeLine{"abc\n", 0},
                                         TypeLine{"-1\n", -1}, TypeLine{"-99\n", -99},
                                         TypeLine{"-100\n", -10}, TypeLine{"+5\n", 5},
                                         TypeLine{"7", 7}, TypeLine{"\n", 0}, TypeLine{"5x\n", 5},
                                         TypeLine{"0x1\n", 0}, TypeLine{"010\n", 10}));

TEST_F(SharingURL, EveryNumberOfThreeDigitsPassesUnchanged) {
  for (const int number : {0, 1, 127, 128, 255, 256, 999}) {
    tool_.Prints("u\n" + std::to_string(number) + "\n");
    ASSERT_TRUE(Ask());
    EXPECT_EQ(type(), number);
  }
}

TEST_F(SharingURL, WithoutAToolItFailsAndLeavesEverythingAsItWas) {
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "untouched");
  EXPECT_EQ(type(), kUntouchedType);
  EXPECT_EQ(Logged(), NotStartedLines());
}

TEST_F(SharingURL, AToolThatMayNotBeRunIsNoTool) {
  tool_.Runs("echo u; echo 1");
  std::filesystem::permissions(tool_.path(), static_cast<std::filesystem::perms>(0644));
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "untouched");
  EXPECT_EQ(Logged(), NotStartedLines());
}

TEST_F(SharingURL, WithoutOutputItFailsAndLeavesEverythingAsItWas) {
  tool_.Prints("");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "untouched");
  EXPECT_EQ(type(), kUntouchedType);
  EXPECT_EQ(Logged(), Texts{NoUrlLine()});
}

TEST_F(SharingURL, WithoutASecondLineItFailsAndTheAddressIsSet) {
  tool_.Prints("https://nas/sharing/abc\n");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "https://nas/sharing/abc");
  EXPECT_EQ(type(), kUntouchedType);
  EXPECT_EQ(Logged(), Texts{NoTypeLine()});
}

TEST_F(SharingURL, AnErrorFromLongBeforeIsNotShown) {
  tool_.Prints("");
  errno = ENOSPC;
  EXPECT_FALSE(Ask());
  EXPECT_EQ(Logged(), Texts{NoUrlLine()});
}

// A read that a signal interrupts is taken up again, and leaves its errno behind.
TEST_F(SharingURL, AnInterruptionOfTheFirstLineIsNotShownForTheSecond) {
  tool_.Runs("sleep 0.3; echo u");
  struct sigaction handled {};
  struct sigaction before {};
  handled.sa_handler = [](int) {};
  ASSERT_EQ(sigaction(SIGALRM, &handled, &before), 0);
  const itimerval soon{{0, 0}, {0, 100000}};
  ASSERT_EQ(setitimer(ITIMER_REAL, &soon, nullptr), 0);
  EXPECT_FALSE(Ask());
  sigaction(SIGALRM, &before, nullptr);
  EXPECT_EQ(url_, "u");
  EXPECT_EQ(Logged(), Texts{NoTypeLine()});
}

TEST_F(SharingURL, AToolThatFailsAtOnceHasNoAnswer) {
  tool_.Runs("exit 3");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(Logged(), Texts{NoUrlLine()});
}

TEST_F(SharingURL, AToolThatASignalEndsHasNoAnswer) {
  tool_.Runs("kill -KILL $$");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(Logged(), Texts{NoUrlLine()});
}

TEST_F(SharingURL, AToolThatASignalEndsBetweenItsLinesHasNoType) {
  tool_.Runs("echo u; kill -SEGV $$");
  EXPECT_FALSE(Ask());
  EXPECT_EQ(url_, "u");
  EXPECT_EQ(Logged(), Texts{NoTypeLine()});
}

TEST_F(SharingURL, TheExitStatusDoesNotCount) {
  tool_.Runs("echo u; echo 1; exit 3");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "u");
  EXPECT_EQ(Logged(), Texts{});
}

TEST_F(SharingURL, WhatTheToolSaysAboutErrorsIsNoAnswer) {
  tool_.Runs("echo 'https://evil/' >&2; echo u; echo 1");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "u");
}

// A tool that goes on printing is ended by its broken pipe.
TEST_F(SharingURL, ThirdAndLaterLinesAreNotWaitedFor) {
  tool_.Runs("echo u; echo 1; exec yes");
  EXPECT_TRUE(Ask());
  EXPECT_EQ(url_, "u");
  EXPECT_EQ(type(), 1);
}

TEST_F(SharingURL, TheToolHasEndedWhenTheAnswerIsThere) {
  tool_.Runs("echo u; echo 1; exec >&-; sleep 0.3; : >/tmp/tool-ended");
  std::filesystem::remove("/tmp/tool-ended");
  EXPECT_TRUE(Ask());
  EXPECT_TRUE(std::filesystem::exists("/tmp/tool-ended"));
}

TEST_F(SharingURL, NoExitLeavesAChildOrADescriptor) {
  OpenLogNow();
  const size_t before = tuvo_test::OpenDescriptors();
  for (const char* script : {"echo u; echo 1", "echo u", "exit 3", "echo u; echo 1; exec yes"}) {
    tool_.Runs(script);
    Ask();
    EXPECT_FALSE(tuvo_test::HasChildren()) << script;
    EXPECT_EQ(tuvo_test::OpenDescriptors(), before) << script;
  }
  std::filesystem::remove(tool_.path());
  Ask();
  EXPECT_FALSE(tuvo_test::HasChildren());
  EXPECT_EQ(tuvo_test::OpenDescriptors(), before);
}

TEST_F(SharingURL, TheResultMayReplaceAnArgument) {
  tool_.Prints("https://nas/\n1\n");
  url_ = "photo";
  EXPECT_TRUE(GetSharingURL(url_, 0, false, url_, url_, url_, type_));
  EXPECT_EQ(url_, "https://nas/");
  EXPECT_EQ(ToolArguments(), (Texts{"tuvosharingurl", "photo", "0", "0", "photo", "photo"}));
}

}  // namespace
