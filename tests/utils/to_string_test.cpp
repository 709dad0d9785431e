#include <gtest/gtest.h>
#include <tuvosharing/utils.h>

#include <climits>
#include <clocale>
#include <locale>
#include <string>

namespace {

using TUVO::sharing::ToString;

TEST(ToString, AStringIsCopiedUnchanged) {
  std::string text("it's \"quoted\" \\ and\0nul", 23);
  EXPECT_EQ(ToString(text), text);
  std::string empty;
  EXPECT_EQ(ToString(empty), "");
}

TEST(ToString, ABoolIsADigitNeverAWord) {
  bool yes = true;
  bool no = false;
  EXPECT_EQ(ToString<bool>(yes), "1");
  EXPECT_EQ(ToString<bool>(no), "0");
}

TEST(ToString, AConstantBoolIsADigitToo) {
  EXPECT_EQ(ToString<bool const>(true), "1");
  EXPECT_EQ(ToString<bool const>(false), "0");
}

TEST(ToString, AnIntIsDecimalWithAMinusSign) {
  EXPECT_EQ(ToString<int const>(0), "0");
  EXPECT_EQ(ToString<int const>(-7), "-7");
  EXPECT_EQ(ToString<int const>(INT_MAX), "2147483647");
  EXPECT_EQ(ToString<int const>(INT_MIN), "-2147483648");
}

TEST(ToString, ALongIsDecimalWithAMinusSign) {
  EXPECT_EQ(ToString<long const>(1700000000L), "1700000000");
  EXPECT_EQ(ToString<long const>(-1L), "-1");
  EXPECT_EQ(ToString<long const>(0L), "0");
  EXPECT_EQ(ToString<long const>(2147483647L), "2147483647");
  EXPECT_EQ(ToString<long const>(-2147483647L - 1), "-2147483648");
  EXPECT_EQ(ToString<long const>(LONG_MAX), std::to_string(LONG_MAX));
}

// Groups digits and spells booleans: what a program with a local taste might set.
class Grouping : public std::numpunct<char> {
 protected:
  char do_thousands_sep() const override { return '.'; }
  std::string do_grouping() const override { return "\3"; }
  std::string do_truename() const override { return "yes"; }
  std::string do_falsename() const override { return "no"; }
};

class GlobalLocale {
 public:
  explicit GlobalLocale(const std::locale& locale) : former_(std::locale::global(locale)) {}
  ~GlobalLocale() { std::locale::global(former_); }

 private:
  std::locale former_;
};

TEST(ToString, TheProgramsLocaleHasNoSay) {
  const GlobalLocale scope(std::locale(std::locale::classic(), new Grouping));
  bool yes = true;
  EXPECT_EQ(ToString<int const>(1234567), "1234567");
  EXPECT_EQ(ToString<long const>(1700000000L), "1700000000");
  EXPECT_EQ(ToString<bool const>(true), "1");
  EXPECT_EQ(ToString<bool>(yes), "1");
}

}  // namespace
