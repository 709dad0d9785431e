// The JSON document in a link's "data" column.
#include <internal/entry_private.h>
#include <internal/json_text.h>
#include <tuvosharing/keys.h>

#include <array>
#include <optional>
#include <string_view>
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
  const char* begin = nullptr;
  const char* end = nullptr;
  if (value.getString(&begin, &end)) {  // nearly always, and much quicker than a conversion
    out.assign(begin, end);
    return true;
  }
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

// What a document says, beside the fields that it will replace: one that cannot be read changes
// nothing. What it does not say is as it is here.
struct Document {
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
  Json::Value app;
  std::optional<Json::Value> private_data;  // without, an empty object
};

template <auto Field>
bool ReadInto(Json::Value& value, Document& document) {
  return Read(value, document.*Field);
}

bool TakeApp(Json::Value& value, Document& document) {
  document.app.swap(value);
  return true;
}

bool TakePrivateData(Json::Value& value, Document& document) {
  document.private_data = std::move(value);
  return true;
}

struct Member {
  std::string_view name;
  bool (*read)(Json::Value& value, Document& document);
};

// One walk over what is there: looking for each name by itself takes as long as parsing a short
// document. Takes `app` and the private data out of `data`.
bool ReadMembers(Json::Value& data, Document& document) {
  const std::array<Member, 14> members = {{
      {SZK_APP, TakeApp},
      {SZK_ENABLE_MATCH_IP, ReadInto<&Document::enable_match_ip>},
      {SZK_PRIVATE_DATA, TakePrivateData},
      {SZK_PROTECT_EXTRA_GROUPS, ReadInto<&Document::protect_extra_groups>},
      {SZK_PROTECT_EXTRA_USERS, ReadInto<&Document::protect_extra_users>},
      {SZK_PROTECT_GIDS, ReadInto<&Document::protect_gids>},
      {SZK_PROTECT_PASSWORD, ReadInto<&Document::protect_password>},
      {SZK_PROTECT_PASSWORD_ALGO, ReadInto<&Document::protect_password_algo>},
      {SZK_PROTECT_PASSWORD_SALT, ReadInto<&Document::protect_password_salt>},
      {SZK_PROTECT_TITLE, ReadInto<&Document::protect_title>},
      {SZK_PROTECT_TYPE, ReadInto<&Document::protect_type>},
      {SZK_PROTECT_UIDS, ReadInto<&Document::protect_uids>},
      {SZK_REDIRECT_TYPE, ReadInto<&Document::redirect_type>},
      {SZK_REDIRECT_URI, ReadInto<&Document::redirect_uri>},
  }};
  std::size_t next = 0;  // documents have their members in the order of the names, as the table has
  const auto end = data.end();
  for (auto value = data.begin(); value != end; ++value) {
    const char* name_end = nullptr;
    const char* const name_begin = value.memberName(&name_end);
    const std::string_view name(name_begin, static_cast<std::size_t>(name_end - name_begin));
    for (std::size_t tried = 0; tried < members.size(); ++tried) {
      const Member& member = members[next];
      next = (next + 1) % members.size();
      if (member.name == name) {
        if (!member.read(*value, document)) {
          return false;
        }
        break;
      }
    }
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
  using Name = Json::StaticString;  // such are not copied
  Json::Value data(Json::objectValue);
  data[Name(SZK_ENABLE_MATCH_IP)] = enable_match_ip_;
  data[Name(SZK_PROTECT_TYPE)] = Name(StoredText(protect_type_));
  data[Name(SZK_PROTECT_TITLE)] = protect_title_;
  data[Name(SZK_PROTECT_PASSWORD)] = protect_password_;
  data[Name(SZK_PROTECT_PASSWORD_ALGO)] = Name(StoredText(protect_password_algo_));
  data[Name(SZK_PROTECT_PASSWORD_SALT)] = protect_password_salt_;
  data[Name(SZK_PROTECT_UIDS)] = ToArray(protect_uids_);
  data[Name(SZK_PROTECT_EXTRA_USERS)] = ToArray(protect_extra_users_);
  data[Name(SZK_PROTECT_GIDS)] = ToArray(protect_gids_);
  data[Name(SZK_PROTECT_EXTRA_GROUPS)] = ToArray(protect_extra_groups_);
  data[Name(SZK_REDIRECT_TYPE)] = Name(StoredText(redirect_type_));
  data[Name(SZK_REDIRECT_URI)] = redirect_uri_;
  data[Name(SZK_APP)] = app_;
  data[Name(SZK_PRIVATE_DATA)] = private_data_;
  return JsonToText(data);
}

bool EntryPrivate::DataFromText(const char* text) {
  Json::Value data;
  Document document;
  if (!TextToJson(text, data) || !data.isObject() || !ReadMembers(data, document)) {
    return false;
  }
  if (!document.private_data) {
    document.private_data.emplace(Json::objectValue);
  }
  // Nothing below needs memory.
  enable_match_ip_ = document.enable_match_ip;
  protect_type_ = ToProtectType(document.protect_type);
  protect_title_ = std::move(document.protect_title);
  protect_password_ = std::move(document.protect_password);
  protect_password_algo_ = ToPasswordEncryptAlgo(document.protect_password_algo);
  protect_password_salt_ = std::move(document.protect_password_salt);
  protect_uids_ = std::move(document.protect_uids);
  protect_extra_users_ = std::move(document.protect_extra_users);
  protect_gids_ = std::move(document.protect_gids);
  protect_extra_groups_ = std::move(document.protect_extra_groups);
  redirect_type_ = ToRedirectType(document.redirect_type);
  redirect_uri_ = std::move(document.redirect_uri);
  app_.swap(document.app);
  private_data_.swap(*document.private_data);
  return true;
}

}  // namespace TUVO::sharing::record
