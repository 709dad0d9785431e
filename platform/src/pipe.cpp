#include "pipe.h"

#include <fcntl.h>
#include <sys/types.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <memory>

namespace tuvo_platform {

namespace {

// Moves an end away from the standard descriptors, which a program that was started with some of
// them closed gets first. Left there, the stream would take what this process prints, and the
// child's own standard descriptors could not be put in place without overwriting it.
bool MoveUp(Descriptor* end) {
  if (end->get() > STDERR_FILENO) {
    return true;
  }
  *end = Descriptor(fcntl(end->get(), F_DUPFD_CLOEXEC, STDERR_FILENO + 1));
  return end->IsOpen();
}

int DescriptorOf(void* cookie) {
  return static_cast<Descriptor*>(cookie)->get();
}

ssize_t ReadRetrying(void* cookie, char* buffer, std::size_t size) {
  ssize_t got = 0;
  do {
    got = read(DescriptorOf(cookie), buffer, size);
  } while (got < 0 && errno == EINTR);
  return got;
}

// As the C library wants it: the number of bytes written, fewer than `size` only after an error.
ssize_t WriteRetrying(void* cookie, const char* buffer, std::size_t size) {
  std::size_t written = 0;
  while (written < size) {
    const ssize_t count = write(DescriptorOf(cookie), buffer + written, size - written);
    if (count >= 0) {
      written += static_cast<std::size_t>(count);
    } else if (errno != EINTR) {
      break;
    }
  }
  return static_cast<ssize_t>(written);
}

int CloseEnd(void* cookie) {
  delete static_cast<Descriptor*>(cookie);
  return 0;
}

}  // namespace

Descriptor::~Descriptor() {
  if (fd_ >= 0) {
    const int error = errno;  // cleaning up after a failure must not hide its reason
    close(fd_);
    errno = error;
  }
}

bool MakePipe(Pipe* pipe) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) {
    return false;
  }
  pipe->read = Descriptor(ends[0]);
  pipe->write = Descriptor(ends[1]);
  return MoveUp(&pipe->read) && MoveUp(&pipe->write);
}

// The plain streams of the C library give up when a signal handler runs, and lose what they had not
// yet written; the child's end alone (SIGCHLD) is such a moment.
FILE* OpenPipeStream(Descriptor end, const char* mode) {
  auto cookie = std::make_unique<Descriptor>(std::move(end));
  FILE* stream =
      fopencookie(cookie.get(), mode, {ReadRetrying, WriteRetrying, /*seek=*/nullptr, CloseEnd});
  if (stream != nullptr) {
    static_cast<void>(cookie.release());  // closed with the stream
  }
  return stream;
}

}  // namespace tuvo_platform
