// tuvosharing edit, enable and disable
#include <tuvosharing/entry.h>

#include <ctime>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_name.h"
#include "cli/output.h"
#include "common/config.h"
#include "owner/link_store.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;

// One link after the other, each by itself: what the first one's problem was does not hold the
// others up.
ExitStatus ChangeLinks(const std::vector<owner::LinkName>& names, const GivenSettings& given,
                       Json::Value* shown) {
  const std::vector<std::string> folders = common::ReadConfig().share_folders;
  const std::time_t now = std::time(nullptr);
  ExitStatus status = ExitStatus::kDone;
  for (const owner::LinkName& name : names) {
    StopIfInterrupted();
    Entry link;
    const owner::MaybeProblem problem = owner::ChangeLink(
        Database(), name, std::nullopt,
        [&](Entry* changed) {
          StopIfInterrupted();
          return ApplyGivenSettings(given, folders, changed);
        },
        &link);
    LogChange("set", link.get_id(), problem);
    if (problem) {
      StopIfInterrupted();  // which the waiting for a lock may have outlived
      const Failure failure = FailureOf(*problem, TextOf(name));
      Complain(failure.what());
      status = status == ExitStatus::kDone ? failure.status() : status;
    } else if (shown != nullptr) {
      shown->append(LinkWithAddress(link, now));
    }
  }
  return status;
}

}  // namespace

ExitStatus Edit(const EditOptions& options) {
  const std::vector<owner::LinkName> names = LinkNamesOf(options.links.texts, options.links.ids);
  if (options.settings.empty()) {
    throw Failure(ExitStatus::kUsage, "edit: there is nothing to change");
  }
  const GivenSettings given = ReadGivenSettings(options.settings, "", std::time(nullptr));
  if (given.settings.hash && names.size() > 1) {
    throw Failure(ExitStatus::kUsage, "--hash: can be given to one link only");
  }
  Json::Value links(Json::arrayValue);
  const ExitStatus status = ChangeLinks(names, given, options.json ? &links : nullptr);
  if (options.json) {
    Json::Value json;
    json["links"] = links;
    PrintJson(json);
  }
  return status;
}

ExitStatus Switch(const SwitchOptions& options) {
  GivenSettings given;
  given.settings.enabled = options.enabled;
  return ChangeLinks(LinkNamesOf(options.links.texts, options.links.ids), given, nullptr);
}

}  // namespace cli
