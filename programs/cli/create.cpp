// tuvosharing create
#include <tuvosharing/keys.h>
#include <unistd.h>

#include <ctime>
#include <iostream>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/display.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "common/config.h"
#include "owner/link_store.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;

owner::MaybeProblem MakeLink(const GivenSettings& given, std::time_t now, Entry* link) {
  link->set_owner_uid(getuid());
  link->set_app(Json::Value(Json::objectValue));
  if (owner::MaybeProblem problem = ApplyGivenSettings(given, link)) {
    return problem;
  }
  owner::FileLook look;
  if (owner::MaybeProblem problem =
          LookAtGivenFile(given, common::ReadConfig().share_folders, *link, &look)) {
    return problem;
  }
  if (owner::MaybeProblem problem = owner::UseLook(look, link)) {
    return problem;
  }
  if (link->get_expire_at() != 0 && link->get_expire_at() <= now) {
    return owner::Fault(owner::Error::kBadValue, "must lie in the future",
                        TUVO::sharing::SZK_EXPIRE_AT);
  }
  return owner::CreateLink(Database(), link);
}

void PrintLink(const Entry& link, const CreateOptions& options, std::time_t now) {
  if (options.quiet) {
    std::cout << link.get_hash() << '\n';
    return;
  }
  const Json::Value json = LinkWithAddress(link, now);
  if (options.json) {
    PrintJson(json);
    return;
  }
  std::cout << link.get_hash() << '\n';
  if (json["url"].asString().empty()) {
    Complain("the link is made; its address is not known (the system log says why)");
  } else {
    std::cout << Harmless(json["url"].asString()) << '\n';
  }
}

// Whoever is not told its hash has a link that is live all the same.
void Print(const Entry& link, const CreateOptions& options, std::time_t now) {
  PrintLink(link, options, now);
  if (std::cout.flush()) {
    return;
  }
  const std::string message =
      "the link is made (#" + std::to_string(link.get_id()) + "); its hash cannot be written";
  if (NotedSignal() != 0) {
    Complain(message);
    throw Interruption();
  }
  throw Failure(ExitStatus::kFailed, message);
}

ExitStatus MakeAndPrint(const CreateOptions& options) {
  const std::time_t now = std::time(nullptr);
  const GivenSettings given =
      ReadGivenSettings(options.settings, TUVO::sharing::SZK_PROJECT_NAME, now);
  Entry link;
  const owner::MaybeProblem problem = MakeLink(given, now, &link);
  LogChange("create", problem ? 0 : link.get_id(), problem);
  if (problem) {
    StopIfInterrupted();  // which the waiting for a lock may have outlived
  }
  Require(problem);
  Print(link, options, now);
  return ExitStatus::kDone;
}

}  // namespace

ExitStatus Create(const CreateOptions& options) {
  return LogRefusal("create", [&options] { return MakeAndPrint(options); });
}

}  // namespace cli
