#include <internal/condition_private.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>

namespace TUVO::sharing::db {

namespace {

constexpr int kUnset = -1;

}  // namespace

ConditionPrivate::ConditionPrivate(BaseDB& db) : db_(db), offset_(kUnset), limit_(kUnset) {}

void ConditionPrivate::Where(const std::string& sql, bool is_and) {
  if (!sql.empty()) {
    wheres_.push_back({"", "", sql, is_and});
  }
}

void ConditionPrivate::Where(const std::string& column, const std::string& value, bool is_and) {
  if (!column.empty()) {
    wheres_.push_back({column, value, "", is_and});
  }
}

void ConditionPrivate::OrderBy(const std::string& column, bool ascending) {
  orders_.push_back({column, ascending});
}

void ConditionPrivate::Limit(int offset, int limit) {
  offset_ = offset;
  limit_ = limit;
}

void ConditionPrivate::Page(int page, int size) {
  limit_ = size;
  // Unsigned, so that absurd arguments wrap instead of being undefined.
  offset_ =
      static_cast<int>((static_cast<unsigned int>(page) - 1U) * static_cast<unsigned int>(size));
}

void ConditionPrivate::Clear() {
  wheres_.clear();
  orders_.clear();
  offset_ = kUnset;
  limit_ = kUnset;
}

bool ConditionPrivate::IsEmpty() const {
  return wheres_.empty() && orders_.empty() && offset_ == kUnset && limit_ == kUnset;
}

std::string ConditionPrivate::GetSQL() const {
  std::string sql;
  bool first = true;
  for (const _tag_where__& where : wheres_) {
    sql += first ? " WHERE " : (where.is_and ? " AND " : " OR ");
    first = false;
    if (where.column.empty()) {
      sql += where.raw;
    } else {
      sql += "`" + db_.Escape(where.column) + "` = '" + db_.Escape(where.value) + "'";
    }
  }
  first = true;
  for (const _tag_order__& order : orders_) {
    sql += first ? " ORDER BY " : ",";
    first = false;
    sql += db_.Escape(order.column) + (order.ascending ? " ASC" : " DESC");
  }
  if (limit_ > 0) {
    sql += " LIMIT " + std::to_string(limit_);
  }
  if (offset_ > 0) {
    sql += " OFFSET " + std::to_string(offset_);
  }
  return sql;
}

Condition::Condition(BaseDB& db) : p_(std::make_unique<ConditionPrivate>(db)) {}

Condition::~Condition() = default;

void Condition::Where(const std::string& sql) {
  p_->Where(sql, true);
}

void Condition::Where(const std::string& column, const std::string& value) {
  p_->Where(column, value, true);
}

void Condition::OrWhere(const std::string& sql) {
  p_->Where(sql, false);
}

void Condition::OrWhere(const std::string& column, const std::string& value) {
  p_->Where(column, value, false);
}

void Condition::OrderBy(const std::string& column, bool ascending) {
  p_->OrderBy(column, ascending);
}

void Condition::Limit(int offset, int limit) {
  p_->Limit(offset, limit);
}

void Condition::Page(int page, int size) {
  p_->Page(page, size);
}

void Condition::Clear() {
  p_->Clear();
}

bool Condition::IsEmpty() const {
  return p_->IsEmpty();
}

std::string Condition::GetSQL() const {
  return p_->GetSQL();
}

}  // namespace TUVO::sharing::db
