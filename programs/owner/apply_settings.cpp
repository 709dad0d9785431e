// Settings into a link: how they fit together.
#include <tuvosharing/keys.h>
#include <tuvosharing/user_group.h>

#include <algorithm>

#include "owner/settings.h"

namespace owner {

namespace {

using TUVO::sharing::GroupToGID;
using TUVO::sharing::UserToUID;
using TUVO::sharing::record::Entry;

using Names = std::vector<std::string>;
using Resolves = bool (*)(const std::string&, unsigned int&);

// A name that stands for nobody is a slip, and would lock out whom it was meant for; those that the
// link holds already, of accounts that have gone for a while, may stay.
MaybeProblem CheckNames(const Names& names, const Names& held, Resolves resolves,
                        const char* field) {
  for (const std::string& name : names) {
    unsigned int id = 0;
    if (!resolves(name, id) && std::find(held.begin(), held.end(), name) == held.end()) {
      return Fault(Error::kBadValue, "must hold names that this system knows", field);
    }
  }
  return std::nullopt;
}

MaybeProblem ApplyNames(const Settings& settings, Entry* link) {
  if (settings.protect_users) {
    if (MaybeProblem problem = CheckNames(*settings.protect_users, link->get_protect_users(),
                                          UserToUID, TUVO::sharing::SZK_PROTECT_USERS)) {
      return problem;
    }
    link->set_protect_users(*settings.protect_users);
  }
  if (settings.protect_groups) {
    if (MaybeProblem problem = CheckNames(*settings.protect_groups, link->get_protect_groups(),
                                          GroupToGID, TUVO::sharing::SZK_PROTECT_GROUPS)) {
      return problem;
    }
    link->set_protect_groups(*settings.protect_groups);
  }
  return std::nullopt;
}

bool NamesSomebody(const std::optional<Names>& names) {
  return names && !names->empty();
}

// What the owner must have meant by a password, or by users.
MaybeProblem ImpliedProtection(const Settings& settings, std::optional<Entry::ProtectType>* type) {
  *type = settings.protect_type;
  if (*type) {
    return std::nullopt;
  }
  const bool accounts =
      NamesSomebody(settings.protect_users) || NamesSomebody(settings.protect_groups);
  if (settings.protect_password && accounts) {
    return Fault(Error::kConflict, "must say whether the password or the accounts count",
                 TUVO::sharing::SZK_PROTECT_TYPE);
  }
  if (settings.protect_password) {
    *type = Entry::PROTECT_PASSWORD;
  } else if (accounts) {
    *type = Entry::PROTECT_USER;
  }
  return std::nullopt;
}

bool HasPassword(const Entry& link) {
  return !link.get_protect_password().empty() &&
         (link.get_protect_password_algo() != Entry::ENCRYPT_ALGO_DEFAULT ||
          !link.get_protect_password_salt().empty());
}

bool AdmitsAccounts(const Entry& link) {
  return !link.get_protect_users().empty() || !link.get_protect_uids().empty() ||
         !link.get_protect_groups().empty() || !link.get_protect_gids().empty();
}

MaybeProblem CheckProtection(const Entry& link) {
  if (link.get_protect_type() == Entry::PROTECT_PASSWORD && !HasPassword(link)) {
    return Fault(Error::kConflict, "is needed for this protection",
                 TUVO::sharing::SZK_PROTECT_PASSWORD);
  }
  if (link.get_protect_type() == Entry::PROTECT_USER && !AdmitsAccounts(link)) {
    return Fault(Error::kConflict, "must name somebody for this protection",
                 TUVO::sharing::SZK_PROTECT_USERS);
  }
  return std::nullopt;
}

MaybeProblem ApplyProtection(const Settings& settings, Entry* link) {
  std::optional<Entry::ProtectType> type;
  if (MaybeProblem problem = ImpliedProtection(settings, &type)) {
    return problem;
  }
  if (settings.protect_title) {
    link->set_protect_title(*settings.protect_title);
  }
  if (settings.protect_password) {
    link->set_protect_password(*settings.protect_password, true, Entry::ENCRYPT_ALGO_DEFAULT);
  }
  if (MaybeProblem problem = ApplyNames(settings, link)) {
    return problem;
  }
  if (type) {
    link->set_protect_type(*type);
  }
  const bool touched = type || settings.protect_users || settings.protect_groups;
  return touched ? CheckProtection(*link) : std::nullopt;
}

MaybeProblem ApplyRedirect(const Settings& settings, Entry* link) {
  if (settings.redirect_type) {
    link->set_redirect_type(*settings.redirect_type);
  }
  if (settings.redirect_uri) {
    link->set_redirect_uri(*settings.redirect_uri);
  }
  if ((settings.redirect_type || settings.redirect_uri) &&
      link->get_redirect_type() != Entry::REDIRECT_NONE && link->get_redirect_uri().empty()) {
    return Fault(Error::kConflict, "is needed for this redirect", TUVO::sharing::SZK_REDIRECT_URI);
  }
  return std::nullopt;
}

MaybeProblem ApplyTimes(const Settings& settings, Entry* link) {
  if (settings.start_at) {
    link->set_start_at(static_cast<long>(*settings.start_at));
  }
  if (settings.expire_at) {
    link->set_expire_at(static_cast<long>(*settings.expire_at));
  }
  if ((settings.start_at || settings.expire_at) && link->get_expire_at() != 0 &&
      link->get_expire_at() <= link->get_start_at()) {
    return Fault(Error::kConflict, "must lie behind the start", TUVO::sharing::SZK_EXPIRE_AT);
  }
  return std::nullopt;
}

// The limit first: setting one where there was none starts the count anew, and a count that is
// given along with it holds all the same.
void ApplyUses(const Settings& settings, Entry* link) {
  if (settings.expire_times) {
    link->set_expire_times(*settings.expire_times);
  }
  if (settings.use_count) {
    link->set_use_count(*settings.use_count);
  }
}

void ApplyPlain(const Settings& settings, Entry* link) {
  if (settings.owner_uid) {
    link->set_owner_uid(*settings.owner_uid);
  }
  if (settings.project_name) {
    link->set_project_name(*settings.project_name);
  }
  if (settings.hash) {
    link->set_hash(*settings.hash);
  }
  if (settings.enabled) {
    link->set_enabled(*settings.enabled);
  }
  if (settings.auto_gc) {
    link->set_auto_gc(*settings.auto_gc);
  }
  if (settings.enable_match_ip) {
    link->set_enable_match_ip(*settings.enable_match_ip);
  }
  if (settings.app) {
    link->set_app(*settings.app);
  }
  if (settings.private_data) {
    link->set_private_data(*settings.private_data);
  }
}

}  // namespace

MaybeProblem ApplySettings(const Settings& settings, Entry* link) {
  ApplyPlain(settings, link);
  ApplyUses(settings, link);
  if (MaybeProblem problem = ApplyTimes(settings, link)) {
    return problem;
  }
  if (MaybeProblem problem = ApplyProtection(settings, link)) {
    return problem;
  }
  return ApplyRedirect(settings, link);
}

}  // namespace owner
