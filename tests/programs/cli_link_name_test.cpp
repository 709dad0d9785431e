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

TEST(CliLinkName, LinkThatIsNamedTwiceStandsThereOnce) {
  const std::vector<owner::LinkName> names = LinkNamesOf({"b", "#7", "b"}, {"7", "3"});
  ASSERT_EQ(names.size(), 3U);
  EXPECT_EQ(TextOf(names[0]), "b");
  EXPECT_EQ(TextOf(names[1]), "#7");
  EXPECT_EQ(TextOf(names[2]), "#3");
}

TEST(CliLinkName, RowsAreNamedByAnyNumber) {
  EXPECT_EQ(RowIdsOf({"#3000000000", "#-5", "#7"}, {"0", "7"}),
            (std::vector<RowId>{-5, 0, 7, 3000000000}));
  for (const char* text : {"", "abc", "7", "#", "#x", "#9223372036854775808"}) {
    EXPECT_THROW(RowIdsOf({text}, {}), Failure) << text;
  }
  EXPECT_THROW(RowIdsOf({}, {}), Failure);
  EXPECT_THROW(RowIdsOf({}, {""}), Failure);
}

TEST(CliLinkName, NoneAtAllIsAFailure) {
  EXPECT_THROW(LinkNamesOf({}, {}), Failure);
  EXPECT_THROW(LinkNamesOf({"a"}, {"x"}), Failure);
}

}  // namespace
}  // namespace cli
