#include <internal/constant_time.h>
#include <internal/entry_private.h>
#include <internal/log.h>
#include <internal/row_values.h>
#include <internal/time_text.h>
#include <tuvoplatform/random.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/row.h>
#include <tuvosharing/user_group.h>
#include <tuvosharing/utils.h>

#include <utility>

namespace TUVO::sharing::record {

namespace {

constexpr char kTimeFormat[] = "%Y-%m-%d %H:%M:%S";

using NameToId = bool (*)(const std::string& name, unsigned int& id);
using IdToName = bool (*)(const unsigned int& id, std::string& name);

// Sorts names into the ids of those that resolve and the rest as they are.
void Resolve(const std::vector<std::string>& names, NameToId to_id, std::vector<unsigned int>& ids,
             std::vector<std::string>& rest) {
  ids.clear();
  rest.clear();
  for (const std::string& name : names) {
    unsigned int id = 0;
    if (to_id(name, id)) {
      ids.push_back(id);
    } else {
      rest.push_back(name);
    }
  }
}

std::vector<std::string> Names(const std::vector<unsigned int>& ids, IdToName to_name,
                               const std::vector<std::string>& rest) {
  std::vector<std::string> names;
  for (const unsigned int id : ids) {
    std::string name;
    if (to_name(id, name)) {
      names.push_back(name);
    }
  }
  names.insert(names.end(), rest.begin(), rest.end());
  return names;
}

// Names kept as such count as soon as they exist.
std::vector<unsigned int> Ids(const std::vector<unsigned int>& ids, NameToId to_id,
                              const std::vector<std::string>& rest) {
  std::vector<unsigned int> all = ids;
  for (const std::string& name : rest) {
    unsigned int id = 0;
    if (to_id(name, id)) {
      all.push_back(id);
    }
  }
  return all;
}

Json::Value ToArray(const std::vector<std::string>& texts) {
  Json::Value array(Json::arrayValue);
  for (const std::string& text : texts) {
    array.append(text);
  }
  return array;
}

const char* PublicText(Entry::ProtectType type) {
  switch (type) {
    case Entry::PROTECT_PASSWORD:
      return SZK_PROTECT_PROTECT_PASSWORD;
    case Entry::PROTECT_USER:
      return SZK_PROTECT_PROTECT_USER;
    default:
      return SZK_PROTECT_PROTECT_NONE;
  }
}

const char* PublicText(Entry::RedirectType type) {
  switch (type) {
    case Entry::REDIRECT_URLPARAM:
      return SZK_REDIRECT_REDIRECT_URLPARAM;
    case Entry::REDIRECT_ALWAYS:
      return SZK_REDIRECT_REDIRECT_ALWAYS;
    default:
      return SZK_REDIRECT_REDIRECT_NONE;
  }
}

}  // namespace

std::vector<std::string> EntryPrivate::GetFieldList() const {
  const long start_at = start_at_;
  const long expire_at = expire_at_;
  return {key_,
          project_name_,
          ToString(enabled_),
          std::to_string(owner_uid_),
          ToString(start_at),
          ToString(expire_at),
          ToString(expire_times_),
          ToString(use_count_),
          ToString(auto_gc_),
          DataToText()};
}

std::map<std::string, std::string> EntryPrivate::GetFieldMap() const {
  const std::vector<std::string> fields = GetFieldList();
  return {{SZK_HASH, fields[0]},         {SZK_PROJECT_NAME, fields[1]}, {SZK_ENABLED_, fields[2]},
          {SZK_OWNER_UID, fields[3]},    {SZK_START_AT, fields[4]},     {SZK_EXPIRE_AT, fields[5]},
          {SZK_EXPIRE_TIMES, fields[6]}, {SZK_USE_COUNT, fields[7]},    {SZK_AUTO_GC, fields[8]},
          {SZK_DATA, fields[9]}};
}

bool EntryPrivate::IsLegal() const {
  const std::string& hash_ = key_;  // the name that the log line shows
  // clang-format off
  // NOLINTBEGIN(readability-container-size-empty)
  SHARING_RETURN_FALSE_IF(!blValid_);
  SHARING_RETURN_FALSE_IF("" == hash_);
  SHARING_RETURN_FALSE_IF("" == project_name_);
  SHARING_RETURN_FALSE_IF(UID_ERR == owner_uid_);
  SHARING_RETURN_FALSE_IF(! app_.isObject());
  SHARING_RETURN_FALSE_IF(! private_data_.isObject());
  SHARING_RETURN_FALSE_IF(Entry::PROTECT_PASSWORD == protect_type_ && "" == protect_password_);
  SHARING_RETURN_FALSE_IF(Entry::PROTECT_PASSWORD == protect_type_ && Entry::ENCRYPT_ALGO_DEFAULT == protect_password_algo_ && "" == protect_password_salt_);
  SHARING_RETURN_FALSE_IF(Entry::PROTECT_USER == protect_type_ && (0 == protect_uids_.size() + protect_extra_users_.size() + protect_gids_.size() + protect_extra_groups_.size()));
  // NOLINTEND(readability-container-size-empty)
  // clang-format on
  return true;
}

bool EntryPrivate::IsValid() const {
  const std::time_t timeNow = time(nullptr);
  // clang-format off
  SHARING_RETURN_FALSE_IF(! IsLegal());
  SHARING_RETURN_FALSE_IF(! enabled_);
  SHARING_RETURN_FALSE_IF(0 < start_at_ && start_at_ > timeNow);
  SHARING_RETURN_FALSE_IF(0 < expire_at_ && timeNow > expire_at_);
  SHARING_RETURN_FALSE_IF(0 < expire_times_ && use_count_ > expire_times_);
  // clang-format on
  return true;
}

bool EntryPrivate::IsPasswordValid(const std::string& password) const {
  if (protect_type_ != Entry::PROTECT_PASSWORD) {
    return true;
  }
  std::string digest;
  const bool hashed = protect_password_algo_ == Entry::ENCRYPT_ALGO_DEFAULT
                          ? Sha1WithSaltHashPassword(password, protect_password_salt_, digest)
                          : MD5HashPassword(password, digest);
  // Answers do not take longer the more of a wrong password's digest is right.
  return hashed && internal::AreEqualInConstantTime(digest, protect_password_);
}

void EntryPrivate::SetProtectPassword(const std::string& password, bool hash,
                                      Entry::PasswordEncryptAlgo algo) {
  static RANDOM::TUVORandom random;
  blValid_ = false;
  std::string result;
  if (!hash) {
    result = password;
    blValid_ = true;
  } else if (algo == Entry::ENCRYPT_ALGO_DEFAULT) {
    blValid_ = random.getString(RANDOM::POOL_ALPHA_NUMERIC,
                                static_cast<unsigned int>(SHARING_PASS_HASH_LENGTH),
                                protect_password_salt_) &&
               Sha1WithSaltHashPassword(password, protect_password_salt_, result);
  } else {
    blValid_ = MD5HashPassword(password, result);
  }
  protect_password_ = result;
  protect_password_algo_ = algo;
}

std::string EntryPrivate::GetOwnerUser() const {
  std::string name;
  UIDToUser(owner_uid_, name);
  return name;
}

void EntryPrivate::SetOwnerUser(const std::string& name) {
  owner_uid_ = UID_ERR;
  UserToUID(name, owner_uid_);
}

std::vector<std::string> EntryPrivate::GetProtectUsers() const {
  return Names(protect_uids_, &UIDToUser, protect_extra_users_);
}

std::vector<unsigned int> EntryPrivate::GetProtectUids() const {
  return Ids(protect_uids_, &UserToUID, protect_extra_users_);
}

void EntryPrivate::SetProtectUsers(const std::vector<std::string>& names) {
  Resolve(names, &UserToUID, protect_uids_, protect_extra_users_);
}

std::vector<std::string> EntryPrivate::GetProtectGroups() const {
  return Names(protect_gids_, &GIDToGroup, protect_extra_groups_);
}

std::vector<unsigned int> EntryPrivate::GetProtectGids() const {
  return Ids(protect_gids_, &GroupToGID, protect_extra_groups_);
}

void EntryPrivate::SetProtectGroups(const std::vector<std::string>& names) {
  Resolve(names, &GroupToGID, protect_gids_, protect_extra_groups_);
}

void EntryPrivate::ToJSON(Json::Value& value) const {
  value = Json::Value(Json::objectValue);
  value[SZK_HASH] = key_;
  value[SZK_PROJECT_NAME] = project_name_;
  value[SZK_ENABLED_] = enabled_;
  value[SZK_OWNER_USER] = GetOwnerUser();
  value[SZK_START_AT] = TimeToText(start_at_, kTimeFormat);
  value[SZK_EXPIRE_AT] = TimeToText(expire_at_, kTimeFormat);
  value[SZK_EXPIRE_TIMES] = expire_times_;
  value[SZK_USE_COUNT] = use_count_;
  value[SZK_AUTO_GC] = auto_gc_;
  value[SZK_ENABLE_MATCH_IP] = enable_match_ip_;
  value[SZK_PROTECT_TITLE] = protect_title_;
  value[SZK_PROTECT_TYPE] = PublicText(protect_type_);
  value[SZK_PROTECT_USERS] = ToArray(GetProtectUsers());
  value[SZK_PROTECT_GROUPS] = ToArray(GetProtectGroups());
  value[SZK_REDIRECT_TYPE] = PublicText(redirect_type_);
  value[SZK_REDIRECT_URI] = redirect_uri_;
  value[SZK_APP] = app_;
}

bool EntryPrivate::FromRow(const db::Row& row) {
  const db::RowValues values(row);
  // Read beside what is there, so that a row that memory does not suffice for changes nothing: half
  // of it would be a link without its protection.
  const int id = values.Int(SZK_ID_, 0);
  std::string hash = values.Text(SZK_HASH);
  std::string project_name = values.Text(SZK_PROJECT_NAME);
  const std::string enabled = values.Text(SZK_ENABLED_);
  const unsigned int owner_uid = values.UInt(SZK_OWNER_UID, UID_ERR);
  const std::time_t start_at = values.Time(SZK_START_AT, 0);
  const std::time_t expire_at = values.Time(SZK_EXPIRE_AT, 0);
  const int expire_times = values.Int(SZK_EXPIRE_TIMES, 0);
  const int use_count = values.Int(SZK_USE_COUNT, 0);
  const bool auto_gc = values.Int(SZK_AUTO_GC, 0) != 0;
  const bool has_data = DataFromText(values.Bytes(SZK_DATA));
  // Nothing below needs memory.
  id_ = id;
  key_ = std::move(hash);
  project_name_ = std::move(project_name);
  // A row without the value is a link that nobody switched off.
  enabled_ = enabled.empty() || enabled == "1";
  owner_uid_ = owner_uid;
  start_at_ = start_at;
  expire_at_ = expire_at;
  expire_times_ = expire_times;
  use_count_ = use_count;
  auto_gc_ = auto_gc;
  return has_data && IsLegal();
}

}  // namespace TUVO::sharing::record
