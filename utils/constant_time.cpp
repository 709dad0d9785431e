#include <internal/constant_time.h>

namespace TUVO::sharing::internal {

bool AreEqualInConstantTime(std::string_view a, std::string_view b) {
  if (a.size() != b.size()) {
    return false;
  }
  // Volatile, or the compiler might see that nothing can change any more after a difference. A few
  // lines of our own, since OpenSSL's same function would load that library for each password.
  volatile unsigned char difference = 0;
  for (size_t i = 0; i < a.size(); ++i) {
    difference = static_cast<unsigned char>(difference | (a[i] ^ b[i]));
  }
  return difference == 0;
}

}  // namespace TUVO::sharing::internal
