// The demonstration's links.
#ifndef PROGRAMS_DEMO_CREATE_H_
#define PROGRAMS_DEMO_CREATE_H_

#include <string>

namespace demo {

// Creates one link of each kind over the file at `path`, owned by the account `owner`, and prints a
// line for each: its kind, a tab and its hash. False when one could not be created.
bool CreateLinks(const std::string& path, const std::string& owner);

}  // namespace demo

#endif  // PROGRAMS_DEMO_CREATE_H_
