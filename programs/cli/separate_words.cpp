#include "cli/separate_words.h"

#include <CLI/App.hpp>

#include "cli/failure.h"

namespace cli {

namespace {

// Where the word's "=" stands, if it is "--name=value".
std::size_t ValueSign(const std::string& word) {
  return word.rfind("--", 0) == 0 ? word.find('=') : std::string::npos;
}

bool TakesValue(const CLI::Option& option) {
  return option.get_items_expected_max() != 0;
}

// Goes along the words, and knows of each what it is.
class Separator {
 public:
  explicit Separator(const CLI::App& app) : command_(&app) {}

  void Take(const std::string& word) {
    if (rest_ || is_value_) {
      is_value_ = false;
      words_.push_back(word);
    } else if (word == "--") {
      rest_ = true;
      words_.push_back(word);
    } else if (word.empty() || word.front() != '-') {
      words_.push_back(word);
      EnterCommand(word);
    } else {
      TakeOption(word);
    }
  }

  const std::vector<std::string>& Words() const { return words_; }

 private:
  void EnterCommand(const std::string& word) {
    for (const CLI::App* command : command_->get_subcommands({})) {
      if (command->check_name(word)) {
        command_ = command;
        return;
      }
    }
  }

  void TakeOption(const std::string& word) {
    const std::size_t sign = ValueSign(word);
    const std::string name = word.substr(0, sign);
    const CLI::Option* option = command_->get_option_no_throw(name);
    if (option == nullptr) {
      words_.push_back(word);  // the reading says what is wrong with it
      return;
    }
    if (sign == std::string::npos) {
      is_value_ = TakesValue(*option);
      words_.push_back(word);
      return;
    }
    if (!TakesValue(*option)) {
      throw Failure(ExitStatus::kUsage, name + ": takes no value");
    }
    words_.push_back(name);
    words_.push_back(word.substr(sign + 1));
  }

  const CLI::App* command_;
  std::vector<std::string> words_;
  bool is_value_ = false;
  bool rest_ = false;
};

}  // namespace

std::vector<std::string> SeparateWords(const CLI::App& app, const std::vector<std::string>& words) {
  Separator separator(app);
  for (const std::string& word : words) {
    separator.Take(word);
  }
  return separator.Words();
}

}  // namespace cli
