// Which links a command is about.
#ifndef PROGRAMS_CLI_LINK_FILTER_H_
#define PROGRAMS_CLI_LINK_FILTER_H_

#include <string>

#include "owner/link_list.h"

namespace cli {

// As given; empty: any.
struct LinkFilter {
  std::string owner;
  std::string project;
  std::string state;
  std::string search;
};

// An account's name or, of one that is gone, its number. Throws Failure.
unsigned int OwnerUidOf(const std::string& text);

// The filter as the owner's programs have it. Throws Failure.
owner::ListRequest RequestOf(const LinkFilter& filter);

}  // namespace cli

#endif  // PROGRAMS_CLI_LINK_FILTER_H_
