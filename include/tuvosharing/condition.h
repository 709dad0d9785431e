// The filter, order and row range of a query.
#ifndef TUVOSHARING_CONDITION_H_
#define TUVOSHARING_CONDITION_H_

#include <tuvosharing/export.h>

#include <memory>
#include <string>

namespace TUVO::sharing::db {

class BaseDB;
class ConditionPrivate;

// Clauses are joined strictly from left to right without grouping, so AND binds tighter than OR:
// whoever mixes them writes raw clauses with parentheses of their own. Values are escaped; columns,
// sort keys and raw clauses are the program's own, trusted text: a backquote would end a column.
//
// Without memory for a clause or a sort key, or for the text, the text is one that no statement
// runs with, until Clear: a statement without its filter would mean other rows.
//
// Bound to the connection that it escapes with, which must outlive it. Not copyable.
class TUVOSHARING_API Condition {
 public:
  // Without a clause, sort key or range: every row, in any order.
  explicit Condition(BaseDB& db);
  Condition(const Condition&) = delete;
  Condition& operator=(const Condition&) = delete;
  virtual ~Condition();

  // Adds a clause, joined to those before it with AND (Where) or OR (OrWhere): a raw one, or the
  // equality of a column and a value. An empty `sql` or `column` adds nothing.
  void Where(const std::string& sql);
  void Where(const std::string& column, const std::string& value);
  void OrWhere(const std::string& sql);
  void OrWhere(const std::string& column, const std::string& value);

  // Adds a sort key, after those added before.
  void OrderBy(const std::string& column, bool ascending);

  // The number of rows skipped, then the number of rows returned; values of 0 and below are not
  // written. An offset without a limit makes the statement fail.
  void Limit(int offset, int limit);

  // Page number `page`, counted from 1, of `size` rows each.
  void Page(int page, int size);

  // Back to the state after construction.
  void Clear();

  // True when nothing was added since construction or Clear.
  bool IsEmpty() const;

  // The text that follows the table's name, beginning with a blank; empty when there is nothing to
  // say.
  std::string GetSQL() const;

 private:
  std::unique_ptr<ConditionPrivate> p_;
};

}  // namespace TUVO::sharing::db

#endif  // TUVOSHARING_CONDITION_H_
