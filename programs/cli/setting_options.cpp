#include "cli/setting_options.h"

#include <tuvosharing/keys.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>

#include "cli/caller_file.h"
#include "cli/failure.h"
#include "cli/line_reader.h"
#include "cli/terminal.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;
// The names of the arguments are those of the records' own JSON form.
using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)

constexpr const char* kPathMember = "path";
constexpr bool kByAdministrator = true;
constexpr std::size_t kLargestFile = 1 << 20;
constexpr std::size_t kLongestPasswordLine = 4096;

std::string PasswordLine() {
  if (isatty(STDIN_FILENO) != 0) {
    throw Failure(ExitStatus::kUsage, std::string(kPasswordStdinOption) +
                                          ": a terminal would show it; there is --password");
  }
  std::string line;
  if (!LineReader(STDIN_FILENO, kLongestPasswordLine).Next(&line)) {
    throw Failure(ExitStatus::kUsage, std::string(kPasswordStdinOption) + ": there is no line");
  }
  if (!line.empty() && line.back() == '\r') {
    line.pop_back();
  }
  return line;
}

void TakeFiles(const SettingOptions& options, Json::Value* texts) {
  if (options.app_file) {
    (*texts)[SZK_APP] = ReadCallersFile(*options.app_file, kLargestFile);
  }
  if (options.private_data_file) {
    (*texts)[SZK_PRIVATE_DATA] = ReadCallersFile(*options.private_data_file, kLargestFile);
  }
}

void TakePassword(const SettingOptions& options, Json::Value* arguments) {
  if (options.ask_password) {
    (*arguments)[SZK_PROTECT_PASSWORD] = AskPassword();
  } else if (options.password_from_input) {
    (*arguments)[SZK_PROTECT_PASSWORD] = PasswordLine();
  }
}

// From the current folder; it may have gone.
std::string AbsolutePath(const std::string& path) {
  if (path.empty()) {
    throw Failure(ExitStatus::kUsage, std::string(kPathOption) + ": must not be empty");
  }
  std::error_code error;
  const std::filesystem::path absolute = std::filesystem::absolute(path, error);
  if (error) {
    throw Failure(ExitStatus::kFailed, std::string(kPathOption) + ": " + error.message());
  }
  return absolute.string();
}

// The file's checks want a whole path; `app` is what it stands in, given along with it or not.
void TakePath(const std::string& path, Json::Value* arguments) {
  Json::Value& app = (*arguments)[SZK_APP];
  if (app.isNull()) {
    app = Json::Value(Json::objectValue);
  }
  if (app.isObject()) {
    app[kPathMember] = AbsolutePath(path);
  }
}

std::vector<owner::Argument> KnownArguments(const std::string& needed) {
  std::vector<owner::Argument> known = owner::SettingArguments();
  for (owner::Argument& argument : known) {
    argument.needed = argument.name == needed;
  }
  return known;
}

// The link's data with another path, by the rules for data that is given as a whole: the two
// together may be too large.
owner::MaybeProblem SetPath(const std::string& path, const Entry& link, owner::Settings* settings) {
  Json::Value arguments(Json::objectValue);
  Json::Value& app = arguments[SZK_APP];
  app = link.get_app();
  if (!app.isObject()) {
    app = Json::Value(Json::objectValue);
  }
  app[kPathMember] = path;
  return owner::ReadSettings(arguments, std::time(nullptr), settings);
}

void RemovePassword(Entry* link) {
  link->set_protect_password("", false, Entry::ENCRYPT_ALGO_DEFAULT);
  if (link->get_protect_type() == Entry::PROTECT_PASSWORD) {
    link->set_protect_type(Entry::PROTECT_NONE);
  }
}

}  // namespace

const std::vector<ValueOption>& ValueOptions() {
  static const std::vector<ValueOption> options = {
      {"--owner", SZK_OWNER_USER, "USER", "Account that the link belongs to"},
      {"--project", SZK_PROJECT_NAME, "NAME", "Application that the link belongs to"},
      {"--hash", SZK_HASH, "HASH", "Random part of the address, chosen by hand"},
      {"--start", SZK_START_AT, "TIME", "No visitors before this time; '' for none"},
      {"--expire", SZK_EXPIRE_AT, "TIME", "No visitors after this time; '' for none"},
      {"--uses", SZK_EXPIRE_TIMES, "N", "Uses allowed; 0 for any number"},
      {"--use-count", SZK_USE_COUNT, "N", "Uses so far"},
      {"--protect", SZK_PROTECT_TYPE, "TYPE", "none, password or user"},
      {"--title", SZK_PROTECT_TITLE, "TEXT", "Shown on the login page"},
      {"--redirect", SZK_REDIRECT_TYPE, "TYPE", "none, url_param or always"},
      {"--redirect-uri", SZK_REDIRECT_URI, "URI", "Where visitors are sent on to"},
      {"--app", SZK_APP, "JSON", "The application's data, an object"},
      {"--private-data", SZK_PRIVATE_DATA, "JSON", "The application's private data, an object"}};
  return options;
}

