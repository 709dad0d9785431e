// The programs' configuration file.
#ifndef PROGRAMS_COMMON_CONFIG_H_
#define PROGRAMS_COMMON_CONFIG_H_

#include <string>
#include <vector>

namespace common {

constexpr char kConfigPath[] = "/usr/tuvo/etc/tuvosharing.conf";

struct Config {
  // The address under which strangers reach this system; empty when it is not told. Has no control
  // characters, and is otherwise as it stands in the file: whoever uses it looks at it.
  std::string external_address;
  // The folders below which files may be shared, each once, in the file's order: absolute, without
  // a slash at the end, an empty part, "." or ".."; never "/" itself. They are not looked up, so
  // they may be missing, or symbolic links.
  std::vector<std::string> share_folders;
};

// Reads the lines `name = value` of the file at `path`: blanks around both do not count, empty
// lines and comments ('#' at the line's beginning or behind a blank, up to its end) are passed
// over. The last external_address counts; share_folder may stand any number of times. A line that
// is of no such form, of another name or of an unusable value is logged with its number (never its
// text) and passed over. A byte-order mark at the file's beginning is passed over.
//
// A missing file means defaults, and so does, logged at priority error, one that cannot be read, is
// no regular file, does not belong to root, or can be written to by its group or others.
Config ReadConfig(const std::string& path = kConfigPath);

// The same for external_address alone: what is wrong with other lines is not logged. For programs
// that do without those, and may be run by everybody as often as they like.
std::string ReadExternalAddress(const std::string& path = kConfigPath);

}  // namespace common

#endif  // PROGRAMS_COMMON_CONFIG_H_
