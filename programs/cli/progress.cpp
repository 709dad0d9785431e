#include "cli/progress.h"

#include <unistd.h>

#include <iostream>
#include <utility>

namespace cli {

namespace {

constexpr std::chrono::milliseconds kPause{100};
constexpr const char* kClearedLine = "\r\x1b[K";

}  // namespace

Progress::Progress(std::string what, long long total)
    : what_(std::move(what)), total_(total), wanted_(isatty(STDERR_FILENO) != 0) {}

Progress::~Progress() {
  if (shown_) {
    std::cerr << kClearedLine << std::flush;
  }
}

void Progress::Show(long long done) {
  const Clock::time_point now = Clock::now();
  if (!wanted_ || now < next_) {
    return;
  }
  next_ = now + kPause;
  shown_ = true;
  std::cerr << kClearedLine << what_ << ": " << done;
  if (total_ != 0) {
    std::cerr << " of " << total_;
  }
  std::cerr << std::flush;
}

}  // namespace cli
