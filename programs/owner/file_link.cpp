#include "owner/file_link.h"

#include <json/value.h>
#include <tuvosharing/keys.h>
#include <unistd.h>

#include <optional>

#include "owner/account.h"
#include "owner/shareable_file.h"
#include "owner/text_check.h"

namespace owner {

namespace {

using TUVO::sharing::SZK_APP;

constexpr const char* kFileProject = "file";
constexpr const char* kPath = "path";

MaybeProblem ProblemOf(FileAnswer answer) {
  switch (answer) {
    case FileAnswer::kMay:
      return std::nullopt;
    case FileAnswer::kNotReadable:
      return Fault(Error::kFileNotAllowed,
                   "must name a regular file that the link's owner may read", SZK_APP);
    case FileAnswer::kOutside:
      return Fault(Error::kFileNotAllowed, "must name a file below a folder that may be shared",
                   SZK_APP);
    case FileAnswer::kCannotTell:
      break;
  }
  return InternalFault();
}

bool CanBecomeRoot() {
  uid_t real = 0;
  uid_t effective = 0;
  uid_t saved = 0;
  return getresuid(&real, &effective, &saved) == 0 && (real == 0 || effective == 0 || saved == 0);
}

// As whom the file is looked at.
MaybeProblem ChooseLooker(unsigned int owner_uid, bool by_administrator,
                          std::optional<Account>* looker) {
  if (CanBecomeRoot() || owner_uid == getuid()) {
    *looker = AccountOfUid(owner_uid);
    return *looker ? std::nullopt
                   : Fault(Error::kFileNotAllowed,
                           "cannot name a file: the link's owner has no account", SZK_APP);
  }
  if (!by_administrator) {
    return Fault(Error::kForbidden,
                 "can name a file for administrators only, as this program is installed", SZK_APP);
  }
  *looker = AccountOfUid(getuid());
  return *looker ? std::nullopt : InternalFault();
}

}  // namespace

bool TouchesFile(const Settings& settings) {
  return settings.project_name || settings.owner_uid || settings.app;
}

MaybeProblem LookAtFile(const std::vector<std::string>& folders,
                        const TUVO::sharing::record::Entry& link, bool by_administrator,
                        FileLook* look) {
  look->of_file = link.get_project_name() == kFileProject;
  look->owner_uid = link.get_owner_uid();
  look->app = link.get_app();
  look->resolved_app = look->app;
  if (!look->of_file) {
    return std::nullopt;
  }
  Json::Value& app = look->resolved_app;
  if (!app.isObject() || !app[kPath].isString()) {
    return Fault(Error::kConflict, "must name the file, as \"path\"", SZK_APP);
  }
  std::optional<Account> looker;
  if (MaybeProblem problem = ChooseLooker(look->owner_uid, by_administrator, &looker)) {
    return problem;
  }
  std::string resolved;
  if (MaybeProblem problem =
          ProblemOf(CheckShareable(app[kPath].asString(), *looker, folders, &resolved))) {
    return problem;
  }
  // A symbolic link may lead to a name that JSON has no text for.
  if (!IsUtf8(resolved)) {
    return Fault(Error::kFileNotAllowed, "must name a file whose whole path is UTF-8", SZK_APP);
  }
  app[kPath] = resolved;
  return std::nullopt;
}

MaybeProblem UseLook(const FileLook& look, TUVO::sharing::record::Entry* link) {
  const bool of_file = link->get_project_name() == kFileProject;
  if (!of_file && !look.of_file) {
    return std::nullopt;
  }
  if (of_file != look.of_file || link->get_owner_uid() != look.owner_uid ||
      link->get_app() != look.app) {
    return Fault(Error::kBusy, "the link was changed meanwhile; try again");
  }
  link->set_app(look.resolved_app);
  return std::nullopt;
}

MaybeProblem CheckFileLink(const std::vector<std::string>& folders,
                           TUVO::sharing::record::Entry* link, bool by_administrator) {
  FileLook look;
  MaybeProblem problem = LookAtFile(folders, *link, by_administrator, &look);
  return problem ? problem : UseLook(look, link);
}

}  // namespace owner
