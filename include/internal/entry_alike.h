#ifndef INTERNAL_ENTRY_ALIKE_H_
#define INTERNAL_ENTRY_ALIKE_H_

#include <tuvosharing/entry.h>

namespace TUVO::sharing::record {

// Whether they are the same link, protected in the same way. Account names without an id are
// compared as such, and not looked up.
bool ProtectAlike(const Entry& one, const Entry& other);

}  // namespace TUVO::sharing::record

#endif  // INTERNAL_ENTRY_ALIKE_H_
