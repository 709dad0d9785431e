#ifndef INTERNAL_USER_ID_H_
#define INTERNAL_USER_ID_H_

namespace TUVO::sharing {

// No user: all bits of an unsigned 32-bit id.
constexpr unsigned int UID_ERR = 4294967295U;

}  // namespace TUVO::sharing

#endif  // INTERNAL_USER_ID_H_
