// Where a text stands in the project's sources: the line that a log line is to name.
#ifndef TESTS_SUPPORT_SOURCE_LINE_H_
#define TESTS_SUPPORT_SOURCE_LINE_H_

#include <algorithm>
#include <fstream>
#include <sstream>
#include <stdexcept>
#include <string>

namespace tuvo_test {

// The number, from 1, of the line of `file` (named from the project's folder: "db/base_db.cpp") on
// which `text` begins. It must stand in the file exactly once; else, name a text that stands once
// in `after`, and the first `text` behind it counts. Throws std::runtime_error when there is no
// such line, so that a test does not outlive the check that it looks for.
inline int SourceLine(const std::string& file, const std::string& text,
                      const std::string& after = "") {
  const std::string path = std::string(TUVO_PROJECT_FOLDER) + "/" + file;
  std::ifstream stream(path, std::ios::binary);
  std::ostringstream content;
  content << stream.rdbuf();
  const std::string source = content.str();
  const auto only = [&](const std::string& wanted) {
    const size_t at = source.find(wanted);
    if (at == std::string::npos || source.find(wanted, at + 1) != std::string::npos) {
      throw std::runtime_error("\"" + wanted + "\" does not stand once in " + path);
    }
    return at;
  };
  const size_t at = after.empty() ? only(text) : source.find(text, only(after) + after.size());
  if (at == std::string::npos) {
    throw std::runtime_error("no \"" + text + "\" behind \"" + after + "\" in " + path);
  }
  const auto begin = source.begin();
  return 1 + static_cast<int>(
                 std::count(begin, begin + static_cast<std::string::difference_type>(at), '\n'));
}

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_SOURCE_LINE_H_
