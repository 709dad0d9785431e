#include <internal/row_values.h>
#include <tuvoplatform/database.h>

#include <limits>
#include <type_traits>

// Not every platform has it.
extern "C" __attribute__((weak)) void TUVODBForgetRows(DBResult_tag* result, unsigned int row);

namespace TUVO::sharing::db {

namespace {

// A number that fits and is nothing but digits, behind a minus sign where `T` has one. False for
// every other text.
template <typename T>
bool ReadPlain(const char* text, T* number) {
  const bool negative = std::is_signed_v<T> && *text == '-';
  const char* const digits = negative ? text + 1 : text;
  T value = 0;
  const char* end = digits;
  for (; *end >= '0' && *end <= '9'; ++end) {
    const T digit = static_cast<T>(*end - '0');
    if (value > (std::numeric_limits<T>::max() - digit) / 10) {
      return false;
    }
    value = static_cast<T>(value * 10 + digit);
  }
  if (end == digits || *end != '\0') {
    return false;
  }
  *number = negative ? static_cast<T>(-value) : value;
  return true;
}

template <typename T>
T ReadNumber(const char* text, T def, T (Field::*convert)(T)) {
  T number = 0;
  if (ReadPlain(text, &number)) {
    return number;
  }
  Field field(text);
  return (field.*convert)(def);
}

}  // namespace

const char* RowValues::Bytes(const char* column) const {
  return row_.IsGood() ? TUVODBFetchField(row_.result_, row_.row_, column) : "";
}

std::string RowValues::Text(const char* column) const {
  return Bytes(column);
}

int RowValues::Int(const char* column, int def) const {
  return ReadNumber(Bytes(column), def, &Field::AsInt);
}

unsigned int RowValues::UInt(const char* column, unsigned int def) const {
  return ReadNumber(Bytes(column), def, &Field::AsUInt);
}

long RowValues::Time(const char* column, long def) const {
  return ReadNumber(Bytes(column), def, &Field::AsTime);
}

void RowValues::ForgetEarlier() const {
  if (TUVODBForgetRows != nullptr) {
    TUVODBForgetRows(row_.result_, row_.row_);
  }
}

}  // namespace TUVO::sharing::db
