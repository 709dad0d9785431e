#include <internal/log.h>
#include <internal/row_values.h>
#include <internal/token_private.h>
#include <json/value.h>
#include <tuvosharing/keys.h>
#include <tuvosharing/row.h>
#include <tuvosharing/token.h>
#include <tuvosharing/utils.h>

#include <utility>

namespace TUVO::sharing::record {

std::vector<std::string> TokenPrivate::GetFieldList() const {
  return {ToString(entry_id_), ToString(session_id_), std::to_string(timeout_)};
}

std::map<std::string, std::string> TokenPrivate::GetFieldMap() const {
  const std::vector<std::string> fields = GetFieldList();
  return {{SZK_ENTRY_ID, fields[0]}, {SZK_SESSION_ID_, fields[1]}, {SZK_TIMEOUT, fields[2]}};
}

bool TokenPrivate::IsLegal() const {
  // clang-format off
  // NOLINTBEGIN(modernize-use-nullptr)
  SHARING_RETURN_FALSE_IF(0 == entry_id_);
  SHARING_RETURN_FALSE_IF(0 == session_id_);
  SHARING_RETURN_FALSE_IF(time(NULL) >= timeout_);
  // NOLINTEND(modernize-use-nullptr)
  // clang-format on
  return true;
}

void TokenPrivate::ToJSON(Json::Value& value) const {
  value[SZK_ENTRY_ID] = entry_id_;
  value[SZK_SESSION_ID_] = session_id_;
  value[SZK_TIMEOUT] = static_cast<Json::Int64>(timeout_);
}

bool TokenPrivate::FromRow(const db::Row& row) {
  const db::RowValues values(row);
  TokenPrivate read(*this);  // so that a row that memory does not suffice for changes nothing
  read.id_ = values.Int(SZK_ID_, 0);
  read.entry_id_ = values.Int(SZK_ENTRY_ID, 0);
  read.session_id_ = values.Int(SZK_SESSION_ID_, 0);
  read.timeout_ = values.Time(SZK_TIMEOUT, 0);
  *this = std::move(read);
  return IsLegal();
}

Token::Token() : p_(std::make_unique<TokenPrivate>()) {}

Token::Token(const Token& other) : p_(std::make_unique<TokenPrivate>(*other.p_)) {}

// NOLINTNEXTLINE(performance-noexcept-move-constructor)
Token::Token(Token&& other) : p_(std::make_unique<TokenPrivate>(std::move(*other.p_))) {}

Token& Token::operator=(const Token& other) {
  if (this != &other) {
    *p_ = *other.p_;
  }
  return *this;
}

Token& Token::operator=(Token&& other) noexcept {
  if (this != &other) {
    *p_ = std::move(*other.p_);
  }
  return *this;
}

Token::~Token() = default;

Object& Token::GetObject() {
  return *p_;
}

const Object& Token::GetCObject() const {
  return *p_;
}

std::vector<std::string> Token::GetFieldList() const {
  return p_->GetFieldList();
}

std::map<std::string, std::string> Token::GetFieldMap() const {
  return p_->GetFieldMap();
}

bool Token::IsLegal() const {
  return p_->IsLegal();
}

void Token::ToJSON(Json::Value& value) const {
  p_->ToJSON(value);
}

bool Token::FromRow(const db::Row& row) {
  return p_->FromRow(row);
}

int Token::get_id() const {
  return p_->get_id();
}

Token& Token::set_id(int id) {
  p_->set_id(id);
  return *this;
}

int Token::get_entry_id() const {
  return p_->entry_id_;
}

void Token::set_entry_id(int entry_id) {
  p_->entry_id_ = entry_id;
}

int Token::get_session_id() const {
  return p_->session_id_;
}

void Token::set_session_id(int session_id) {
  p_->session_id_ = session_id;
}

std::time_t Token::get_timeout() const {
  return p_->timeout_;
}

void Token::set_timeout(long timeout) {
  p_->timeout_ = timeout;
}

}  // namespace TUVO::sharing::record
