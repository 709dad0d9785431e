// The options that say what a link is to be, and the arguments of the web API that they stand for:
// both programs have one set of rules.
#ifndef PROGRAMS_CLI_SETTING_OPTIONS_H_
#define PROGRAMS_CLI_SETTING_OPTIONS_H_

#include <json/value.h>

#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "owner/file_link.h"
#include "owner/settings.h"

namespace cli {

// An option with a value; that of `argument` unless it is a file's name.
struct ValueOption {
  const char* name;
  const char* argument;
  const char* value;  // as the help calls it
  const char* help;
};

// An option without a value: `argument` becomes `stands_for`.
struct FlagOption {
  const char* name;
  const char* argument;
  bool stands_for;
  const char* help;
};

const std::vector<ValueOption>& ValueOptions();  // one value each
const std::vector<ValueOption>& ListOptions();   // names, separated by commas or given repeatedly
const std::vector<FlagOption>& FlagOptions();

constexpr const char* kPasswordOption = "--password";
constexpr const char* kPasswordStdinOption = "--password-stdin";
constexpr const char* kNoPasswordOption = "--no-password";
constexpr const char* kAppFileOption = "--app-file";
constexpr const char* kPrivateDataFileOption = "--private-data-file";
constexpr const char* kPathOption = "--path";

// What was given on the command line.
struct SettingOptions {
  Json::Value texts{Json::objectValue};   // by argument, as they were given
  Json::Value values{Json::objectValue};  // by argument, of the argument's kind already
  bool ask_password = false;
  bool password_from_input = false;
  bool no_password = false;
  std::optional<std::string> app_file;
  std::optional<std::string> private_data_file;
  std::optional<std::string> path;

  bool empty() const;
};

// The option that sets an argument; the argument's own name when none does.
std::string OptionOf(const std::string& argument);

// The settings that the options make: texts are read, files too, the password is asked for.
struct GivenSettings {
  owner::Settings settings;
  // Set when the file is to become another, and the rest of `app` to stay as it is.
  std::optional<std::string> path;
  bool path_was_given = false;  // by itself, in place of the whole `app`, or as part of that
  bool no_password = false;
};

// `needed` names an argument that must be there; empty: none. Throws Failure.
GivenSettings ReadGivenSettings(const SettingOptions& options, const std::string& needed,
                                std::time_t now);

// Makes the link what was given, and sees that the whole fits together. Does not look at files. May
// be called again, with another link.
owner::MaybeProblem ApplyGivenSettings(const GivenSettings& given,
                                       TUVO::sharing::record::Entry* link);

// Whether a file link that becomes what was given is to be looked at.
bool TouchesFile(const GivenSettings& given);

// Looks, below `share_folders`, at the file of a link that has become what was given (file_link.h:
// not while the database is locked).
owner::MaybeProblem LookAtGivenFile(const GivenSettings& given,
                                    const std::vector<std::string>& share_folders,
                                    const TUVO::sharing::record::Entry& link,
                                    owner::FileLook* look);

}  // namespace cli

#endif  // PROGRAMS_CLI_SETTING_OPTIONS_H_
