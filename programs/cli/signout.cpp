// tuvosharing signout
#include <tuvosharing/entry.h>

#include <ctime>
#include <iostream>

#include "cli/change_log.h"
#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/link_name.h"
#include "cli/output.h"
#include "owner/visitors.h"

namespace cli {

namespace {

void Print(long long count, bool as_json) {
  if (as_json) {
    Json::Value json;
    json["signed_out"] = static_cast<Json::Int64>(count);
    PrintJson(json);
    return;
  }
  std::cout << "signed out " << count << " visitors\n";
}

// One link after the other, each by itself: haste is what this is used in, and what one link's
// problem was does not hold the others up.
ExitStatus SignOutEach(const SignOutOptions& options) {
  ExitStatus status = ExitStatus::kDone;
  long long total = 0;
  for (const owner::LinkName& name : LinkNamesOf(options.links.texts, options.links.ids)) {
    StopIfInterrupted();
    TUVO::sharing::record::Entry link;
    int count = 0;
    const owner::MaybeProblem problem =
        owner::SignOutVisitors(Database(), name, std::nullopt, std::time(nullptr), &link, &count);
    LogChange("sign_out", link.get_id(), problem);
    if (problem) {
      StopIfInterrupted();  // which the waiting for a lock may have outlived
      const Failure failure = FailureOf(*problem, TextOf(name));
      Complain(failure.what());
      status = status == ExitStatus::kDone ? failure.status() : status;
    } else {
      total += count;
    }
  }
  Print(total, options.json);
  return status;
}

}  // namespace

ExitStatus SignOut(const SignOutOptions& options) {
  return LogRefusal("sign_out", [&options] { return SignOutEach(options); });
}

}  // namespace cli
