#include "cli/standard_output.h"

#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <climits>
#include <iostream>

#include "cli/interrupt.h"

namespace cli {

bool WriteOutput(int fd, std::string_view bytes) {
  while (!bytes.empty()) {
    WaitForOutput(fd);
    // A pipe takes that much without waiting; more might be waited for when the signal has come.
    const ssize_t count = write(fd, bytes.data(), std::min<std::size_t>(bytes.size(), PIPE_BUF));
    if (count >= 0) {
      bytes.remove_prefix(static_cast<std::size_t>(count));
    } else if (errno != EINTR && errno != EAGAIN) {
      return false;
    }
  }
  return true;
}

StandardOutput::StandardOutput() : former_(std::cout.rdbuf(this)) {
  setp(buffer_.begin(), buffer_.end());
}

StandardOutput::~StandardOutput() {
  std::cout.rdbuf(former_);
}

StandardOutput::int_type StandardOutput::overflow(int_type byte) {
  if (!Empty()) {
    return traits_type::eof();
  }
  if (!traits_type::eq_int_type(byte, traits_type::eof())) {
    sputc(traits_type::to_char_type(byte));
  }
  return traits_type::not_eof(byte);
}

int StandardOutput::sync() {
  return Empty() ? 0 : -1;
}

// What could not be written is not tried again: half of it may be out.
bool StandardOutput::Empty() {
  const std::string_view bytes(pbase(), static_cast<std::size_t>(pptr() - pbase()));
  setp(buffer_.begin(), buffer_.end());
  try {
    return WriteOutput(STDOUT_FILENO, bytes);
  } catch (const Interruption&) {
    return false;
  }
}

}  // namespace cli
