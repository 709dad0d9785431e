#include "common/hash_text.h"

#include <gtest/gtest.h>

#include <string>

namespace common {
namespace {

TEST(CommonHashText, HashHasThreeToSixtyFourCharacters) {
  EXPECT_FALSE(IsHashText(""));
  EXPECT_FALSE(IsHashText("ab"));
  EXPECT_TRUE(IsHashText("abc"));
  EXPECT_TRUE(IsHashText(std::string(64, 'a')));
  EXPECT_FALSE(IsHashText(std::string(65, 'a')));
}

TEST(CommonHashText, HashHasUrlFriendlyCharactersOnly) {
  EXPECT_TRUE(IsHashText("azAZ09-_"));
  const std::string friendly = "abcdefghijklmnopqrstuvwxyzABCDEFGHIJKLMNOPQRSTUVWXYZ0123456789-_";
  for (int c = 0; c < 256; ++c) {
    const std::string text = std::string("abc") + static_cast<char>(c);
    EXPECT_EQ(IsHashText(text), friendly.find(static_cast<char>(c)) != std::string::npos) << c;
  }
}

TEST(CommonHashText, SessionIdIsCheckedLikewise) {
  EXPECT_TRUE(IsSessionIdText("2eFNmFsTr2NeU4uRWiGL116UWrRyOk-_"));
  EXPECT_FALSE(IsSessionIdText(""));
  EXPECT_FALSE(IsSessionIdText("a'b"));
  EXPECT_FALSE(IsSessionIdText(std::string(65, 'a')));
}

}  // namespace
}  // namespace common
