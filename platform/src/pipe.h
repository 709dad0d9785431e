// Pipes to child processes, and streams over them that no signal handler disturbs.
#ifndef PLATFORM_SRC_PIPE_H_
#define PLATFORM_SRC_PIPE_H_

#include <cstdio>
#include <utility>

namespace tuvo_platform {

// Owns a file descriptor.
class Descriptor {
 public:
  explicit Descriptor(int fd = -1) : fd_(fd) {}
  Descriptor(Descriptor&& other) noexcept : fd_(std::exchange(other.fd_, -1)) {}
  Descriptor& operator=(Descriptor&& other) noexcept {
    std::swap(fd_, other.fd_);
    return *this;
  }
  ~Descriptor();

  int get() const { return fd_; }
  bool IsOpen() const { return fd_ >= 0; }

 private:
  int fd_;
};

// The two ends of a pipe, both close-on-exec and neither one of the standard descriptors.
struct Pipe {
  Descriptor read;
  Descriptor write;
};

// Makes a pipe; false with errno set on failure.
bool MakePipe(Pipe* pipe);

// A stream over `end`, "r" or "w", which owns it from then on. Reads and writes that a signal
// interrupts are taken up again, those at its closing included. Null with errno set on failure.
FILE* OpenPipeStream(Descriptor end, const char* mode);

}  // namespace tuvo_platform

#endif  // PLATFORM_SRC_PIPE_H_
