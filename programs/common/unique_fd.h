// An owned file descriptor.
#ifndef PROGRAMS_COMMON_UNIQUE_FD_H_
#define PROGRAMS_COMMON_UNIQUE_FD_H_

#include <unistd.h>

#include <utility>

namespace common {

// Closes the descriptor it holds; -1 is none.
class UniqueFd {
 public:
  UniqueFd() = default;
  explicit UniqueFd(int fd) : fd_(fd) {}
  UniqueFd(UniqueFd&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  UniqueFd& operator=(UniqueFd&& other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  UniqueFd(const UniqueFd&) = delete;
  UniqueFd& operator=(const UniqueFd&) = delete;
  ~UniqueFd() {
    if (fd_ >= 0) {
      close(fd_);
    }
  }

  int get() const { return fd_; }

 private:
  int fd_ = -1;
};

}  // namespace common

#endif  // PROGRAMS_COMMON_UNIQUE_FD_H_
