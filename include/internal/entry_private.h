#ifndef INTERNAL_ENTRY_PRIVATE_H_
#define INTERNAL_ENTRY_PRIVATE_H_

#include <internal/user_id.h>
#include <json/value.h>
#include <tuvosharing/entry.h>
#include <tuvosharing/object.h>

#include <ctime>
#include <map>
#include <string>
#include <vector>

namespace TUVO::sharing::record {

// What Entry holds; its operations are described there. The hash is the base's key.
class EntryPrivate : public Object {
 public:
  std::vector<std::string> GetFieldList() const override;
  std::map<std::string, std::string> GetFieldMap() const override;
  bool IsLegal() const override;
  void ToJSON(Json::Value& value) const override;
  bool FromRow(const db::Row& row) override;

  bool IsValid() const;
  bool IsPasswordValid(const std::string& password) const;
  void SetProtectPassword(const std::string& password, bool hash, Entry::PasswordEncryptAlgo algo);
  std::string GetOwnerUser() const;
  void SetOwnerUser(const std::string& name);
  std::vector<std::string> GetProtectUsers() const;
  std::vector<unsigned int> GetProtectUids() const;
  void SetProtectUsers(const std::vector<std::string>& names);
  std::vector<std::string> GetProtectGroups() const;
  std::vector<unsigned int> GetProtectGids() const;
  void SetProtectGroups(const std::vector<std::string>& names);

 private:
  friend class Entry;
  friend bool ProtectAlike(const Entry& one, const Entry& other);

  // The "data" column: every field from enable_match_ip_ on, as one JSON object. Reading sets all
  // of them, or none and answers false when a member is of the wrong JSON type.
  std::string DataToText() const;
  bool DataFromText(const char* text);

  std::string project_name_;
  bool enabled_ = true;
  unsigned int owner_uid_ = UID_ERR;
  std::time_t start_at_ = 0;
  std::time_t expire_at_ = 0;
  int expire_times_ = 0;
  int use_count_ = 0;
  bool auto_gc_ = true;
  bool enable_match_ip_ = true;
  Entry::ProtectType protect_type_ = Entry::PROTECT_NONE;
  std::string protect_title_;
  std::string protect_password_;
  std::string protect_password_salt_;
  Entry::PasswordEncryptAlgo protect_password_algo_ = Entry::ENCRYPT_ALGO_DEFAULT;
  std::vector<unsigned int> protect_uids_;
  std::vector<std::string> protect_extra_users_;
  std::vector<unsigned int> protect_gids_;
  std::vector<std::string> protect_extra_groups_;
  Entry::RedirectType redirect_type_ = Entry::REDIRECT_NONE;
  std::string redirect_uri_;
  Json::Value app_;
  Json::Value private_data_ = Json::Value(Json::objectValue);
};

}  // namespace TUVO::sharing::record

#endif  // INTERNAL_ENTRY_PRIVATE_H_
