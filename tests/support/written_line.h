// A line of the system log, everything about it in one text, for comparing it whole.
#ifndef TESTS_SUPPORT_WRITTEN_LINE_H_
#define TESTS_SUPPORT_WRITTEN_LINE_H_

#include <syslog.h>

#include <string>
#include <vector>

#include "support/syslog_listener.h"

namespace tuvo_test {

// "user.err base_db:12 (345) init failed\n\n": facility, priority (numbers for the less common
// ones), text.
inline std::string Written(const LogLine& line) {
  const std::string facility = line.facility == LOG_USER   ? "user"
                               : line.facility == LOG_AUTH ? "auth"
                                                           : std::to_string(line.facility);
  const std::string priority = line.priority == LOG_ERR    ? "err"
                               : line.priority == LOG_CRIT ? "crit"
                                                           : std::to_string(line.priority);
  return facility + "." + priority + " " + line.text;
}

// What was written since the last look.
inline std::vector<std::string> TakeWritten(SyslogListener& listener) {
  std::vector<std::string> written;
  for (const LogLine& line : listener.Take()) {
    written.push_back(Written(line));
  }
  return written;
}

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_WRITTEN_LINE_H_
