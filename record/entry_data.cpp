// The JSON document in a link's "data" column.
#include <internal/entry_private.h>
#include <internal/json_text.h>
#include <tuvosharing/keys.h>

#include <utility>

namespace TUVO::sharing::record {

namespace {

// What a value stands for when it is none of the named ones is part of the format: both ways, the
// last case below takes all the rest.
const char* StoredText(Entry::ProtectType type) {
  return type == Entry::PROTECT_NONE       ? SZK_PROTECT_PROTECT_NONE
         : type == Entry::PROTECT_PASSWORD ? SZK_PROTECT_PROTECT_PASSWORD
                                           : SZK_PROTECT_PROTECT_USER;
}

const char* StoredText(Entry::PasswordEncryptAlgo algo) {
  return algo == Entry::ENCRYPT_ALGO_DEFAULT ? SZK_PROTECT_PASSWORD_ALGO_DEFAULT
                                             : SZK_PROTECT_PASSWORD_ALGO_MD5;
}

const char* StoredText(Entry::RedirectType type) {
  return type == Entry::REDIRECT_NONE       ? SZK_REDIRECT_REDIRECT_NONE
         : type == Entry::REDIRECT_URLPARAM ? SZK_REDIRECT_REDIRECT_URLPARAM
                                            : SZK_REDIRECT_REDIRECT_ALWAYS;
}

Entry::ProtectType ToProtectType(const std::string& text) {
  return text == SZK_PROTECT_PROTECT_NONE       ? Entry::PROTECT_NONE
         : text == SZK_PROTECT_PROTECT_PASSWORD ? Entry::PROTECT_PASSWORD
                                                : Entry::PROTECT_USER;
}

Entry::PasswordEncryptAlgo ToPasswordEncryptAlgo(const std::string& text) {
  return text == SZK_PROTECT_PASSWORD_ALGO_DEFAULT ? Entry::ENCRYPT_ALGO_DEFAULT
                                                   : Entry::ENCRYPT_ALGO_MD5;
}

Entry::RedirectType ToRedirectType(const std::string& text) {
  return text == SZK_REDIRECT_REDIRECT_NONE       ? Entry::REDIRECT_NONE
         : text == SZK_REDIRECT_REDIRECT_URLPARAM ? Entry::REDIRECT_URLPARAM
                                                  : Entry::REDIRECT_ALWAYS;
}

// Each reads what JSON's own conversions make of the value, null being the empty value; false for
// what has none: the document may have been written by another program.
bool Read(const Json::Value& value, bool& out) {
  if (!value.isConvertibleTo(Json::booleanValue)) {
    return false;
  }
  out = value.asBool();
  return true;
}

bool Read(const Json::Value& value, std::string& out) {
  if (!value.isConvertibleTo(Json::stringValue)) {
    return false;
  }
  out = value.asString();
  return true;
}

// An id is never made of anything but a number: null and false would be root's.
bool Read(const Json::Value& value, unsigned int& out) {
  if (!value.isUInt()) {
    return false;
  }
  out = value.asUInt();
  return true;
}

template <typename T>
bool Read(const Json::Value& value, std::vector<T>& out) {
  out.clear();
  if (!value.isArray() && !value.isNull()) {
    return false;
  }
  for (const Json::Value& element : value) {
    T item{};
    if (element.isNull() || !Read(element, item)) {
      return false;
    }
    out.push_back(std::move(item));
  }
  return true;
}

template <typename T>
Json::Value ToArray(const std::vector<T>& items) {
  Json::Value array(Json::arrayValue);
  for (const T& item : items) {
    array.append(item);
  }
  return array;
}

}  // namespace

std::string EntryPrivate::DataToText() const {
  Json::Value data(Json::objectValue);
  data[SZK_ENABLE_MATCH_IP] = enable_match_ip_;
  data[SZK_PROTECT_TYPE] = StoredText(protect_type_);
  data[SZK_PROTECT_TITLE] = protect_title_;
  data[SZK_PROTECT_PASSWORD] = protect_password_;
  data[SZK_PROTECT_PASSWORD_ALGO] = StoredText(protect_password_algo_);
  data[SZK_PROTECT_PASSWORD_SALT] = protect_password_salt_;
  data[SZK_PROTECT_UIDS] = ToArray(protect_uids_);
  data[SZK_PROTECT_EXTRA_USERS] = ToArray(protect_extra_users_);
  data[SZK_PROTECT_GIDS] = ToArray(protect_gids_);
  data[SZK_PROTECT_EXTRA_GROUPS] = ToArray(protect_extra_groups_);
  data[SZK_REDIRECT_TYPE] = StoredText(redirect_type_);
  data[SZK_REDIRECT_URI] = redirect_uri_;
  data[SZK_APP] = app_;
  data[SZK_PRIVATE_DATA] = private_data_;
  return JsonToText(data);
}

bool EntryPrivate::DataFromText(const std::string& text) {
  Json::Value data;
  return TextToJson(text, data) && data.isObject() && DataFromJson(data);
}

bool EntryPrivate::DataFromJson(Json::Value& data) {
  // Read beside what is there, so that a document that cannot be read changes nothing.
  const Json::Value& members = data;  // a look at what is missing must not make it
  bool enable_match_ip = false;
  std::string protect_type;
  std::string protect_title;
  std::string protect_password;
  std::string protect_password_algo;
  std::string protect_password_salt;
  std::vector<unsigned int> protect_uids;
  std::vector<std::string> protect_extra_users;
  std::vector<unsigned int> protect_gids;
  std::vector<std::string> protect_extra_groups;
  std::string redirect_type;
  std::string redirect_uri;
  if (!Read(members[SZK_ENABLE_MATCH_IP], enable_match_ip) ||
      !Read(members[SZK_PROTECT_TYPE], protect_type) ||
      !Read(members[SZK_PROTECT_TITLE], protect_title) ||
      !Read(members[SZK_PROTECT_PASSWORD], protect_password) ||
      !Read(members[SZK_PROTECT_PASSWORD_ALGO], protect_password_algo) ||
      !Read(members[SZK_PROTECT_PASSWORD_SALT], protect_password_salt) ||
      !Read(members[SZK_PROTECT_UIDS], protect_uids) ||
      !Read(members[SZK_PROTECT_EXTRA_USERS], protect_extra_users) ||
      !Read(members[SZK_PROTECT_GIDS], protect_gids) ||
      !Read(members[SZK_PROTECT_EXTRA_GROUPS], protect_extra_groups) ||
      !Read(members[SZK_REDIRECT_TYPE], redirect_type) ||
      !Read(members[SZK_REDIRECT_URI], redirect_uri)) {
    return false;
  }
  Json::Value private_data(Json::objectValue);
  if (data.isMember(SZK_PRIVATE_DATA)) {
    private_data.swap(data[SZK_PRIVATE_DATA]);
  }
  Json::Value app;
  app.swap(data[SZK_APP]);
  // Nothing below needs memory.
  enable_match_ip_ = enable_match_ip;
  protect_type_ = ToProtectType(protect_type);
  protect_title_ = std::move(protect_title);
  protect_password_ = std::move(protect_password);
  protect_password_algo_ = ToPasswordEncryptAlgo(protect_password_algo);
  protect_password_salt_ = std::move(protect_password_salt);
  protect_uids_ = std::move(protect_uids);
  protect_extra_users_ = std::move(protect_extra_users);
  protect_gids_ = std::move(protect_gids);
  protect_extra_groups_ = std::move(protect_extra_groups);
  redirect_type_ = ToRedirectType(redirect_type);
  redirect_uri_ = std::move(redirect_uri);
  app_.swap(app);
  private_data_.swap(private_data);
  return true;
}

}  // namespace TUVO::sharing::record
