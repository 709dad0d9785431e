#include "cli/command_line.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "cli/failure.h"

namespace cli {
namespace {

std::function<ExitStatus()> Read(std::vector<const char*> arguments) {
  arguments.insert(arguments.begin(), "tuvosharing");
  return ReadCommandLine(static_cast<int>(arguments.size()), arguments.data());
}

// What is said of a command line that cannot be understood; empty: it can.
std::string Complaint(const std::vector<const char*>& arguments) {
  try {
    Read(arguments);
  } catch (const Failure& failure) {
    EXPECT_EQ(failure.status(), ExitStatus::kUsage);
    return failure.what();
  }
  return {};
}

std::string Printed(const std::vector<const char*>& arguments) {
  testing::internal::CaptureStdout();
  EXPECT_FALSE(Read(arguments));
  return testing::internal::GetCapturedStdout();
}

TEST(CliCommandLine, CommandsAreUnderstood) {
  for (const std::vector<const char*>& arguments :
       {std::vector<const char*>{"create", "--project", "x"},
        {"list"},
        {"show", "abc"},
        {"edit", "abc", "abd", "--id", "7", "--title", "-x"},
        {"enable", "abc"},
        {"disable", "#7"},
        {"delete", "-y", "--", "-abc"},
        {"purge"},
        {"sessions"},
        {"tokens", "abc"},
        {"signout", "abc", "--id", "7"},
        {"export", "-"},
        {"import"},
        {"check"},
        {"backup", "x"},
        {"unblock", "::1", "1.2.3.4"}}) {
    EXPECT_TRUE(Read(arguments)) << arguments[0];
  }
}

TEST(CliCommandLine, HelpAndVersionArePrintedAndNothingIsLeftToDo) {
  EXPECT_NE(Printed({"--help"}).find("Usage: tuvosharing"), std::string::npos);
  EXPECT_NE(Printed({"create", "--help"}).find("--password-stdin"), std::string::npos);
  EXPECT_EQ(Printed({"--version"}), std::string("tuvosharing ") + TUVOSHARING_VERSION + "\n");
}

TEST(CliCommandLine, OthersAreNot) {
  EXPECT_NE(Complaint({}), "");
  EXPECT_NE(Complaint({"frobnicate"}), "");
  EXPECT_NE(Complaint({"list", "more"}), "");
  EXPECT_NE(Complaint({"list", "--frobnicate"}), "");
  EXPECT_NE(Complaint({"list", "check"}), "");
  EXPECT_NE(Complaint({"list", "--limit", "x"}), "");
  EXPECT_NE(Complaint({"backup"}), "");
  EXPECT_NE(Complaint({"unblock"}), "");
}

TEST(CliCommandLine, NumbersAreDecimal) {
  for (const char* number : {"0", "7", "010", "2147483647"}) {
    EXPECT_EQ(Complaint({"list", "--limit", number}), "") << number;
    EXPECT_EQ(Complaint({"list", "--offset", number}), "") << number;
  }
  for (const char* number : {"0x10", "1e3", "1.0", " 7", "7 ", "+7", "2147483648"}) {
    EXPECT_NE(Complaint({"list", "--limit", number}).find("--limit"), std::string::npos) << number;
    EXPECT_NE(Complaint({"list", "--offset", number}).find("--offset"), std::string::npos)
        << number;
  }
}

TEST(CliCommandLine, PasswordIsNoValue) {
  EXPECT_NE(Complaint({"create", "--project", "x", "--password=secret"}), "");
  EXPECT_NE(Complaint({"create", "--project", "x", "--password", "secret"}), "");
}

TEST(CliCommandLine, FlagsTakeNoValue) {
  for (const char* word : {"--enabled=false", "--match-ip=false", "--auto-gc=true", "--json=0"}) {
    EXPECT_NE(Complaint({"create", "--project", "x", word}).find("takes no value"),
              std::string::npos)
        << word;
  }
  EXPECT_NE(Complaint({"delete", "a", "--yes=no"}), "");
  EXPECT_NE(Complaint({"delete", "a", "-y=no"}), "");
}

TEST(CliCommandLine, EmptyValueIsNotTheNextWord) {
  EXPECT_EQ(Complaint({"edit", "a", "--title=", "--disabled"}), "");
  EXPECT_EQ(Complaint({"edit", "a", "--users=", "--groups="}), "");
  EXPECT_NE(Complaint({"list", "--limit=", "5"}), "");
  EXPECT_NE(Complaint({"purge", "--owner=", "alice"}), "");
}

TEST(CliCommandLine, ContradictionsAreRefused) {
  EXPECT_NE(Complaint({"create", "--enabled", "--disabled"}), "");
  EXPECT_NE(Complaint({"create", "--auto-gc", "--no-auto-gc"}), "");
  EXPECT_NE(Complaint({"create", "--match-ip", "--no-match-ip"}), "");
  EXPECT_NE(Complaint({"create", "--password", "--password-stdin"}), "");
  EXPECT_NE(Complaint({"create", "--app", "{}", "--app-file", "x"}), "");
  EXPECT_NE(Complaint({"create", "--private-data", "{}", "--private-data-file", "x"}), "");
  EXPECT_NE(Complaint({"create", "--json", "--quiet"}), "");
  EXPECT_NE(Complaint({"edit", "a", "--no-password", "--password"}), "");
  EXPECT_NE(Complaint({"create", "--title", "a", "--title", "b"}), "");
}

TEST(CliCommandLine, FiltersThatAreEmptyAreRefused) {
  for (const char* option : {"--owner", "--project"}) {
    EXPECT_NE(Complaint({"purge", option, ""}), "");
    EXPECT_NE(Complaint({"list", option, ""}), "");
    EXPECT_NE(Complaint({"export", option, ""}), "");
  }
  EXPECT_NE(Complaint({"backup", ""}), "");
}

}  // namespace
}  // namespace cli
