#include <internal/log.h>
#include <internal/row_values.h>
#include <internal/session_private.h>
#include <json/value.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/row.h>
#include <tuvosharing/session.h>

#include <utility>

namespace TUVO::sharing::record {

std::vector<std::string> SessionPrivate::GetFieldList() const {
  return {key_, std::to_string(uid_), ip_, std::to_string(timeout_)};
}

std::map<std::string, std::string> SessionPrivate::GetFieldMap() const {
  const std::vector<std::string> fields = GetFieldList();
  return {{SZK_SESSION_ID_, fields[0]},
          {SZK_UID_, fields[1]},
          {SZK_IP_, fields[2]},
          {SZK_TIMEOUT, fields[3]}};
}

bool SessionPrivate::IsLegal() const {
  const std::string& session_id_ = key_;  // the name that the log line shows
  // clang-format off
  // NOLINTBEGIN(modernize-use-nullptr,readability-container-size-empty)
  SHARING_RETURN_FALSE_IF("" == session_id_);
  SHARING_RETURN_FALSE_IF("" == ip_);
  SHARING_RETURN_FALSE_IF(time(NULL) >= timeout_);
  // NOLINTEND(modernize-use-nullptr,readability-container-size-empty)
  // clang-format on
  return true;
}

void SessionPrivate::ToJSON(Json::Value& value) const {
  value[SZK_SESSION_ID_] = key_;
  value[SZK_UID_] = uid_;
  value[SZK_IP_] = ip_;
  value[SZK_TIMEOUT] = static_cast<Json::Int64>(timeout_);
}

bool SessionPrivate::FromRow(const db::Row& row) {
  const db::RowValues values(row);
  SessionPrivate read(*this);  // so that a row that memory does not suffice for changes nothing
  read.id_ = values.Int(SZK_ID_, 0);
  read.key_ = values.Text(SZK_SESSION_ID_);
  read.uid_ = values.UInt(SZK_UID_, UID_ERR);
  read.ip_ = values.Text(SZK_IP_);
  read.timeout_ = values.Time(SZK_TIMEOUT, 0);
  *this = std::move(read);
  return IsLegal();
}

Session::Session() : p_(std::make_unique<SessionPrivate>()) {}

Session::Session(const Session& other) : p_(std::make_unique<SessionPrivate>(*other.p_)) {}

// NOLINTNEXTLINE(performance-noexcept-move-constructor)
Session::Session(Session&& other) : p_(std::make_unique<SessionPrivate>(std::move(*other.p_))) {}

Session& Session::operator=(const Session& other) {
  if (this != &other) {
    *p_ = *other.p_;
  }
  return *this;
}

Session& Session::operator=(Session&& other) noexcept {
  if (this != &other) {
    *p_ = std::move(*other.p_);
  }
  return *this;
}

Session::~Session() = default;

Object& Session::GetObject() {
  return *p_;
}

const Object& Session::GetCObject() const {
  return *p_;
}

std::vector<std::string> Session::GetFieldList() const {
  return p_->GetFieldList();
}

std::map<std::string, std::string> Session::GetFieldMap() const {
  return p_->GetFieldMap();
}

bool Session::IsLegal() const {
  return p_->IsLegal();
}

void Session::ToJSON(Json::Value& value) const {
  p_->ToJSON(value);
}

bool Session::FromRow(const db::Row& row) {
  return p_->FromRow(row);
}

int Session::get_id() const {
  return p_->get_id();
}

Session& Session::set_id(int id) {
  p_->set_id(id);
  return *this;
}

std::string Session::get_session_id() const {
  return p_->key_;
}

Session& Session::set_session_id(const std::string& session_id) {
  p_->key_ = session_id;
  return *this;
}

unsigned int Session::get_uid() const {
  return p_->uid_;
}

void Session::set_uid(unsigned int uid) {
  p_->uid_ = uid;
}

std::string Session::get_ip() const {
  return p_->ip_;
}

Session& Session::set_ip(const std::string& ip) {
  p_->ip_ = ip;
  return *this;
}

std::time_t Session::get_timeout() const {
  return p_->timeout_;
}

void Session::set_timeout(long timeout) {
  p_->timeout_ = timeout;
}

}  // namespace TUVO::sharing::record
