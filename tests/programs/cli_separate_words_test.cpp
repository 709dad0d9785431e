#include "cli/separate_words.h"

#include <gtest/gtest.h>

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>

#include "cli/failure.h"

namespace cli {
namespace {

using Words = std::vector<std::string>;

class CliSeparateWords : public testing::Test {
 protected:
  CliSeparateWords() {
    CLI::App* command = app_.add_subcommand("edit");
    command->add_option("LINK", links_);
    command->add_option("--title", text_);
    command->add_option("--id", ids_)->allow_extra_args(false);
    command->add_flag("--enabled", flag_);
    command->add_flag("-q,--quiet", flag_);
  }

  Words Of(const Words& words) const { return SeparateWords(app_, words); }

 private:
  CLI::App app_;
  Words links_;
  Words ids_;
  std::string text_;
  bool flag_ = false;
};

TEST_F(CliSeparateWords, ValueIsAWordOfItsOwn) {
  EXPECT_EQ(Of({"edit", "--title=x", "a"}), (Words{"edit", "--title", "x", "a"}));
  EXPECT_EQ(Of({"edit", "--id=7"}), (Words{"edit", "--id", "7"}));
}

TEST_F(CliSeparateWords, EmptyValueIsOne) {
  EXPECT_EQ(Of({"edit", "--title=", "a"}), (Words{"edit", "--title", "", "a"}));
}

TEST_F(CliSeparateWords, SecondSignBelongsToTheValue) {
  EXPECT_EQ(Of({"edit", "--title=a=b"}), (Words{"edit", "--title", "a=b"}));
}

TEST_F(CliSeparateWords, FlagTakesNoValue) {
  for (const char* word :
       {"--enabled=false", "--enabled=true", "--enabled=", "--quiet=0", "--help=x"}) {
    EXPECT_THROW(Of({"edit", word}), Failure) << word;
  }
  EXPECT_THROW(Of({"--help=x"}), Failure);
  EXPECT_EQ(Of({"edit", "--enabled"}), (Words{"edit", "--enabled"}));
}

TEST_F(CliSeparateWords, ValuesAreLeftAlone) {
  EXPECT_EQ(Of({"edit", "--title", "--enabled=false", "--id", "--title=x"}),
            (Words{"edit", "--title", "--enabled=false", "--id", "--title=x"}));
  EXPECT_EQ(Of({"edit", "--title", "--", "--id=1"}), (Words{"edit", "--title", "--", "--id", "1"}));
}

TEST_F(CliSeparateWords, WordsBehindTheDashesAreLeftAlone) {
  EXPECT_EQ(Of({"edit", "--", "--title=x", "--enabled=x"}),
            (Words{"edit", "--", "--title=x", "--enabled=x"}));
}

TEST_F(CliSeparateWords, UnknownWordsAreLeftToTheReading) {
  EXPECT_EQ(Of({"edit", "--none=x", "a=b", "-q=x", ""}),
            (Words{"edit", "--none=x", "a=b", "-q=x", ""}));
  EXPECT_EQ(Of({"--title=x"}), Words{"--title=x"});
}

}  // namespace
}  // namespace cli
