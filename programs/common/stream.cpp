#include "common/stream.h"

#include <sys/sendfile.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

namespace common {

namespace {

constexpr std::int64_t kPiece = 65536;

// One piece by way of this process's memory, for the file systems and descriptors that the kernel
// does not copy between. The number of bytes copied; 0 at the file's end, -1 on an error.
ssize_t CopyPiece(int from, off_t offset, size_t length, int to) {
  std::array<char, kPiece> buffer{};
  const ssize_t count = pread(from, buffer.data(), std::min(length, buffer.size()), offset);
  if (count <= 0) {
    return count;
  }
  const std::string_view bytes(buffer.data(), static_cast<size_t>(count));
  return WriteAll(to, bytes) ? count : -1;
}

// The same by the kernel alone as long as that works.
ssize_t SendPiece(int from, off_t offset, size_t length, int to, bool* by_kernel) {
  if (*by_kernel) {
    off_t position = offset;
    const ssize_t count = sendfile(to, from, &position, length);
    if (count >= 0 || (errno != EINVAL && errno != ENOSYS)) {
      return count;
    }
    *by_kernel = false;
  }
  return CopyPiece(from, offset, length, to);
}

}  // namespace

bool WriteAll(int fd, std::string_view bytes) {
  while (!bytes.empty()) {
    const ssize_t count = write(fd, bytes.data(), bytes.size());
    if (count < 0) {
      if (errno == EINTR) {
        continue;
      }
      return false;
    }
    bytes.remove_prefix(static_cast<size_t>(count));
  }
  return true;
}

bool CopyAll(int from, std::int64_t offset, std::int64_t length, int to) {
  bool by_kernel = true;
  while (length > 0) {
    const auto piece = static_cast<size_t>(std::min(length, kPiece));
    const ssize_t count = SendPiece(from, offset, piece, to, &by_kernel);
    if (count < 0 && errno == EINTR) {
      continue;
    }
    if (count <= 0) {
      return false;
    }
    offset += count;
    length -= count;
  }
  return true;
}

}  // namespace common
