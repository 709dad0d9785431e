// "--name=value", taken apart before the options are read.
#ifndef PROGRAMS_CLI_SEPARATE_WORDS_H_
#define PROGRAMS_CLI_SEPARATE_WORDS_H_

#include <string>
#include <vector>

namespace CLI {
class App;
}

namespace cli {

// `words` with each "--name=value" as two words, so that "--title=" gives the empty text: the
// reading itself would take the next word for the value. Words that are values, or stand behind
// "--", are left alone. Throws Failure for a value that is given to an option without one: it would
// be read as if it were not there.
std::vector<std::string> SeparateWords(const CLI::App& app, const std::vector<std::string>& words);

}  // namespace cli

#endif  // PROGRAMS_CLI_SEPARATE_WORDS_H_
