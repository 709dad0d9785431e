// tuvosharing show
#include <tuvosharing/entry.h>
#include <tuvosharing/keys.h>

#include <ctime>
#include <iostream>

#include "cli/commands.h"
#include "cli/database.h"
#include "cli/display.h"
#include "cli/failure.h"
#include "cli/link_name.h"
#include "cli/output.h"
#include "owner/link_store.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;
using namespace TUVO::sharing;  // NOLINT(google-build-using-namespace)

constexpr std::size_t kNameWidth = 18;

std::string TextOfValue(const Json::Value& value) {
  if (value.isBool()) {
    return value.asBool() ? "yes" : "no";
  }
  if (value.isArray()) {
    std::string text;
    for (const Json::Value& item : value) {
      text += (text.empty() ? "" : ", ") + item.asString();
    }
    return text;
  }
  return value.isObject() ? JsonLine(value) : value.asString();
}

void PrintForPeople(const Json::Value& link) {
  for (const char* name : {"id",
                           SZK_HASH,
                           "url",
                           "state",
                           SZK_PROJECT_NAME,
                           SZK_OWNER_USER,
                           SZK_OWNER_UID,
                           SZK_ENABLED_,
                           SZK_START_AT,
                           SZK_EXPIRE_AT,
                           SZK_EXPIRE_TIMES,
                           SZK_USE_COUNT,
                           SZK_AUTO_GC,
                           SZK_ENABLE_MATCH_IP,
                           SZK_PROTECT_TYPE,
                           SZK_PROTECT_TITLE,
                           SZK_PROTECT_USERS,
                           SZK_PROTECT_GROUPS,
                           SZK_REDIRECT_TYPE,
                           SZK_REDIRECT_URI,
                           SZK_APP,
                           SZK_PRIVATE_DATA}) {
    if (!link.isMember(name)) {
      continue;
    }
    std::string line = std::string(name) + ":";
    line.resize(std::max(line.size() + 1, kNameWidth + 2), ' ');
    line += Harmless(TextOfValue(link[name]));
    line.erase(line.find_last_not_of(' ') + 1);
    std::cout << line << '\n';
  }
}

}  // namespace

ExitStatus Show(const ShowOptions& options) {
  const std::vector<owner::LinkName> names = LinkNamesOf(options.links.texts, options.links.ids);
  if (names.size() != 1) {
    throw Failure(ExitStatus::kUsage, "show: takes one link");
  }
  Entry link;
  Require(owner::FindLink(Database(), names.front(), std::nullopt, &link), TextOf(names.front()));
  Json::Value json = LinkWithAddress(link, std::time(nullptr));
  if (options.with_private_data) {
    json[SZK_PRIVATE_DATA] = link.get_private_data();
  }
  if (options.json) {
    PrintJson(json);
  } else {
    PrintForPeople(json);
  }
  return ExitStatus::kDone;
}

}  // namespace cli
