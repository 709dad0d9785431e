// What an owner decides about a link.
#ifndef PROGRAMS_OWNER_SETTINGS_H_
#define PROGRAMS_OWNER_SETTINGS_H_

#include <json/value.h>
#include <tuvosharing/entry.h>

#include <ctime>
#include <optional>
#include <string>
#include <vector>

#include "owner/argument.h"
#include "owner/problem.h"

namespace owner {

// Each of them is left as it is when it has no value.
struct Settings {
  std::optional<unsigned int> owner_uid;
  std::optional<std::string> project_name;
  std::optional<std::string> hash;
  std::optional<bool> enabled;
  std::optional<std::time_t> start_at;   // 0: none
  std::optional<std::time_t> expire_at;  // 0: none
  std::optional<int> expire_times;
  std::optional<int> use_count;
  std::optional<bool> auto_gc;
  std::optional<bool> enable_match_ip;
  std::optional<TUVO::sharing::record::Entry::ProtectType> protect_type;
  std::optional<std::string> protect_title;
  std::optional<std::string> protect_password;
  std::optional<std::vector<std::string>> protect_users;
  std::optional<std::vector<std::string>> protect_groups;
  std::optional<TUVO::sharing::record::Entry::RedirectType> redirect_type;
  std::optional<std::string> redirect_uri;
  std::optional<Json::Value> app;
  std::optional<Json::Value> private_data;
};

// The arguments that make up settings, in the order of docs/webapi.md.
const std::vector<Argument>& SettingArguments();

// Reads the settings among `arguments`, which CheckArguments has passed; members that are none are
// not looked at. Ranges, lengths and forms are checked here, and that the owner's account exists;
// `now` is what spans count from. On a problem `settings` is unspecified.
MaybeProblem ReadSettings(const Json::Value& arguments, std::time_t now, Settings* settings);

// Changes `link` and checks that what was changed fits together (docs/webapi.md). On a problem the
// link is unspecified and must not be stored. The hash is set as well; that it is not taken is
// another's to see.
MaybeProblem ApplySettings(const Settings& settings, TUVO::sharing::record::Entry* link);

}  // namespace owner

#endif  // PROGRAMS_OWNER_SETTINGS_H_
