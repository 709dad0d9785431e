#include "common/arguments.h"

#include <gtest/gtest.h>

#include <array>
#include <string>

namespace common {
namespace {

TEST(Arguments, WordsBehindTheProgramsNameAreWiped) {
  std::string name = "tuvosharing";
  std::string command = "show";
  std::string hash = "abcDEF123";
  std::array<char*, 4> argv = {name.data(), command.data(), hash.data(), nullptr};
  WipeArguments(3, argv.data());
  EXPECT_EQ(name, "tuvosharing");
  EXPECT_EQ(command, std::string(4, '\0'));
  EXPECT_EQ(hash, std::string(9, '\0'));
}

TEST(Arguments, NoWordsAreNothingToWipe) {
  char* argv = nullptr;
  WipeArguments(0, &argv);
}

}  // namespace
}  // namespace common
