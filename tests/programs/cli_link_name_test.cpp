#include "cli/link_name.h"

#include <gtest/gtest.h>

#include "cli/failure.h"

namespace cli {
namespace {

TEST(CliLinkName, HashNamesALink) {
  const owner::LinkName name = LinkNameOf("abcDEF123");
  EXPECT_EQ(name.id, 0);
  EXPECT_EQ(name.hash, "abcDEF123");
  EXPECT_EQ(TextOf(name), "abcDEF123");
}

TEST(CliLinkName, HashOfDigitsIsNoNumber) {
  EXPECT_EQ(LinkNameOf("123").hash, "123");
}

TEST(CliLinkName, NumberNamesALink) {
  const owner::LinkName name = LinkNameOf("#2147483647");
  EXPECT_EQ(name.id, 2147483647);
  EXPECT_EQ(name.hash, "");
  EXPECT_EQ(TextOf(name), "#2147483647");
}

TEST(CliLinkName, OtherTextsNameNone) {
  for (const char* text : {"", "#", "#0", "#-1", "#+1", "#1x", "# 1", "#2147483648"}) {
    EXPECT_THROW(LinkNameOf(text), Failure) << text;
  }
}

TEST(CliLinkName, NamesComeInTheirOrderWithTheNumbersBehind) {
  const std::vector<owner::LinkName> names = LinkNamesOf({"b", "#7", "a"}, {"3"});
  ASSERT_EQ(names.size(), 4U);
  EXPECT_EQ(TextOf(names[0]), "b");
  EXPECT_EQ(TextOf(names[1]), "#7");
  EXPECT_EQ(TextOf(names[2]), "a");
  EXPECT_EQ(TextOf(names[3]), "#3");
}

TEST(CliLinkName, NoneAtAllIsAFailure) {
  EXPECT_THROW(LinkNamesOf({}, {}), Failure);
  EXPECT_THROW(LinkNamesOf({"a"}, {"x"}), Failure);
}

}  // namespace
}  // namespace cli
