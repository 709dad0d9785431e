#include "cli/table.h"

#include <gtest/gtest.h>

#include <clocale>
#include <sstream>
#include <string>

namespace cli {
namespace {

class CliTable : public testing::Test {
 protected:
  CliTable() { EXPECT_NE(std::setlocale(LC_CTYPE, "C.UTF-8"), nullptr); }

  static std::string Printed(const Table& table, std::size_t width) {
    std::ostringstream out;
    table.Print(out, width);
    return out.str();
  }
};

TEST_F(CliTable, ColumnsAreAsWideAsTheirWidestText) {
  Table table({{"ID", true, false}, {"NAME", false, false}, {"X", false, false}});
  table.Add({"7", "long name", "a"});
  table.Add({"1234", "b", "c"});
  EXPECT_EQ(Printed(table, 0),
            "  ID  NAME       X\n"
            "   7  long name  a\n"
            "1234  b          c\n");
}

TEST_F(CliTable, LinesDoNotEndInBlanks) {
  Table table({{"A", false, false}, {"B", false, false}});
  table.Add({"x", ""});
  table.Add({"", ""});
  EXPECT_EQ(Printed(table, 0), "A  B\nx\n\n");
}

TEST_F(CliTable, TableWithoutRowsHasItsTitles) {
  EXPECT_EQ(Printed(Table({{"A", false, false}, {"B", false, false}}), 80), "A  B\n");
}

TEST_F(CliTable, WidthsAreThoseOfTheTerminal) {
  Table table({{"A", false, false}, {"B", false, false}});
  table.Add({"\u65e5\u672c", "x"});
  table.Add({"Gr\u00f6", "y"});
  EXPECT_EQ(Printed(table, 0), "A     B\n\u65e5\u672c  x\nGr\u00f6   y\n");
}

TEST_F(CliTable, TextsAreMadeHarmless) {
  Table table({{"A", false, false}});
  table.Add({"a\x1b\nb"});
  EXPECT_EQ(Printed(table, 0), "A\na\\x1b\\nb\n");
}

TEST_F(CliTable, WidestColumnsThatMayShrinkDoSoFirst) {
  Table table({{"A", false, true}, {"B", false, true}, {"C", false, false}});
  table.Add({std::string(30, 'a'), std::string(12, 'b'), std::string(10, 'c')});
  const std::string wide = Printed(table, 56);
  EXPECT_EQ(wide.find("\u2026"), std::string::npos);
  EXPECT_NE(Printed(table, 46).find(std::string(19, 'a') + "\u2026  " + std::string(12, 'b') +
                                    "  " + std::string(10, 'c')),
            std::string::npos);
  EXPECT_NE(Printed(table, 36).find(std::string(10, 'a') + "\u2026  " + std::string(10, 'b') +
                                    "\u2026  " + std::string(10, 'c')),
            std::string::npos);
}

TEST_F(CliTable, NothingShrinksBelowTheLeastWidth) {
  Table table({{"A", false, true}, {"B", false, false}});
  table.Add({std::string(30, 'a'), std::string(30, 'b')});
  EXPECT_NE(Printed(table, 10).find(std::string(Table::kLeastWidth - 1, 'a') + "\u2026  " +
                                    std::string(30, 'b')),
            std::string::npos);
}

}  // namespace
}  // namespace cli
