// The identity switch's lines of the system log, whole: with facility, priority and source line.
#ifndef TESTS_DB_IDENTITY_LINES_H_
#define TESTS_DB_IDENTITY_LINES_H_

#include <string>

#include "support/source_line.h"
#include "support/written_line.h"

namespace tuvo_test {

// How a line of `file` ("db/base_db.cpp") begins: "base_db:69", with the number of the line on
// which `text` stands, the first behind `after`.
inline std::string Place(const std::string& file, const std::string& text,
                         const std::string& after) {
  const size_t slash = file.rfind('/');
  return file.substr(slash + 1, file.rfind('.') - slash - 1) + ":" +
         std::to_string(SourceLine(file, text, after));
}

// The line of a switch that failed, and that of a return that did. `function` is how the function
// begins in which the switch stands.
inline std::string SwitchFailed(const std::string& file, const std::string& function,
                                const std::string& ids) {
  return "auth.err " + Place(file, "IF_RUN_AS(", function) + " ERROR: IF_RUN_AS(" + ids + ")";
}
inline std::string ReturnFailed(const std::string& file, const std::string& function,
                                const std::string& ids) {
  return "auth.crit " + Place(file, "IF_RUN_AS(", function) + " ERROR: ~IF_RUN_AS(" + ids + ")";
}

}  // namespace tuvo_test

#endif  // TESTS_DB_IDENTITY_LINES_H_