const std::vector<ValueOption>& ListOptions() {
  static const std::vector<ValueOption> options = {
      {"--users", SZK_PROTECT_USERS, "USER,...", "Accounts that are admitted; '' for none"},
      {"--groups", SZK_PROTECT_GROUPS, "GROUP,...", "Groups that are admitted; '' for none"}};
  return options;
}

const std::vector<FlagOption>& FlagOptions() {
  static const std::vector<FlagOption> options = {
      {"--enabled", SZK_ENABLED_, true, "Admit visitors"},
      {"--disabled", SZK_ENABLED_, false, "Admit nobody"},
      {"--auto-gc", SZK_AUTO_GC, true, "Remove the link automatically some time after its end"},
      {"--no-auto-gc", SZK_AUTO_GC, false, "Keep the link after its end"},
      {"--match-ip", SZK_ENABLE_MATCH_IP, true, "Visitors stay admitted at the same address only"},
      {"--no-match-ip", SZK_ENABLE_MATCH_IP, false, "Visitors stay admitted at any address"}};
  return options;
}

bool SettingOptions::empty() const {
  return texts.empty() && values.empty() && !ask_password && !password_from_input && !no_password &&
         !app_file && !private_data_file && !path;
}

std::string OptionOf(const std::string& argument) {
  if (argument == SZK_PROTECT_PASSWORD) {
    return kPasswordOption;
  }
  if (argument == kPathMember) {
    return kPathOption;
  }
  for (const std::vector<ValueOption>* options : {&ValueOptions(), &ListOptions()}) {
    for (const ValueOption& option : *options) {
      if (argument == option.argument) {
        return option.name;
      }
    }
  }
  for (const FlagOption& option : FlagOptions()) {
    if (argument == option.argument) {
      return option.name;
    }
  }
  return argument;
}

GivenSettings ReadGivenSettings(const SettingOptions& options, const std::string& needed,
                                std::time_t now) {
  const std::vector<owner::Argument> known = KnownArguments(needed);
  Json::Value arguments = options.texts;
  TakeFiles(options, &arguments);
  Require(owner::ConvertTexts(known, &arguments));
  for (const std::string& name : options.values.getMemberNames()) {
    arguments[name] = options.values[name];
  }
  GivenSettings given;
  if (options.path) {
    given.path_was_given = true;
    const bool whole_app = arguments.isMember(SZK_APP);
    TakePath(*options.path, &arguments);
    if (!whole_app) {
      given.path = arguments[SZK_APP][kPathMember].asString();
    }
  }
  // Before somebody has typed a password, what else is wrong is said.
  Require(owner::CheckArguments(arguments, known));
  Require(owner::ReadSettings(arguments, now, &given.settings));
  Json::Value password(Json::objectValue);
  TakePassword(options, &password);
  Require(owner::CheckArguments(password, owner::SettingArguments()));
  Require(owner::ReadSettings(password, now, &given.settings));
  given.no_password = options.no_password;
  return given;
}

owner::MaybeProblem ApplyGivenSettings(const GivenSettings& given, Entry* link) {
  owner::Settings settings = given.settings;
  if (given.path) {
    if (owner::MaybeProblem problem = SetPath(*given.path, *link, &settings)) {
      return problem;
    }
  }
  if (given.no_password) {
    RemovePassword(link);
  }
  return owner::ApplySettings(settings, link);
}

bool TouchesFile(const GivenSettings& given) {
  return given.path || owner::TouchesFile(given.settings);
}

owner::MaybeProblem LookAtGivenFile(const GivenSettings& given,
                                    const std::vector<std::string>& share_folders,
                                    const Entry& link, owner::FileLook* look) {
  owner::MaybeProblem problem = owner::LookAtFile(share_folders, link, kByAdministrator, look);
  if (problem && given.path_was_given && problem->field == SZK_APP) {
    problem->field = kPathMember;
  }
  return problem;
}

}  // namespace cli
