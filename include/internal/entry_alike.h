#ifndef INTERNAL_ENTRY_ALIKE_H_
#define INTERNAL_ENTRY_ALIKE_H_

#include <tuvosharing/entry.h>

namespace TUVO::sharing::record {

// Whether whoever is let in by one link is by the other: the same link, in force for the same time
// and protected in the same way. Account names without an id are compared as such, and not looked
// up.
bool AdmitAlike(const Entry& one, const Entry& other);

}  // namespace TUVO::sharing::record

#endif  // INTERNAL_ENTRY_ALIKE_H_
