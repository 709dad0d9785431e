// Receives what the process under test, or its children, write to the system log.
#ifndef TESTS_SUPPORT_SYSLOG_LISTENER_H_
#define TESTS_SUPPORT_SYSLOG_LISTENER_H_

#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace tuvo_test {

struct LogLine {
  int facility;      // LOG_USER, LOG_AUTH, ...
  int priority;      // LOG_ERR, LOG_CRIT, ...
  std::string text;  // after the time and the program's name, line feeds included
};

// Owns the socket /dev/log of the private namespace for its lifetime. One at a time.
class SyslogListener {
 public:
  SyslogListener();
  ~SyslogListener();
  SyslogListener(const SyslogListener&) = delete;
  SyslogListener& operator=(const SyslogListener&) = delete;

  // Every line written since the last call, in order.
  std::vector<LogLine> Take();

  // The texts alone of Take().
  std::vector<std::string> TakeTexts();

 private:
  void Receive();

  int socket_ = -1;
  // Not on the receiver's own stack: a child process has no such thread, and the leak check would
  // take the buffer for lost there.
  std::string buffer_ = std::string(65536, '\0');
  std::thread receiver_;
  std::mutex mutex_;
  std::vector<LogLine> lines_;
  int marks_seen_ = 0;
  int marks_sent_ = 0;
};

// `text` with the source line, the digits between the first ':' and the blank after it, replaced by
// "LINE", and "(<this process's id>)" replaced by "(PID)": "base_db:LINE (PID) init failed\n\n".
std::string Normalized(const std::string& text);

}  // namespace tuvo_test

#endif  // TESTS_SUPPORT_SYSLOG_LISTENER_H_
