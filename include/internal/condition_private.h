#ifndef INTERNAL_CONDITION_PRIVATE_H_
#define INTERNAL_CONDITION_PRIVATE_H_

#include <string>
#include <vector>

namespace TUVO::sharing::db {

class BaseDB;

// What Condition does; its operations are described there.
class ConditionPrivate {
 public:
  explicit ConditionPrivate(BaseDB& db);

  void Where(const std::string& sql, bool is_and);
  void Where(const std::string& column, const std::string& value, bool is_and);
  void OrderBy(const std::string& column, bool ascending);
  void Limit(int offset, int limit);
  void Page(int page, int size);
  void Clear();
  bool IsEmpty() const;
  // A text that no statement runs with, when a clause is missing, or cannot be written, for want of
  // memory: without its filter a statement would find, or delete, other rows than those meant.
  std::string GetSQL() const;

 private:
  // NOLINTBEGIN(bugprone-reserved-identifier)
  struct _tag_where__ {
    std::string column;  // empty: a raw clause
    std::string value;
    std::string raw;
    bool is_and;  // how it joins the clause before it
  };
  struct _tag_order__ {
    std::string column;
    bool ascending;
  };
  // NOLINTEND(bugprone-reserved-identifier)

  // Takes a clause that no statement runs with in the place of all others, until Clear.
  void Refuse();
  std::string Render() const;

  BaseDB& db_;
  std::vector<_tag_where__> wheres_;
  std::vector<_tag_order__> orders_;
  int offset_;
  int limit_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_CONDITION_PRIVATE_H_
