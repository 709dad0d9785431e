#include <tuvosharing/utils.h>

namespace TUVO::sharing {

// Not const: programs are linked against the names that these types make.
template <>
// cppcheck-suppress constParameter
std::string ToString<std::string>(std::string& value) {
  return value;
}

template <>
// cppcheck-suppress constParameter
std::string ToString<bool>(bool& value) {
  return value ? "1" : "0";
}

template <>
std::string ToString<int const>(int const& value) {
  return std::to_string(value);
}

template <>
std::string ToString<long const>(long const& value) {
  return std::to_string(value);
}

template <>
std::string ToString<bool const>(bool const& value) {
  return value ? "1" : "0";
}

}  // namespace TUVO::sharing
