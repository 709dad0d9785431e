// A sharing link.
#ifndef TUVOSHARING_ENTRY_H_
#define TUVOSHARING_ENTRY_H_

#include <json/value.h>
#include <tuvosharing/export.h>

#include <ctime>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace TUVO::sharing {
namespace db {
class Row;
}

namespace record {

class EntryPrivate;
class Object;

// Which owner published what, under which hash, from when until when, for how many uses, and how
// visitors must prove themselves. Times are seconds since the epoch; 0 means "not set".
class TUVOSHARING_API Entry {
 public:
  // How visitors are admitted. Like the two kinds below it may hold any int: numbers that callers
  // pass on unchecked have a meaning too.
  enum ProtectType : int {
    PROTECT_NONE = 0,      // everybody who has the address
    PROTECT_PASSWORD = 1,  // whoever has the link's password
    PROTECT_USER = 2       // the listed accounts and the members of the listed groups
  };
  // How the link's password is kept.
  enum PasswordEncryptAlgo : int {
    ENCRYPT_ALGO_DEFAULT = 0,  // SHA-1 of password and salt
    ENCRYPT_ALGO_MD5 = 1       // MD5 of the password, as older programs kept it
  };
  // When an admitted visitor is sent on to redirect_uri; whoever serves the link does it.
  enum RedirectType : int {
    REDIRECT_NONE = 0,      // never
    REDIRECT_URLPARAM = 1,  // when the request asks for it
    REDIRECT_ALWAYS = 2     // always
  };

  // Enabled, unprotected, collected once expired, bound to the visitor's address; not legal until
  // it has a hash, a project, an owner and an object as `app`.
  Entry();
  // A copy is a link of its own, with the same id.
  Entry(const Entry& other);
  // The source stays usable, its texts and lists empty and its numbers unchanged. Allocates, hence
  // may throw bad_alloc.
  Entry(Entry&& other);  // NOLINT(performance-noexcept-move-constructor)
  // The object that GetObject has given out stays the same one.
  Entry& operator=(const Entry& other);
  // The same; the source is left as by the move constructor.
  Entry& operator=(Entry&& other) noexcept;
  virtual ~Entry();

  // The record as the stores see it; owned by this object.
  record::Object& GetObject();
  const record::Object& GetCObject() const;

  // The ten column values as texts, from "hash" to "data", in column order or by name.
  std::vector<std::string> GetFieldList() const;
  std::map<std::string, std::string> GetFieldMap() const;

  // Whether the link may be stored: it has hash, project, owner and objects as `app` and
  // `private_data`, its last password was hashed, and what its protection needs is there. The first
  // reason against it is logged.
  bool IsLegal() const;

  // Whether a visitor may use the link right now: legal, enabled, started, not expired, and not
  // used more than `expire_times` times. The reason against it is logged. Changes with the clock.
  bool IsValid() const;

  // Whether `password` is the link's password. True for any text when the link is not protected by
  // a password. Compared in constant time.
  bool IsPasswordValid(const std::string& password) const;

  // Replaces `value` by an object with the link's public members: never its ids, its password in
  // any form, or its private data. Times are local-time texts, "" when not set.
  void ToJSON(Json::Value& value) const;

  // Loads a row and answers IsLegal(). False as well when the "data" column is no JSON object of
  // the right members' types, or is nested deeper than 100 levels; the plain columns are then
  // loaded and everything from enable_match_ip on keeps its value. Lack of memory raises
  // std::bad_alloc and leaves everything as it was.
  bool FromRow(const db::Row& row);

  // The row's id in its table; 0 while it is not stored.
  int get_id() const;
  Entry& set_id(int id);

  // The random text that is the link's public name.
  std::string get_hash() const;
  Entry& set_hash(std::string hash);

  // The application that the link belongs to.
  std::string get_project_name() const;
  Entry& set_project_name(const std::string& project_name);

  // Whether the owner lets visitors use the link.
  bool get_enabled() const;
  Entry& set_enabled(const bool& enabled);

