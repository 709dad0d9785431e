// The public handle of a link: owns the implementation and forwards to it.
#include <internal/entry_private.h>
#include <internal/time_text.h>
#include <tuvosharing/entry.h>

#include <limits>
#include <utility>

namespace TUVO::sharing::record {

Entry::Entry() : p_(std::make_unique<EntryPrivate>()) {}

Entry::Entry(const Entry& other) : p_(std::make_unique<EntryPrivate>(*other.p_)) {}

// NOLINTNEXTLINE(performance-noexcept-move-constructor)
Entry::Entry(Entry&& other) : p_(std::make_unique<EntryPrivate>(std::move(*other.p_))) {}

Entry& Entry::operator=(const Entry& other) {
  if (this != &other) {
    *p_ = *other.p_;
  }
  return *this;
}

Entry& Entry::operator=(Entry&& other) noexcept {
  if (this != &other) {
    // By way of a third one: moved directly, JSON values trade places, and the source would be left
    // with this link's private data.
    EntryPrivate moved(std::move(*other.p_));
    *p_ = std::move(moved);
  }
  return *this;
}

Entry::~Entry() = default;

Object& Entry::GetObject() {
  return *p_;
}

const Object& Entry::GetCObject() const {
  return *p_;
}

std::vector<std::string> Entry::GetFieldList() const {
  return p_->GetFieldList();
}

std::map<std::string, std::string> Entry::GetFieldMap() const {
  return p_->GetFieldMap();
}

bool Entry::IsLegal() const {
  return p_->IsLegal();
}

bool Entry::IsValid() const {
  return p_->IsValid();
}

bool Entry::IsPasswordValid(const std::string& password) const {
  return p_->IsPasswordValid(password);
}

void Entry::ToJSON(Json::Value& value) const {
  p_->ToJSON(value);
}

bool Entry::FromRow(const db::Row& row) {
  return p_->FromRow(row);
}

int Entry::get_id() const {
  return p_->get_id();
}

Entry& Entry::set_id(int id) {
  p_->set_id(id);
  return *this;
}

std::string Entry::get_hash() const {
  return p_->key_;
}

Entry& Entry::set_hash(std::string hash) {
  p_->key_ = std::move(hash);
  return *this;
}

std::string Entry::get_project_name() const {
  return p_->project_name_;
}

Entry& Entry::set_project_name(const std::string& project_name) {
  p_->project_name_ = project_name;
  return *this;
}

bool Entry::get_enabled() const {
  return p_->enabled_;
}

Entry& Entry::set_enabled(const bool& enabled) {
  p_->enabled_ = enabled;
  return *this;
}

unsigned int Entry::get_owner_uid() const {
  return p_->owner_uid_;
}

Entry& Entry::set_owner_uid(unsigned int owner_uid) {
  p_->owner_uid_ = owner_uid;
  return *this;
}

std::string Entry::get_owner_user() const {
  return p_->GetOwnerUser();
}

Entry& Entry::set_owner_user(const std::string& owner_user) {
  p_->SetOwnerUser(owner_user);
  return *this;
}

std::time_t Entry::get_start_at() const {
  return p_->start_at_;
}

Entry& Entry::set_start_at(long start_at) {
  p_->start_at_ = start_at;
  return *this;
}

std::string Entry::get_start_at_str(const char* format) const {
  return TimeToText(p_->start_at_, format);
}

Entry& Entry::set_start_at_str(const std::string& text, const char* format) {
  p_->start_at_ = TextToTime(text, format);
  return *this;
}

std::time_t Entry::get_expire_at() const {
  return p_->expire_at_;
}

Entry& Entry::set_expire_at(long expire_at) {
  p_->expire_at_ = expire_at;
  return *this;
}

std::string Entry::get_expire_at_str(const char* format) const {
  return TimeToText(p_->expire_at_, format);
}

Entry& Entry::set_expire_at_str(const std::string& text, const char* format) {
  p_->expire_at_ = TextToTime(text, format);
  return *this;
}

int Entry::get_expire_times() const {
  return p_->expire_times_;
}

Entry& Entry::set_expire_times(const int& expire_times) {
  if (p_->expire_times_ == 0 && expire_times != 0) {
    p_->use_count_ = 0;
  }
  p_->expire_times_ = expire_times;
  return *this;
}

int Entry::get_use_count() const {
  return p_->use_count_;
}

Entry& Entry::set_use_count(const int& use_count) {
  p_->use_count_ = use_count;
  return *this;
}

void Entry::inc_use_count() {
  // A count that began again below 0 would open a used-up link.
  if (p_->use_count_ < std::numeric_limits<int>::max()) {
    ++p_->use_count_;
  }
}

bool Entry::get_auto_gc() const {
  return p_->auto_gc_;
}

Entry& Entry::set_auto_gc(const bool& auto_gc) {
  p_->auto_gc_ = auto_gc;
  return *this;
}

bool Entry::get_enable_match_ip() const {
  return p_->enable_match_ip_;
}

Entry& Entry::set_enable_match_ip(bool enable_match_ip) {
  p_->enable_match_ip_ = enable_match_ip;
  return *this;
}

Entry::ProtectType Entry::get_protect_type() const {
  return p_->protect_type_;
}

Entry& Entry::set_protect_type(ProtectType protect_type) {
  p_->protect_type_ = protect_type;
  return *this;
}

std::string Entry::get_protect_title() const {
  return p_->protect_title_;
}

Entry& Entry::set_protect_title(const std::string& protect_title) {
  p_->protect_title_ = protect_title;
  return *this;
}

std::string Entry::get_protect_password() const {
  return p_->protect_password_;
}

Entry::PasswordEncryptAlgo Entry::get_protect_password_algo() const {
  return p_->protect_password_algo_;
}

std::string Entry::get_protect_password_salt() const {
  return p_->protect_password_salt_;
}

Entry& Entry::set_protect_password(const std::string& password, bool hash,
                                   PasswordEncryptAlgo algo) {
  p_->SetProtectPassword(password, hash, algo);
  return *this;
}

std::vector<std::string> Entry::get_protect_users() const {
  return p_->GetProtectUsers();
}

std::vector<unsigned int> Entry::get_protect_uids() const {
  return p_->GetProtectUids();
}

Entry& Entry::set_protect_users(const std::vector<std::string>& names) {
  p_->SetProtectUsers(names);
  return *this;
}

Entry& Entry::set_protect_uids(const std::vector<unsigned int>& uids) {
  p_->protect_uids_ = uids;
  p_->protect_extra_users_.clear();
  return *this;
}

std::vector<std::string> Entry::get_protect_groups() const {
  return p_->GetProtectGroups();
}

std::vector<unsigned int> Entry::get_protect_gids() const {
  return p_->GetProtectGids();
}

Entry& Entry::set_protect_groups(const std::vector<std::string>& names) {
  p_->SetProtectGroups(names);
  return *this;
}

Entry& Entry::set_protect_gids(const std::vector<unsigned int>& gids) {
  p_->protect_gids_ = gids;
  p_->protect_extra_groups_.clear();
  return *this;
}

Entry::RedirectType Entry::get_redirect_type() const {
  return p_->redirect_type_;
}

Entry& Entry::set_redirect_type(RedirectType redirect_type) {
  p_->redirect_type_ = redirect_type;
  return *this;
}

std::string Entry::get_redirect_uri() const {
  return p_->redirect_uri_;
}

Entry& Entry::set_redirect_uri(const std::string& redirect_uri) {
  p_->redirect_uri_ = redirect_uri;
  return *this;
}

Json::Value Entry::get_app() const {
  return p_->app_;
}

Entry& Entry::set_app(const Json::Value& app) {
  p_->app_ = app;
  return *this;
}

Json::Value Entry::get_private_data() const {
  return p_->private_data_;
}

Entry& Entry::set_private_data(const Json::Value& private_data) {
  p_->private_data_ = private_data;
  return *this;
}

}  // namespace TUVO::sharing::record
