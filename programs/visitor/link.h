// The state of a link, for whoever has not been admitted yet.
#ifndef PROGRAMS_VISITOR_LINK_H_
#define PROGRAMS_VISITOR_LINK_H_

#include <tuvosharing/entry.h>

#include <string>

namespace visitor {

enum class LinkState {
  kOpen,     // a login can succeed
  kNone,     // there is none of that hash, or it is not valid now
  kUsedUp,   // its limit of uses is reached
  kFailure,  // the database cannot be used
};

// Looks the link up; the answer agrees with what a login would say before it looks at the
// credentials. `*entry` is the link on kOpen.
LinkState LookUpLink(const std::string& hash, TUVO::sharing::record::Entry* entry);

// Loads a link that the library has just admitted a visitor to. False when it is gone meanwhile.
bool LoadLink(const std::string& hash, TUVO::sharing::record::Entry* entry);

}  // namespace visitor

#endif  // PROGRAMS_VISITOR_LINK_H_
