#include "cli/link_file.h"

#include <gtest/gtest.h>
#include <sys/mman.h>
#include <unistd.h>

#include <string>

#include "cli/failure.h"
#include "common/stream.h"
#include "common/unique_fd.h"

namespace cli {
namespace {

LinkRow Row(const std::string& hash) {
  LinkRow row;
  row.columns = {hash, "album", "1", "5", "0", "0", "0", "0", "1", "{}"};
  return row;
}

std::vector<LinkRow> Read(const std::string& text) {
  const common::UniqueFd fd(memfd_create("links", MFD_CLOEXEC));
  EXPECT_TRUE(common::WriteAll(fd.get(), text));
  EXPECT_EQ(lseek(fd.get(), 0, SEEK_SET), 0);
  return ReadLinkFile(fd.get());
}

// What is said of a file that cannot be read.
std::string Complaint(const std::string& text) {
  try {
    Read(text);
  } catch (const Failure& failure) {
    EXPECT_EQ(failure.status(), ExitStatus::kUsage);
    return failure.what();
  }
  return "none";
}

bool Holds(const std::string& text, const std::string& part) {
  return text.find(part) != std::string::npos;
}

TEST(CliLinkFile, FirstLineNamesFormatAndVersion) {
  EXPECT_EQ(FirstLine(), "{\"format\":\"tuvosharing links\",\"version\":1}\n");
}

TEST(CliLinkFile, WhatIsWrittenIsRead) {
  const std::vector<LinkRow> rows =
      Read(FirstLine() + LineOf(Row("one")) + LineOf(Row("two")) + LastLine(2));
  ASSERT_EQ(rows.size(), 2U);
  EXPECT_EQ(rows[0].columns, Row("one").columns);
  EXPECT_EQ(rows[1].columns, Row("two").columns);
  EXPECT_EQ(Read(FirstLine() + LastLine(0)).size(), 0U);
}

TEST(CliLinkFile, OtherFilesAreRefusedInTheirFirstLine) {
  for (const char* text : {"", "\n", "hello\n", "[]\n", "{}\n", "{\"format\":\"x\"}\n"}) {
    EXPECT_TRUE(Holds(Complaint(text), "line 1: this is no file")) << text;
  }
  EXPECT_TRUE(Holds(Complaint("{\"format\":\"tuvosharing links\",\"version\":2}\n"), "version"));
  EXPECT_TRUE(Holds(Complaint("{\"format\":\"tuvosharing links\"}\n"), "version"));
}

TEST(CliLinkFile, FileThatWasCutOffIsRefused) {
  const std::string whole = FirstLine() + LineOf(Row("one")) + LineOf(Row("two")) + LastLine(2);
  for (std::size_t length = 0; length + 1 < whole.size(); ++length) {
    EXPECT_NE(Complaint(whole.substr(0, length)), "none") << length;
  }
  EXPECT_EQ(Complaint(whole.substr(0, whole.size() - 1)), "none");
}

TEST(CliLinkFile, MissingAndAddedLinesAreNoticed) {
  EXPECT_TRUE(Holds(Complaint(FirstLine() + LineOf(Row("one")) + LastLine(2)), "line 3"));
  EXPECT_TRUE(Holds(Complaint(FirstLine() + LineOf(Row("one")) + LastLine(0)), "line 3"));
  EXPECT_TRUE(Holds(Complaint(FirstLine() + LastLine(0) + LineOf(Row("one"))), "line 3"));
}

TEST(CliLinkFile, LineAtFaultIsNamed) {
  const std::string begin = FirstLine() + LineOf(Row("one"));
  EXPECT_TRUE(Holds(Complaint(begin + "{\n" + LastLine(2)), "line 3: is no JSON object"));
  EXPECT_TRUE(Holds(Complaint(begin + "\n" + LastLine(1)), "line 3: is no JSON object"));
  EXPECT_TRUE(Holds(Complaint(begin + "{\"a\":1}\n" + LastLine(2)), "line 3: is no link"));
}

}  // namespace
}  // namespace cli
