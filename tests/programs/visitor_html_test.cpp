#include "visitor/html.h"

#include <gtest/gtest.h>

namespace visitor {
namespace {

TEST(VisitorHtml, MarkupBecomesText) {
  EXPECT_EQ(HtmlEscape("<a href=\"x\" title='y'>&amp;</a>"),
            "&lt;a href=&quot;x&quot; title=&#39;y&#39;&gt;&amp;amp;&lt;/a&gt;");
}

TEST(VisitorHtml, OtherCharactersStay) {
  EXPECT_EQ(HtmlEscape("Übersicht 100% `=/"), "Übersicht 100% `=/");
  EXPECT_EQ(HtmlEscape(""), "");
}

TEST(VisitorHtml, ControlCharactersBecomeBlanks) {
  EXPECT_EQ(HtmlEscape(std::string_view("a\0b\r\nc\x1b\x7f", 8)), "a b  c  ");
}

}  // namespace
}  // namespace visitor
