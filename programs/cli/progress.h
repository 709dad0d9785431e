// How far a long command has come.
#ifndef PROGRAMS_CLI_PROGRESS_H_
#define PROGRAMS_CLI_PROGRESS_H_

#include <chrono>
#include <string>

namespace cli {

// One line on standard error that keeps changing and is gone at the end; only where standard error
// is a terminal.
class Progress {
 public:
  // Is shown as "`what`: 5 of 20", or without the total when that is 0.
  Progress(std::string what, long long total);
  ~Progress();
  Progress(const Progress&) = delete;
  Progress& operator=(const Progress&) = delete;

  // May be called often: shows a few a second.
  void Show(long long done);
  void SetTotal(long long total) { total_ = total; }

 private:
  using Clock = std::chrono::steady_clock;

  std::string what_;
  long long total_;
  bool wanted_;
  bool shown_ = false;
  Clock::time_point next_{};
};

}  // namespace cli

#endif  // PROGRAMS_CLI_PROGRESS_H_