  // The owner; 4294967295 for none. By name: empty, or none, when the name or id does not resolve.
  unsigned int get_owner_uid() const;
  Entry& set_owner_uid(unsigned int owner_uid);
  std::string get_owner_user() const;
  Entry& set_owner_user(const std::string& owner_user);

  // The link is not valid before `start_at` and after `expire_at`. As text in the format of
  // strftime and strptime, in local time: empty when not set or longer than 127 bytes; a text that
  // is empty or does not fit the format sets 0.
  std::time_t get_start_at() const;
  Entry& set_start_at(long start_at);
  std::string get_start_at_str(const char* format) const;
  Entry& set_start_at_str(const std::string& text, const char* format);
  std::time_t get_expire_at() const;
  Entry& set_expire_at(long expire_at);
  std::string get_expire_at_str(const char* format) const;
  Entry& set_expire_at_str(const std::string& text, const char* format);

  // The number of uses allowed, 0 or less for any number. Setting a limit where there was none
  // starts the count at 0.
  int get_expire_times() const;
  Entry& set_expire_times(const int& expire_times);

  // The number of uses so far: each login counts one, and so does TuvoSharingIncreaseUseCount.
  int get_use_count() const;
  Entry& set_use_count(const int& use_count);
  // One more; stops at the largest int.
  void inc_use_count();

  // Whether the link may be purged automatically once expired.
  bool get_auto_gc() const;
  Entry& set_auto_gc(const bool& auto_gc);

  // Whether a visitor's session is bound to its address.
  bool get_enable_match_ip() const;
  Entry& set_enable_match_ip(bool enable_match_ip);

  // How visitors are admitted.
  ProtectType get_protect_type() const;
  Entry& set_protect_type(ProtectType protect_type);

  // Shown on the login page.
  std::string get_protect_title() const;
  Entry& set_protect_title(const std::string& protect_title);

  // The password as it is kept, with its algorithm and salt. With `hash` false the text is kept as
  // given (for a value that is a digest already); else it is hashed, the default algorithm with
  // a salt freshly drawn. When that fails the link is not legal until a later call succeeds.
  std::string get_protect_password() const;
  PasswordEncryptAlgo get_protect_password_algo() const;
  std::string get_protect_password_salt() const;
  Entry& set_protect_password(const std::string& password, bool hash, PasswordEncryptAlgo algo);

  // The admitted accounts. Names that do not resolve when they are set are kept as names and looked
  // up again whenever ids are asked for; ids that no longer resolve have no name. Setting replaces
  // all, in the given order, duplicates kept.
  std::vector<std::string> get_protect_users() const;
  std::vector<unsigned int> get_protect_uids() const;
  Entry& set_protect_users(const std::vector<std::string>& names);
  Entry& set_protect_uids(const std::vector<unsigned int>& uids);

  // The admitted groups, likewise.
  std::vector<std::string> get_protect_groups() const;
  std::vector<unsigned int> get_protect_gids() const;
  Entry& set_protect_groups(const std::vector<std::string>& names);
  Entry& set_protect_gids(const std::vector<unsigned int>& gids);

  // When an admitted visitor is sent on, and where to: any text, which nothing here checks.
  RedirectType get_redirect_type() const;
  Entry& set_redirect_type(RedirectType redirect_type);
  std::string get_redirect_uri() const;
  Entry& set_redirect_uri(const std::string& redirect_uri);

  // The application's data, a JSON object; the private part is never shown in the JSON form. What
  // is nested deeper than 99 levels, the object itself and the innermost value counted, can be
  // stored but not loaded again.
  Json::Value get_app() const;
  Entry& set_app(const Json::Value& app);
  Json::Value get_private_data() const;
  Entry& set_private_data(const Json::Value& private_data);

 private:
  friend bool ProtectAlike(const Entry& one, const Entry& other);

  std::unique_ptr<EntryPrivate> p_;
};

}  // namespace record
}  // namespace TUVO::sharing

#endif  // TUVOSHARING_ENTRY_H_
