#include <internal/condition_private.h>
#include <internal/contained.h>
#include <internal/escaped.h>
#include <tuvosharing/base_db.h>
#include <tuvosharing/condition.h>

namespace TUVO::sharing::db {

namespace {

constexpr int kUnset = -1;

// No statement runs with this, whatever follows it. Short enough, like the clause in it, to need no
// memory of its own in a std::string.
constexpr char kRefused[] = " WHERE )";
constexpr char kRefusedClause[] = ")";

// False when memory does not suffice.
template <typename Items, typename MakeItem>
bool Append(Items& items, MakeItem make_item) {
  return Contained([&] {
    items.push_back(make_item());
    return true;
  });
}

}  // namespace

ConditionPrivate::ConditionPrivate(BaseDB& db) : db_(db), offset_(kUnset), limit_(kUnset) {
  wheres_.reserve(1);  // for Refuse
}

void ConditionPrivate::Where(const std::string& sql, bool is_and) {
  if (!sql.empty() && !Append(wheres_, [&] { return _tag_where__{"", "", sql, is_and}; })) {
    Refuse();
  }
}

void ConditionPrivate::Where(const std::string& column, const std::string& value, bool is_and) {
  if (!column.empty() && !Append(wheres_, [&] {
        return _tag_where__{column, value, "", is_and};
      })) {
    Refuse();
  }
}

void ConditionPrivate::OrderBy(const std::string& column, bool ascending) {
  if (!Append(orders_, [&] { return _tag_order__{column, ascending}; })) {
    Refuse();
  }
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
  return Contained([&] { return Render(); }, std::string(kRefused));
}

void ConditionPrivate::Refuse() {
  wheres_.clear();
  wheres_.push_back({"", "", kRefusedClause, true});
}

std::string ConditionPrivate::Render() const {
  std::string sql;
  bool first = true;
  for (const _tag_where__& where : wheres_) {
    sql += first ? " WHERE " : (where.is_and ? " AND " : " OR ");
    first = false;
    if (where.column.empty()) {
      sql += where.raw;
    } else {
      sql += "`" + Escaped(db_, where.column) + "` = '" + Escaped(db_, where.value) + "'";
    }
  }
  first = true;
  for (const _tag_order__& order : orders_) {
    sql += first ? " ORDER BY " : ",";
    first = false;
    sql += Escaped(db_, order.column) + (order.ascending ? " ASC" : " DESC");
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
