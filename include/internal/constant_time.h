// A comparison that takes as long for texts that differ at once as for equal ones.
#ifndef INTERNAL_CONSTANT_TIME_H_
#define INTERNAL_CONSTANT_TIME_H_

#include <string_view>

namespace TUVO::sharing::internal {

// Whether both hold the same bytes. Reads all of them, wherever the first difference is, so the
// time tells nothing but whether the lengths are the same.
bool AreEqualInConstantTime(std::string_view a, std::string_view b);

}  // namespace TUVO::sharing::internal

#endif  // INTERNAL_CONSTANT_TIME_H_
