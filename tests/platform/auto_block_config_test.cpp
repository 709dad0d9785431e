#include "auto_block_config.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <fstream>
#include <string>

namespace tuvo_platform {
namespace {

AutoBlockLimits Read(const std::string& text) {
  char path[] = "/tmp/autoblock-conf-XXXXXX";
  close(mkstemp(path));
  std::ofstream(path) << text;
  const AutoBlockLimits limits = ReadAutoBlockLimits(path);
  unlink(path);
  return limits;
}

std::string ToText(const AutoBlockLimits& limits) {
  return std::to_string(limits.failures) + "/" + std::to_string(limits.window_seconds) + "/" +
         std::to_string(limits.block_seconds);
}

constexpr char kDefaults[] = "10/300/1800";

TEST(AutoBlockConfig, ValuesAreRead) {
  EXPECT_EQ(ToText(Read("failures = 3\nwindow_seconds = 60\nblock_seconds = 2147483647\n")),
            "3/60/2147483647");
}

TEST(AutoBlockConfig, BlanksCommentsAndLineEndsAreForgiven) {
  EXPECT_EQ(ToText(Read("# limits\r\n\n  failures=3\t# few\r\n\twindow_seconds\t=\t60")),
            "3/60/1800");
}

TEST(AutoBlockConfig, MissingFileMeansDefaults) {
  EXPECT_EQ(ToText(ReadAutoBlockLimits("/nonexistent")), kDefaults);
}

TEST(AutoBlockConfig, FolderInItsPlaceMeansDefaults) {
  EXPECT_EQ(ToText(ReadAutoBlockLimits("/tmp")), kDefaults);
}

TEST(AutoBlockConfig, MissingLinesMeanDefaults) {
  EXPECT_EQ(ToText(Read("")), kDefaults);
  EXPECT_EQ(ToText(Read("block_seconds = 5\n")), "10/300/5");
}

TEST(AutoBlockConfig, BadValuesMeanDefaults) {
  for (const char* value : {"", "0", "-5", "+5", "abc", "5x", "5 6", "1.5", "0x5", "2147483648",
                            "99999999999999999999", "\"5\"", "= 5"}) {
    EXPECT_EQ(ToText(Read(std::string("failures = ") + value + "\n")), kDefaults) << value;
  }
}

TEST(AutoBlockConfig, UnknownLinesArePassedOver) {
  EXPECT_EQ(ToText(Read("failures\nFailures = 3\nfailures2 = 3\n= 3\nblock_seconds = 7\n")),
            "10/300/7");
}

TEST(AutoBlockConfig, LastOfEqualNamesCounts) {
  EXPECT_EQ(ToText(Read("failures = 3\nfailures = 4\n")), "4/300/1800");
}

TEST(AutoBlockConfig, BinaryFileMeansDefaults) {
  EXPECT_EQ(ToText(Read(std::string("\0\xff\xfe=\0\n=\n", 8))), kDefaults);
}

// The file that is shipped says what holds without it.
TEST(AutoBlockConfig, ShippedFileHoldsTheDefaults) {
  std::ifstream shipped(TUVO_PACKAGING_FOLDER "/autoblock.conf");
  ASSERT_TRUE(shipped);
  std::string lines;
  for (std::string line; std::getline(shipped, line);) {
    if (!line.empty() && line[0] != '#') {
      lines += line + "\n";
    }
  }
  EXPECT_EQ(lines, "failures = 10\nwindow_seconds = 300\nblock_seconds = 1800\n");
}

}  // namespace
}  // namespace tuvo_platform
