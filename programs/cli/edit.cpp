// tuvosharing edit, enable and disable
#include <tuvosharing/entry.h>

#include <ctime>
#include <set>

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

// Looks at the file that the link will lead to, while nobody has to wait for it.
owner::MaybeProblem LookBefore(const GivenSettings& given, Entry link, owner::FileLook* look) {
  if (owner::MaybeProblem problem = ApplyGivenSettings(given, &link)) {
    return problem;
  }
  return LookAtGivenFile(given, common::ReadConfig().share_folders, link, look);
}

// `link` is the link as it was found, and then as it was written.
owner::MaybeProblem ChangeLink(const GivenSettings& given, Entry* link) {
  owner::FileLook look;
  const bool touches_file = TouchesFile(given);
  if (touches_file) {
    if (owner::MaybeProblem problem = LookBefore(given, *link, &look)) {
      return problem;
    }
  }
  const auto change = [&](Entry* changed) {
    StopIfInterrupted();
    owner::MaybeProblem problem = ApplyGivenSettings(given, changed);
    return problem || !touches_file ? problem : owner::UseLook(look, changed);
  };
  return owner::ChangeLink(Database(), {link->get_id(), {}}, std::nullopt, change, link);
}

// One link after the other, each by itself: what the first one's problem was does not hold the
// others up.
ExitStatus ChangeLinks(const std::vector<owner::LinkName>& names, const GivenSettings& given,
                       Json::Value* shown) {
  const std::time_t now = std::time(nullptr);
  std::set<int> known;  // one may be named by its hash and by its number
  ExitStatus status = ExitStatus::kDone;
  for (const owner::LinkName& name : names) {
    StopIfInterrupted();
    Entry link;
    owner::MaybeProblem problem = owner::FindLink(Database(), name, std::nullopt, &link);
    const int id = problem ? 0 : link.get_id();
    if (!problem) {
      if (!known.insert(id).second) {
        continue;
      }
      problem = ChangeLink(given, &link);
    }
    LogChange("set", id, problem);
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

ExitStatus EditLinks(const EditOptions& options) {
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

ExitStatus SwitchLinks(const SwitchOptions& options) {
  GivenSettings given;
  given.settings.enabled = options.enabled;
  return ChangeLinks(LinkNamesOf(options.links.texts, options.links.ids), given, nullptr);
}

}  // namespace

ExitStatus Edit(const EditOptions& options) {
  return LogRefusal("set", [&options] { return EditLinks(options); });
}

ExitStatus Switch(const SwitchOptions& options) {
  return LogRefusal("set", [&options] { return SwitchLinks(options); });
}

}  // namespace cli
