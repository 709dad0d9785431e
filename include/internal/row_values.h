#ifndef INTERNAL_ROW_VALUES_H_
#define INTERNAL_ROW_VALUES_H_

#include <tuvosharing/row.h>

#include <string>

namespace TUVO::sharing::db {

// Reads columns as Row::GetField and the field's conversions do, with the same answers. The string
// stream that every Field brings costs more than all else that is done with a column, and numbers
// as the database writes them need none.
class RowValues {
 public:
  // `row` must outlive this.
  explicit RowValues(const Row& row) : row_(row) {}

  // Empty for NULL, for an unknown column and when the row is not good.
  std::string Text(const char* column) const;

  // The same without a copy; valid as long as the row's result.
  const char* Bytes(const char* column) const;

  // `def` when there is no number or it does not fit.
  int Int(const char* column, int def) const;
  unsigned int UInt(const char* column, unsigned int def) const;
  long Time(const char* column, long def) const;

  // For who reads row after row: the rows before this one are not looked at any more, and a
  // platform that can gives their memory back.
  void ForgetEarlier() const;

 private:
  const Row& row_;
};

}  // namespace TUVO::sharing::db

#endif  // INTERNAL_ROW_VALUES_H_
