// Compares what was logged, whichever process wrote it.
#ifndef TESTS_DB_LOG_LINES_H_
#define TESTS_DB_LOG_LINES_H_

#include <regex>
#include <string>
#include <vector>

#include "support/syslog_listener.h"

namespace tuvo_test {

// Normalized, with "(PID)" for any process id: the writer may have been a child.
inline std::string OfAnyProcess(const std::string& text) {
  static const std::regex pid("^([^ ]* )\\([0-9]+\\) ");
  return std::regex_replace(Normalized(text), pid, "$1(PID) ");
}

// What was logged since the last call.
inline std::vector<std::string> TakeLines(SyslogListener& listener) {
  std::vector<std::string> lines;
  for (const std::string& text : listener.TakeTexts()) {
    lines.push_back(OfAnyProcess(text));
  }
  return lines;
}

}  // namespace tuvo_test

#endif  // TESTS_DB_LOG_LINES_H_
